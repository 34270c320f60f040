#include "adapters/adapterdump.h"

#include "adapters/cfgspace.h"
#include "diag/dumpfields.h"
#include "diag/hwdebug.h"
#include "diag/hwdump.h"

namespace {

bool ShowAdapter(const AdapterDescriptor* adapter) {
    const uint32_t bit = adapter->OnBoard ? DUMP_ONBOARD_ADAPTERS : DUMP_SLOT_ADAPTERS;
    return (HwInfoPrintLevel & bit) != 0;
}

void DumpAdapterList(const char* title, ObjListTemp<AdapterDescriptor>& list) {
    DumpTitle(title);
    list.BeginEnumeration();
    while (const AdapterDescriptor* adapter = list.Next()) {
        if (ShowAdapter(adapter)) {
            DumpAdapter(adapter);
        }
    }
}

const char* const FORM8 = "0x%02x";
const char* const FORM16 = "0x%04x";
const char* const FORM32 = "0x%08x";

// The first 16 bytes, alike in every header type.
template <typename Config>
void DumpCommonHeader(const FieldWriter& field, const Config* config) {
    field.Number("VendorID", config->VendorID, FORM16);
    field.Number("DeviceID", config->DeviceID, FORM16);
    field.Number("Command", config->Command, FORM16);
    field.Number("Status", config->Status, FORM16);
    field.Number("RevisionID", config->RevisionID, FORM8);
    field.Number("ProgIf", config->ProgIf, FORM8);
    field.Number("SubClass", config->SubClass, FORM8);
    field.Number("BaseClass", config->BaseClass, FORM8);
    field.Number("CacheLineSize", config->CacheLineSize, FORM8);
    field.Number("LatencyTimer", config->LatencyTimer, FORM8);
    field.Number("HeaderType", config->HeaderType, FORM8);
    field.Number("BIST", config->BIST, FORM8);
}

// The device-specific registers when asked for, and the closing blank line.
void DumpDeviceSpecific(const void* config, int full) {
    if (full != 0) {
        DumpTitle("OEM Specific Registers\n");
        DumpByteBuffer(static_cast<const char*>(config), PCI_DEVICE_SPECIFIC_SIZE, PCI_HEADER_SIZE,
                       16);
    }
    dbgprint("\n");
}

}  // namespace

void DumpAdapter(const AdapterDescriptor* adapter) {
    const FieldWriter field(15, ":  ", "0x%02x  (%d)");
    ObjectHeading("Adapter Object", adapter);
    field.Number("AdapterID", adapter->AdapterID, "%d");
    dbgprint("\n");
    field.Number("FriendlyNum", adapter->FriendlyNum);
    field.Number("SlotID", adapter->SlotID);
    field.Number("BusID", adapter->BusID);
    field.Number("MaxSpeed", adapter->MaxSpeed);
    field.Number("PowerReq", adapter->PowerReq);
    field.Number("Width", adapter->Width);
    field.Number("Bus", adapter->Bus);
    field.Number("Device", adapter->Device);
    field.Number("Function", adapter->Function);
    field.Flag("HasBridge", adapter->HasBridge);
    field.Flag("IsBootDev", adapter->IsBootDev);
    field.Flag("SupPciX", adapter->SupPciX);
    field.Flag("OnBoard", adapter->OnBoard);
    field.Text("Name", adapter->Name.c_str());
    field.Text("PciId", adapter->PciId.c_str());
    field.Text("Driver", adapter->Driver.c_str());
    wchar_t module[WIDE_BUFFER_CHARS];
    field.Text("ModuleName", MakeWideString(adapter->ModuleName.get(), module));
    dbgprint("\n");
    if ((HwInfoPrintLevel & DUMP_ADAPTER_CFG_SPACE) != 0) {
        DumpPciConfigSpace(reinterpret_cast<const _PCI_CONFIG0*>(adapter->ConfigSpace), 0);
    }
}

void DumpAdapters() {
    DumpAdapterList("Real Adapters\n", AdapterList);
    DumpAdapterList("Simulated Adapters\n", FileAdapters);
}

void DumpPciConfigSpace0(const _PCI_CONFIG0* config, int full) {
    const FieldWriter field(20, ":  ", FORM8);
    DumpTitle("Type 0 PCI Configuration Space\n");
    DumpCommonHeader(field, config);
    for (int i = 0; i < 6; i++) {
        field.Number(Indexed("BAR", i), config->BAR[i], FORM32);
    }
    field.Number("CardbusCisPtr", config->CardbusCisPtr, FORM32);
    field.Number("SubSysVendorID", config->SubSysVendorID, FORM16);
    field.Number("SubSystemID", config->SubSystemID, FORM16);
    field.Number("RomBaseAddress", config->RomBaseAddress, FORM32);
    field.Number("CapabilitiesPtr", config->CapabilitiesPtr, FORM8);
    for (int i = 0; i < 3; i++) {
        field.Number(Indexed("Reserved1", i), config->Reserved1[i], FORM8);
    }
    field.Number("Reserved2", config->Reserved2, FORM32);
    field.Number("InterruptLine", config->InterruptLine, FORM8);
    field.Number("InterruptPin", config->InterruptPin, FORM8);
    field.Number("MinGrant", config->MinGrant, FORM8);
    field.Number("MaxLatency", config->MaxLatency, FORM8);
    DumpDeviceSpecific(config, full);
}

void DumpPciConfigSpace1(const _PCI_CONFIG1* config, int full) {
    const FieldWriter field(21, ":  ", FORM8);
    DumpTitle("Type 1 PCI Configuration Space\n");
    DumpCommonHeader(field, config);
    dbgprint("\n");
    for (int i = 0; i < 2; i++) {
        field.Number(Indexed("BAR", i), config->BAR[i], FORM32);
    }
    field.Number("PrimaryBusNum", config->PrimaryBusNum, FORM8);
    field.Number("SecondaryBusNum", config->SecondaryBusNum, FORM8);
    field.Number("SubBusNumber", config->SubBusNumber, FORM8);
    field.Number("SecondaryLatencyTimer", config->SecondaryLatencyTimer, FORM8);
    field.Number("IoBase", config->IoBase, FORM8);
    field.Number("IoLimit", config->IoLimit, FORM8);
    field.Number("SecondaryStatus", config->SecondaryStatus, FORM16);
    field.Number("MemBase", config->MemBase, FORM16);
    field.Number("MemLimit", config->MemLimit, FORM16);
    field.Number("PrefetchMemBase", config->PrefetchMemBase, FORM16);
    field.Number("PrefetchMemLimit", config->PrefetchMemLimit, FORM16);
    field.Number("PrefetchBaseUpper32", config->PrefetchBaseUpper32, FORM32);
    field.Number("PrefetchLimitUpper32", config->PrefetchLimitUpper32, FORM32);
    field.Number("IOBaseUpper16", config->IOBaseUpper16, FORM16);
    field.Number("IOLimitUpper16", config->IOLimitUpper16, FORM16);
    field.Number("CapabilitiesPtr", config->CapabilitiesPtr, FORM8);
    for (int i = 0; i < 3; i++) {
        field.Number(Indexed("Reserved", i), config->Reserved[i], FORM8);
    }
    field.Number("ExpansionRomBAR", config->ExpansionRomBAR, FORM32);
    field.Number("InterruptLine", config->InterruptLine, FORM8);
    field.Number("InterruptPin", config->InterruptPin, FORM8);
    field.Number("BridgeControl", config->BridgeControl, FORM16);
    DumpDeviceSpecific(config, full);
}

void DumpPciConfigSpace2(const _PCI_CONFIG2* config, int full) {
    const FieldWriter field(20, ":  ", FORM8);
    DumpTitle("Type 2 PCI Configuration Space\n");
    DumpCommonHeader(field, config);
    field.Number("SocketRegsBaseAddr", config->SocketRegsBaseAddr, FORM32);
    field.Number("CapabilitiesPtr", config->CapabilitiesPtr, FORM8);
    field.Number("Reserved", config->Reserved, FORM8);
    field.Number("SecondaryStatus", config->SecondaryStatus, FORM16);
    field.Number("PrimaryBus", config->PrimaryBus, FORM8);
    field.Number("SecondaryBus", config->SecondaryBus, FORM8);
    field.Number("SubordinateBus", config->SubordinateBus, FORM8);
    field.Number("SecondaryLatency", config->SecondaryLatency, FORM8);
    for (int i = 0; i < 4; i++) {
        field.Number(Indexed("Range", i) + ".Base", config->Range[i].Base, FORM32);
        field.Number(Indexed("Range", i) + ".Limit", config->Range[i].Limit, FORM32);
    }
    field.Number("InterruptLine", config->InterruptLine, FORM8);
    field.Number("InterruptPin", config->InterruptPin, FORM8);
    field.Number("BridgeControl", config->BridgeControl, FORM16);
    DumpDeviceSpecific(config, full);
}

void DumpPciConfigSpace(const _PCI_CONFIG0* config, int full) {
    switch (config->HeaderType & 0x7Fu) {
        case 0:
            DumpPciConfigSpace0(config, full);
            break;
        case 1:
            DumpPciConfigSpace1(reinterpret_cast<const _PCI_CONFIG1*>(config), full);
            break;
        case 2:
            DumpPciConfigSpace2(reinterpret_cast<const _PCI_CONFIG2*>(config), full);
            break;
        default:
            dbgprint("\n");
            dbgprint("DumpPciConfigSpace(); unknown header type: 0x%02x (%d)\n", config->HeaderType,
                     config->HeaderType);
            dbgprint("\n");
            return;
    }
    DumpCapabilityList(config);
}

const wchar_t* CapabilityStr(const CAP_ITEM_HEADER* item) {
    switch (item->CapID) {
        case CAP_POWER_MANAGEMENT:
            return L"Power Management Interface";
        case CAP_AGP:
            return L"AGP Interface";
        case CAP_VPD:
            return L"VPD";
        case CAP_SLOT_ID:
            return L"Slot ID";
        case CAP_MSI:
            return L"Message Signaled Interrupts";
        case CAP_HOTSWAP:
            return L"Compact PCI Hotswap";
        case CAP_PCIX:
            return L"PCI-X";
        default:
            return L"Not Recognized";
    }
}

void DumpCapabilityList(const _PCI_CONFIG0* config) {
    if ((config->Status & PCI_STATUS_CAP_LIST) == 0) {
        return;
    }
    // The shared walk stops a looping list and an item that would reach past the image.
    ForEachCapability(config, [config](uint8_t offset, const CAP_ITEM_HEADER* item) {
        dbgprint("Capability List Item at 0x%02x:  %s\n", offset, CapabilityStr(item));
        dbgprint("\n");
        const auto length = static_cast<uint32_t>(CapabilityLen(item));
        DumpByteBuffer(reinterpret_cast<const char*>(config), length, offset, length);
        dbgprint("\n");
        dbgprint("\n");
        return true;
    });
}
