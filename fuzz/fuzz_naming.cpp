// The readers that name an adapter and find its driver, chosen by the first byte:
//   0  the PCI ID database: four little-endian 16-bit IDs, a byte that places the end of the
//      first read block (4 times its value into the database, after a long comment line), then
//      the database. The name must be the one a plain line-by-line reading gives.
//   1  the PCI device list: bus and devfn bytes, then the list.
//   2  a module's symbol list: a little-endian 16-bit count, then the buffer query_module fills.
//   3  /etc/sysconfig/kernel.
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "adapters/moddriver.h"
#include "adapters/modquery.h"
#include "adapters/pciname.h"
#include "fuzz/fuzzsupport.h"
#include "util/sysaccess.h"

namespace {

constexpr size_t LONGEST_LINE = 1023;

size_t ReportedCount = 0;
std::vector<uint8_t> Answer;

int FakeQueryModule(const char*, int which, void* buffer, size_t size, size_t* ret) {
    if (which != QM_SYMBOLS) {
        errno = EINVAL;
        return -1;
    }
    if (size < Answer.size()) {
        *ret = Answer.size();
        errno = ENOSPC;
        return -1;
    }
    if (!Answer.empty()) {
        std::memcpy(buffer, Answer.data(), Answer.size());
    }
    *ret = ReportedCount;
    return 0;
}

// The lookup read the plain way: every line, each cut to LONGEST_LINE bytes.
std::string PlainLookup(const std::string& text, const char keys[4][5]) {
    std::string found[3];
    size_t start = 0;
    while (start < text.size()) {
        size_t end = text.find('\n', start);
        end = end == std::string::npos ? text.size() : end;
        std::string line = text.substr(start, std::min(end - start, LONGEST_LINE));
        start = end + 1;
        std::vector<char> buffer(line.c_str(), line.c_str() + line.size() + 1);
        char* l = buffer.data();
        if (TrimComment(l, "#") == 0) {
            continue;
        }
        int indent = TrimIndent(l);
        if (*l == '\0' || indent > 2 || (indent > 0 && found[indent - 1].empty())) {
            continue;
        }
        if (indent < 2 && !found[indent].empty()) {
            break;
        }
        if (std::strncmp(l, keys[indent], 4) != 0 || TrimID(l) == 0) {
            continue;
        }
        if (indent == 2 && (std::strncmp(l, keys[3], 4) != 0 || TrimID(l) == 0)) {
            continue;
        }
        found[indent] = l;
        if (indent == 2) {
            break;
        }
    }
    if (found[0].empty()) {
        return "";
    }
    return found[0] + " " +
           (!found[2].empty()   ? found[2]
            : !found[1].empty() ? found[1]
                                : "unknown device");
}

void Lookup(const uint8_t* data, size_t size) {
    if (size < 9) {
        return;
    }
    _PCI_CONFIG0 config{};
    config.VendorID = static_cast<uint16_t>(data[0] | data[1] << 8);
    config.DeviceID = static_cast<uint16_t>(data[2] | data[3] << 8);
    config.SubSysVendorID = static_cast<uint16_t>(data[4] | data[5] << 8);
    config.SubSystemID = static_cast<uint16_t>(data[6] | data[7] << 8);
    constexpr size_t FIRST_BLOCK = 64 * 1024 - 1;
    std::string text = "#" + std::string(FIRST_BLOCK - 4 * data[8] - 2, '-') + "\n";
    text.append(data + 9, data + size);
    WriteFile(SysPaths().PciIds, reinterpret_cast<const uint8_t*>(text.data()), text.size());
    AdapterDescriptor adapter;
    if (!GetAdapterName(&adapter, &config)) {
        Violated("the database could not be read");
    }
    char keys[4][5];
    std::snprintf(keys[0], 5, "%04x", config.VendorID);
    std::snprintf(keys[1], 5, "%04x", config.DeviceID);
    std::snprintf(keys[2], 5, "%04x", config.SubSysVendorID);
    std::snprintf(keys[3], 5, "%04x", config.SubSystemID);
    std::wstring plain;
    for (char c : PlainLookup(text, keys)) {
        plain += static_cast<wchar_t>(static_cast<unsigned char>(c));  // widened byte by byte
    }
    if (adapter.Name != plain) {
        Violated("the name differs from a plain reading of the database");
    }
}

}  // namespace

void SetUpHarness() {
    SysCalls().QueryModule = FakeQueryModule;
    SysPaths().PciIds = ScratchPath("pci.ids");
    SysPaths().PciIdsMisc.clear();
    SysPaths().PciIdsHwdata.clear();
    SysPaths().ProcBusPci = ScratchPath("pci");
    SysPaths().SysconfigKernel = ScratchPath("kernel");
    mkdir(SysPaths().ProcBusPci.c_str(), 0700);
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size < 1) {
        return 0;
    }
    StartInput();
    AdapterDescriptor adapter;
    adapter.ModuleName = DupHeapCString("e1000");
    switch (data[0]) {
        case 0:
            Lookup(data + 1, size - 1);
            break;
        case 1:
            if (size >= 3) {
                adapter.Bus = data[1];
                adapter.Device = data[2] >> 3;
                adapter.Function = data[2] & 7u;
                WriteFile(SysPaths().ProcBusPci + "/devices", data + 3, size - 3);
                GetModuleName(&adapter, SysPaths().ProcBusPci.c_str());
                const char* name = adapter.ModuleName.get();
                if (name != nullptr &&
                    (std::strchr(name, '\t') != nullptr || std::strlen(name) > LONGEST_LINE)) {
                    Violated("a module name holds a tab or is longer than a line");
                }
            }
            break;
        case 2:
            if (size >= 3) {
                ReportedCount = data[1] | static_cast<size_t>(data[2]) << 8;
                Answer.assign(data + 3, data + size);
                GetDriverName(&adapter);
            }
            break;
        case 3:
            WriteFile(SysPaths().SysconfigKernel, data + 1, size - 1);
            IsBootDevice(&adapter);
            break;
        default:
            break;
    }
    return 0;
}
