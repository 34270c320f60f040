#include "adapters/pciname.h"

#include <cctype>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <initializer_list>
#include <string>

#include "diag/hwdebug.h"
#include "util/blocklines.h"
#include "util/sysaccess.h"

namespace {

constexpr size_t KEY_CHARS = 4;

struct NameSearch {
    char Keys[4][KEY_CHARS + 1] = {};  // vendor, device, subsystem vendor, subsystem
    std::wstring Vendor;
    std::wstring Device;
    std::wstring SubSys;
    bool Done = false;
};

enum Key { VENDOR_KEY, DEVICE_KEY, SUBVENDOR_KEY, SUBSYS_KEY };

bool BeginsWith(const char* line, const char* key) {
    return std::strncmp(line, key, KEY_CHARS) == 0;
}

std::wstring Widen(const char* text) {
    wchar_t wide[WIDE_BUFFER_CHARS];
    return MakeWideString(text, wide);
}

// One line of the database, in a buffer of its own.
void HandleLine(char* line, NameSearch* search) {
    if (TrimComment(line, "#") == 0) {
        return;
    }
    int indent = TrimIndent(line);
    if (*line == '\0') {
        return;
    }
    switch (indent) {
        case 0:
            if (!search->Vendor.empty()) {
                search->Done = true;
            } else if (BeginsWith(line, search->Keys[VENDOR_KEY]) && TrimID(line) != 0) {
                search->Vendor = Widen(line);
            }
            break;
        case 1:
            if (search->Vendor.empty()) {
                break;
            }
            if (!search->Device.empty()) {
                search->Done = true;
            } else if (BeginsWith(line, search->Keys[DEVICE_KEY]) && TrimID(line) != 0) {
                search->Device = Widen(line);
            }
            break;
        case 2:
            if (!search->Device.empty() && BeginsWith(line, search->Keys[SUBVENDOR_KEY]) &&
                TrimID(line) != 0 && BeginsWith(line, search->Keys[SUBSYS_KEY]) &&
                TrimID(line) != 0) {
                search->SubSys = Widen(line);
                search->Done = true;
            }
            break;
        default:
            break;
    }
}

}  // namespace

unsigned TrimComment(char* line, const char* mark) {
    char* found = std::strstr(line, mark);
    if (found != nullptr) {
        *found = '\0';
    }
    return static_cast<unsigned>(std::strlen(line));
}

int TrimIndent(char* line) {
    size_t tabs = std::strspn(line, "\t");
    if (tabs > 0) {
        std::memmove(line, line + tabs, std::strlen(line + tabs) + 1);
    }
    return static_cast<int>(tabs);
}

unsigned TrimID(char* line) {
    auto isSpace = [](char c) { return std::isspace(static_cast<unsigned char>(c)) != 0; };
    char* rest = line;
    while (isSpace(*rest)) {
        rest++;
    }
    while (*rest != '\0' && !isSpace(*rest)) {
        rest++;
    }
    while (isSpace(*rest)) {
        rest++;
    }
    if (*rest != '\0') {
        std::memmove(line, rest, std::strlen(rest) + 1);
    }
    return static_cast<unsigned>(std::strlen(line));
}

bool GetAdapterName(AdapterDescriptor* adapter, const _PCI_CONFIG0* config) {
    adapter->Name.clear();
    NameSearch search;
    const uint16_t ids[4] = {config->VendorID, config->DeviceID, config->SubSysVendorID,
                             config->SubSystemID};
    for (int i = 0; i < 4; ++i) {
        std::snprintf(search.Keys[i], sizeof(search.Keys[i]), "%04x", ids[i]);
    }

    // Where the system's own path is missing, current distributions keep the database elsewhere;
    // the failure reported is that of the system's own path.
    BlockLines lines;
    int32_t firstError = 0;
    for (const std::string* path :
         {&SysPaths().PciIds, &SysPaths().PciIdsMisc, &SysPaths().PciIdsHwdata}) {
        if (lines.Open(path->c_str())) {
            break;
        }
        if (firstError == 0) {
            firstError = errno;
        }
    }
    if (!lines) {
        LastErr(&firstError, "GetAdapterName()", "fopen() failed");
        return false;
    }

    // Only lines that can change the search are copied out and looked at closely: a vendor line
    // with the vendor key, then the vendor's device lines with the device key, then the device's
    // subsystem lines with the subsystem vendor key, and any line that ends a block.
    char line[BlockLines::LONGEST_LINE + 1];
    while (!search.Done) {
        Key key = search.Vendor.empty()   ? VENDOR_KEY
                  : search.Device.empty() ? DEVICE_KEY
                                          : SUBVENDOR_KEY;
        size_t length = 0;
        const char* found = lines.NextCandidate(static_cast<unsigned>(key), search.Keys[key][0],
                                                search.Keys[key][1], &length);
        if (found == nullptr) {
            break;
        }
        std::memcpy(line, found, length);
        line[length] = '\0';
        HandleLine(line, &search);
    }

    if ((HwInfoPrintLevel & GET_ADAPTER) != 0) {
        wchar_t wide[WIDE_BUFFER_CHARS];
        dbgprint("\n");
        dbgprint("      vendorID:  >%S<\n", MakeWideString(search.Keys[VENDOR_KEY], wide));
        dbgprint("      deviceID:  >%S<\n", MakeWideString(search.Keys[DEVICE_KEY], wide));
        dbgprint("   subVendorID:  >%S<\n", MakeWideString(search.Keys[SUBVENDOR_KEY], wide));
        dbgprint("      subSysID:  >%S<\n", MakeWideString(search.Keys[SUBSYS_KEY], wide));
        dbgprint("\n");
        dbgprint("    vendorName:  >%s<\n", search.Vendor.c_str());
        dbgprint("    deviceName:  >%s<\n", search.Device.c_str());
        dbgprint("    subSysName:  >%s<\n", search.SubSys.c_str());
        dbgprint("\n");
    }

    if (!search.Vendor.empty()) {
        adapter->Name = search.Vendor + L" ";
        if (!search.SubSys.empty()) {
            adapter->Name += search.SubSys;
        } else if (!search.Device.empty()) {
            adapter->Name += search.Device;
        } else {
            adapter->Name += L"unknown device";
        }
    }
    return true;
}
