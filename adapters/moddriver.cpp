#include "adapters/moddriver.h"

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "adapters/modquery.h"
#include "adapters/pciname.h"
#include "diag/hwdebug.h"
#include "runtime/heap.h"
#include "util/blocklines.h"
#include "util/parstool.h"
#include "util/sysaccess.h"

namespace {

constexpr size_t DEVICE_KEY_CHARS = 4;
constexpr char MARKER_PREFIX[] = "__insmod_";
constexpr char MARKER_SUFFIX[] = "_O";
constexpr char BOOT_MODULES[] = "INITRD_MODULES";

// Module names compared as current kernels do, which spell a dash and an underscore alike: the
// PCI device list names a driver "ehci-pci" whose module is "ehci_pci".
bool SameModuleName(const char* a, const char* b) {
    auto fold = [](char c) { return c == '-' ? '_' : c; };
    for (; *a != '\0' && *b != '\0'; ++a, ++b) {
        if (fold(*a) != fold(*b)) {
            return false;
        }
    }
    return *a == *b;
}

// The bound driver: the text after the last tab of the device's line, looked for down to the
// line's second byte. A line that ends in a tab (no driver) or holds none names nothing.
HeapCString DriverOfDeviceLine(const char* line, size_t length) {
    if (length < 2 || line[length - 1] == '\t') {
        return nullptr;
    }
    for (size_t at = length - 1; at >= 1; --at) {
        if (line[at] != '\t') {
            continue;
        }
        size_t size = length - at;  // the name and its terminator
        HeapCString name(new (std::nothrow) char[size]);
        if (!name) {
            LastErr(nullptr, "GetModuleName()", "name malloc() failed");
            return nullptr;
        }
        std::memcpy(name.get(), line + at + 1, size - 1);
        name[size - 1] = '\0';
        return name;
    }
    return nullptr;
}

}  // namespace

void GetModuleName(AdapterDescriptor* adapter, const char* procRoot) {
    adapter->ModuleName.reset();
    char key[DEVICE_KEY_CHARS + 1];
    uint32_t devfn =
        ((adapter->Bus & 0xFFu) << 8) | ((adapter->Device & 0x1Fu) << 3) | (adapter->Function & 7u);
    std::snprintf(key, sizeof key, "%04x", static_cast<unsigned>(devfn));

    std::string path = std::string(procRoot != nullptr ? procRoot : "") + "/devices";
    BlockLines lines;
    if (!lines.Open(path.c_str())) {
        LastErr(nullptr, "GetModuleName()", "fopen() failed");
        dbgprint("                        file:  ");
        dbgprint("%s\n", MakeWideString(path.c_str(), WideBuffer));
        dbgprint("\n");
        return;
    }
    HeapCString name;
    size_t length = 0;
    while (const char* line = lines.NextCandidate(0, key[0], key[1], &length)) {
        length = strnlen(line, length);
        if (length >= DEVICE_KEY_CHARS && std::memcmp(line, key, DEVICE_KEY_CHARS) == 0) {
            name = DriverOfDeviceLine(line, length);
            break;
        }
    }
    if ((HwInfoPrintLevel & GET_ADAPTER) != 0) {
        dbgprint("   ModuleName:  >%s<\n", MakeWideString(name ? name.get() : "", WideBuffer));
    }
    adapter->ModuleName = std::move(name);
}

bool GetDriverName(AdapterDescriptor* adapter) {
    adapter->Driver.clear();
    const char* module = adapter->ModuleName.get();
    if (module == nullptr) {
        return true;
    }
    size_t searchLength = sizeof MARKER_PREFIX - 1 + std::strlen(module) + sizeof MARKER_SUFFIX - 1;
    UniqueMalloc<char> search(static_cast<char*>(HeapMalloc(searchLength + 1)));
    if (!search) {
        LastErr(nullptr, "GetDriverName()", "search string malloc() failed");
        return false;
    }
    std::snprintf(search.get(), searchLength + 1, "%s%s%s", MARKER_PREFIX, module, MARKER_SUFFIX);

    ModuleSymbols symbols;
    int count = GetModuleSymbols(module, &symbols);
    for (int i = 0; i < count; ++i) {
        const char* symbol = symbols.Name(i);
        if (symbol == nullptr || std::strncmp(symbol, search.get(), searchLength) != 0) {
            continue;
        }
        // The object file's path, then "_" and a time stamp, then "_" and a version. A marker
        // without both parts names no file.
        const char* path = symbol + searchLength;
        size_t length = std::strlen(path);
        const void* version = memrchr(path, '_', length);
        if (version == nullptr) {
            continue;
        }
        length = static_cast<size_t>(static_cast<const char*>(version) - path);
        const void* stamp = memrchr(path, '_', length);
        if (stamp == nullptr) {
            continue;
        }
        length = static_cast<size_t>(static_cast<const char*>(stamp) - path);
        char file[WIDE_BUFFER_CHARS];
        length = length < sizeof file - 1 ? length : sizeof file - 1;
        std::memcpy(file, path, length);
        file[length] = '\0';
        if ((HwInfoPrintLevel & GET_ADAPTER) != 0) {
            dbgprint("   Driver Name:  >%s<\n", MakeWideString(file, WideBuffer));
        }
        adapter->Driver = MakeWideString(file, WideBuffer);
    }
    return true;
}

bool IsBootDevice(AdapterDescriptor* adapter) {
    adapter->IsBootDev = false;
    const char* module = adapter->ModuleName.get();
    if (module == nullptr) {
        return true;
    }
    UniqueFile file(std::fopen(SysPaths().SysconfigKernel.c_str(), "r"));
    if (!file) {
        LastErr(nullptr, "IsBootDevice()", "fopen() failed");
        return false;
    }
    char line[WIDE_BUFFER_CHARS];
    while (getline(file.get(), line, sizeof line)) {
        if (TrimComment(line, "#") == 0 ||
            std::strncmp(line, BOOT_MODULES, sizeof BOOT_MODULES - 1) != 0) {
            continue;
        }
        // The list between the first and the last double quote; a lone quote opens a list that
        // runs to the end of the line.
        char* list = std::strchr(line, '"');
        list = list != nullptr ? list + 1 : line;
        char* close = std::strrchr(list, '"');
        if (close != nullptr) {
            *close = '\0';
        }
        char* cursor = list;
        while (const char* token = GetToken(&cursor)) {
            if (SameModuleName(token, module)) {
                adapter->IsBootDev = true;
                break;
            }
        }
    }
    if ((HwInfoPrintLevel & GET_ADAPTER) != 0) {
        dbgprint("Is Boot Device:  %s\n", adapter->IsBootDev ? L"True" : L"False");
        dbgprint("\n");
    }
    return true;
}
