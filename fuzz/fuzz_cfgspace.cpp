// A PCI function's configuration file (input, up to 4096 bytes): GetPciConfig's walk over the
// file, StorePciConfig and GetCap over its image, and the image walk over the raw bytes. The
// seeds: a header-only file, lists with an unknown item, a loop, and items at the image's end.
#include <cstring>
#include <string>

#include "adapters/cfgspace.h"
#include "fuzz/fuzzsupport.h"

namespace {

std::string ConfigPath;

void CheckWalk(const _PCI_CONFIG0* image) {
    unsigned items = 0;
    ForEachCapability(image, [&](uint8_t offset, const CAP_ITEM_HEADER* item) {
        if (offset + CapabilityLen(item) > static_cast<int>(PCI_CONFIG_SIZE) ||
            ++items > CAP_WALK_LIMIT) {
            Violated("the image walk visited an item past the image or past the bound");
        }
        return true;
    });
}

}  // namespace

void SetUpHarness() {
    ConfigPath = ScratchPath("config");
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    StartInput();
    if (size > 4096) {
        return 0;
    }
    WriteFile(ConfigPath, data, size);
    char image[PCI_CONFIG_SIZE] = {};
    const int length = GetPciConfig(ConfigPath.c_str(), 0, sizeof(image), image);
    if ((length == 0) != (size < PCI_HEADER_SIZE) || length > static_cast<int>(sizeof(image))) {
        Violated("GetPciConfig's length is not that of the valid image");
    }
    for (int at = 0; at < length; ++at) {
        if (image[at] != 0 && (static_cast<size_t>(at) >= size || image[at] != char(data[at]))) {
            Violated("the image holds a byte the file does not");
        }
    }
    const auto* config = reinterpret_cast<const _PCI_CONFIG0*>(image);
    AdapterDescriptor adapter;
    StorePciConfig(config, &adapter, length);
    const auto* pcix = reinterpret_cast<const char*>(GetCap(config, CAP_PCIX, length));
    if (adapter.PciId.size() != 18 || (pcix != nullptr && pcix - image >= length)) {
        Violated("StorePciConfig's identity or GetCap's item is out of bounds");
    }
    CheckWalk(config);
    if (size >= PCI_CONFIG_SIZE) {
        CheckWalk(reinterpret_cast<const _PCI_CONFIG0*>(data));
    }
    return 0;
}
