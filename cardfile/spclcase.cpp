#include "cardfile/spclcase.h"

#include <cstddef>
#include <cstdint>
#include <cstring>

#include "model/hwobjects.h"
#include "pciconfig.h"
#include "setup/linsetup.h"

namespace {

bool Equal(const char* text, const char* expected) {
    return text != nullptr && std::strcmp(text, expected) == 0;
}

// The little-endian 16-bit value at offset of a configuration image.
uint16_t ConfigWord(const AdapterDescriptor& adapter, size_t offset) {
    return static_cast<uint16_t>(adapter.ConfigSpace[offset] | adapter.ConfigSpace[offset + 1]
                                                                   << 8);
}

bool IsBootGraphics(const AdapterDescriptor& adapter) {
    return ConfigWord(adapter, offsetof(_PCI_CONFIG0, VendorID)) == 0x1002 &&
           ConfigWord(adapter, offsetof(_PCI_CONFIG0, DeviceID)) == 0x5159 &&
           ConfigWord(adapter, offsetof(_PCI_CONFIG0, SubSysVendorID)) == 0x7E52 &&
           ConfigWord(adapter, offsetof(_PCI_CONFIG0, SubSystemID)) == 0x03C1;
}

}  // namespace

void SpecialCaseSystems() {}

void SpecialCaseBusses() {}

void SpecialCaseSlots() {
    if (!Equal(Distributor, "SuSE") || !Equal(DistVersion, "SLES-8")) {
        return;
    }
    SlotList.BeginEnumeration();
    while (SlotDescriptor* slot = SlotList.Next()) {
        slot->SupHotPlug = false;
    }
}

void SpecialCaseAdapters() {
    AdapterList.BeginEnumeration();
    while (AdapterDescriptor* adapter = AdapterList.Next()) {
        if (IsBootGraphics(*adapter)) {
            adapter->IsBootDev = true;
        }
    }
}
