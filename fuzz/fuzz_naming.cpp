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

size_t ReportedCount = 0;
std::vector<uint8_t> Answer;

int FakeQueryModule(const char*, int, void* buffer, size_t size, size_t* ret) {
    if (size < Answer.size()) {
        *ret = Answer.size();
        errno = ENOSPC;
        return -1;
    }
    std::copy(Answer.begin(), Answer.end(), static_cast<uint8_t*>(buffer));
    *ret = ReportedCount;
    return 0;
}

// The lookup read the plain way: every line, each cut to 1023 bytes; keys vendor, device,
// subsystem vendor, subsystem.
std::string PlainLookup(const std::string& text, const char keys[4][5]) {
    std::string found[3];
    for (size_t start = 0, end = 0; start < text.size() && found[2].empty(); start = end + 1) {
        end = std::min(text.find('\n', start), text.size());
        std::string copy = text.substr(start, std::min<size_t>(end - start, 1023));
        char* line = copy.data();
        if (TrimComment(line, "#") == 0) {
            continue;
        }
        int indent = TrimIndent(line);
        if (*line == '\0' || indent > 2 || (indent > 0 && found[indent - 1].empty())) {
            continue;
        }
        if (indent < 2 && !found[indent].empty()) {
            break;
        }
        if (std::strncmp(line, keys[indent], 4) == 0 && TrimID(line) != 0 &&
            (indent < 2 || (std::strncmp(line, keys[3], 4) == 0 && TrimID(line) != 0))) {
            found[indent] = line;
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
    uint16_t ids[4];
    char keys[4][5];
    for (int i = 0; i < 4; ++i) {
        ids[i] = static_cast<uint16_t>(data[2 * i] | data[2 * i + 1] << 8);
        std::snprintf(keys[i], sizeof keys[i], "%04x", ids[i]);
    }
    _PCI_CONFIG0 config{};
    config.VendorID = ids[0];
    config.DeviceID = ids[1];
    config.SubSysVendorID = ids[2];
    config.SubSystemID = ids[3];
    std::string text = "#" + std::string(64 * 1024 - 3 - 4 * data[8], '-') + "\n";
    text.append(data + 9, data + size);
    WriteFile(SysPaths().PciIds, reinterpret_cast<const uint8_t*>(text.data()), text.size());
    AdapterDescriptor adapter;
    std::wstring plain;
    for (char c : PlainLookup(text, keys)) {
        plain += static_cast<wchar_t>(static_cast<unsigned char>(c));  // widened byte by byte
    }
    if (!GetAdapterName(&adapter, &config) || adapter.Name != plain) {
        Violated("the lookup differs from a plain reading of the database");
    }
}

}  // namespace

void SetUpHarness() {
    SysCalls().QueryModule = FakeQueryModule;
    SysPaths().PciIds = ScratchPath("pci.ids");
    SysPaths().PciIdsMisc.clear();
    SysPaths().PciIdsHwdata.clear();
    SysPaths().SysconfigKernel = ScratchPath("kernel");
    mkdir(ScratchPath("pci").c_str(), 0700);
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size < 3) {
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
            adapter.Bus = data[1];
            adapter.Device = data[2] >> 3u;
            adapter.Function = data[2] & 7u;
            WriteFile(ScratchPath("pci/devices"), data + 3, size - 3);
            GetModuleName(&adapter, ScratchPath("pci").c_str());
            break;
        case 2:
            ReportedCount = data[1] | static_cast<size_t>(data[2]) << 8;
            Answer.assign(data + 3, data + size);
            GetDriverName(&adapter);
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
