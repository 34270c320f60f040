// A PCI function's configuration file (up to 4096 bytes): GetPciConfig's walk over the file,
// StorePciConfig and GetCap over its image, and the image walk over the raw bytes. The seeds: a
// header-only file, lists with an unknown item, a loop, and items at the image's end.
#include "adapters/cfgspace.h"
#include "fuzz/fuzzsupport.h"

static void CheckWalk(const _PCI_CONFIG0* image) {
    unsigned items = 0;
    ForEachCapability(image, [&](uint8_t offset, const CAP_ITEM_HEADER* item) {
        Check(offset + CapabilityLen(item) <= static_cast<int>(PCI_CONFIG_SIZE) &&
                  ++items <= CAP_WALK_LIMIT,
              "the image walk visited an item past the image or past the bound");
        return true;
    });
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static const std::string path = ScratchPath("config");
    if (size > 4096) {
        return 0;
    }
    const InputScope input;
    WriteFile(path, data, size);
    char image[PCI_CONFIG_SIZE] = {};
    const int length = GetPciConfig(path.c_str(), 0, sizeof(image), image);
    Check((length == 0) == (size < PCI_HEADER_SIZE) && length <= static_cast<int>(sizeof(image)),
          "GetPciConfig's length is not that of the valid image");
    for (int at = 0; at < length; ++at) {
        Check(image[at] == 0 || (static_cast<size_t>(at) < size && image[at] == char(data[at])),
              "the image holds a byte the file does not");
    }
    const auto* config = reinterpret_cast<const _PCI_CONFIG0*>(image);
    AdapterDescriptor adapter;
    StorePciConfig(config, &adapter, length);
    const auto* pcix = reinterpret_cast<const char*>(GetCap(config, CAP_PCIX, length));
    Check(adapter.PciId.size() == 18 && (pcix == nullptr || pcix - image < length),
          "StorePciConfig's identity or GetCap's item is out of bounds");
    CheckWalk(config);
    if (size >= PCI_CONFIG_SIZE) {
        CheckWalk(reinterpret_cast<const _PCI_CONFIG0*>(data));
    }
    return 0;
}
