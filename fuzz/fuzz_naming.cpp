// The readers that name an adapter and find its driver, chosen by the first byte:
//   0  the PCI ID database: four little-endian 16-bit IDs, a byte that places the end of the
//      first read block (4 times its value into the database, after a long comment line), then
//      the database. The name must be the one a plain line-by-line reading gives.
//   1  the PCI device list: bus and devfn bytes, then the list.
//   2  a module's symbol list: a little-endian 16-bit count, then the buffer query_module fills.
//   3  /etc/sysconfig/kernel.
#include <sys/stat.h>

#include "adapters/moddriver.h"
#include "adapters/pciname.h"
#include "fuzz/fuzzsupport.h"

// The lookup read the plain way: every line, each cut to 1023 bytes; keys vendor, device,
// subsystem vendor, subsystem.
static std::string PlainLookup(const std::string& text, const char keys[4][5]) {
    std::string found[3];
    for (size_t start = 0, end = 0; start < text.size() && found[2].empty(); start = end + 1) {
        end = std::min(text.find('\n', start), text.size());
        std::string copy = text.substr(start, std::min<size_t>(end - start, 1023));
        char* line = copy.data();
        const int indent = TrimComment(line, "#") == 0 ? 3 : TrimIndent(line);
        if (indent > 2 || *line == '\0' || (indent > 0 && found[indent - 1].empty())) {
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
    return found[0].empty() ? ""
                            : found[0] + " " +
                                  (!found[2].empty()   ? found[2]
                                   : !found[1].empty() ? found[1]
                                                       : "unknown device");
}

static void Lookup(const uint8_t* data, size_t size) {
    if (size < 9) {
        return;
    }
    _PCI_CONFIG0 config{};
    std::memcpy(&config.VendorID, data, 4);            // and the device ID
    std::memcpy(&config.SubSysVendorID, data + 4, 4);  // and the subsystem ID
    char keys[4][5];
    for (int i = 0; i < 4; ++i) {
        std::snprintf(keys[i], sizeof keys[i], "%04x", data[2 * i] | data[2 * i + 1] << 8);
    }
    std::string text = "#" + std::string(64 * 1024 - 3 - 4 * data[8], '-') + "\n";
    text.append(data + 9, data + size);
    WriteFile(SysPaths().PciIds, reinterpret_cast<const uint8_t*>(text.data()), text.size());
    AdapterDescriptor adapter;
    const std::string plain = PlainLookup(text, keys);
    const auto* bytes = reinterpret_cast<const unsigned char*>(plain.data());  // widened bytewise
    Check(GetAdapterName(&adapter, &config) &&
              adapter.Name == std::wstring(bytes, bytes + plain.size()),
          "the lookup differs from a plain reading of the database");
}

void SetUpHarness() {
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
    const InputScope input;
    AdapterDescriptor adapter;
    adapter.ModuleName = DupHeapCString("e1000");
    if (data[0] == 0) {
        Lookup(data + 1, size - 1);
    } else if (data[0] == 1) {
        adapter.Bus = data[1];
        adapter.Device = data[2] >> 3u;
        adapter.Function = data[2] & 7u;
        WriteFile(ScratchPath("pci/devices"), data + 3, size - 3);
        GetModuleName(&adapter, ScratchPath("pci").c_str());
    } else if (data[0] == 2) {
        AnswerQueryModule(data + 1, size - 1);
        GetDriverName(&adapter);
    } else if (data[0] == 3) {
        WriteFile(SysPaths().SysconfigKernel, data + 1, size - 1);
        IsBootDevice(&adapter);
    }
    return 0;
}
