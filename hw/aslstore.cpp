#include "hw/aslstore.h"

#include <memory>
#include <utility>

#include "diag/checkedalloc.h"
#include "diag/hwdebug.h"
#include "diag/progname.h"
#include "model/hwobjects.h"
#include "sources/aslpacket.h"

namespace {

bool Tracing(uint32_t bits) {
    return (HwInfoPrintLevel & bits) != 0;
}

const wchar_t* BoolText(bool value) {
    return value ? L"True" : L"False";
}

// A store trace line that shows a value in hexadecimal and decimal.
void TraceValue(const char* format, uint32_t value) {
    dbgprint(format, value, value);
}

// Bus speed codes of the packet: 0 conventional 33 MHz, 1 conventional 66 MHz, 5, 6 and 7
// PCI-X at 66, 100 and 133 MHz. Anything else is unknown and yields 0.
uint32_t BusSpeedMHz(uint8_t code, bool& known) {
    known = true;
    switch (code) {
        case 0:
            return 33;
        case 1:
        case 5:
            return 66;
        case 6:
            return 100;
        case 7:
            return 133;
        default:
            known = false;
            return 0;
    }
}

bool Bit(uint8_t value, unsigned bit) {
    return ((value >> bit) & 1u) != 0;
}

int StoreSystem(std::unique_ptr<SystemDescriptor> system, const char* title) {
    if (Tracing(TRACE_STORE_ASL | TRACE_STORE_SYSTEM)) {
        dbgprint("\n");
        dbgprint(title);
        dbgprint("\n");
        TraceValue("      desc->SystemID:  0x%02x  (%d)\n", system->SystemID);
        TraceValue("    desc->ChassisNum:  0x%02x  (%d)\n", system->ChassisNum);
        TraceValue("     desc->DrawerNum:  0x%02x  (%d)\n", system->DrawerNum);
        TraceValue("      desc->StringID:  0x%02x  (%d)\n", system->StringID);
        dbgprint("    desc->ExpnDrawer:  %s\n", BoolText(system->ExpnDrawer != 0));
        dbgprint("\n");
    }
    AddOrReport(SystemList, std::move(system), "StoreAslTable()");
    return 0;
}

void StoreString(AslStringTable& strings, const AslDescriptor& descriptor) {
    const uint8_t number = descriptor.Fields[1];
    const auto* text = reinterpret_cast<const char*>(descriptor.Fields + 2);
    strings[number] = text;
    if (Tracing(TRACE_STORE_ASL | TRACE_STORE_STRING)) {
        dbgprint("\n");
        dbgprint("Stored String Descriptor:\n");
        dbgprint("\n");
        dbgprint("    strings[%d]:  %s\n", number, MakeWideString(text, WideBuffer));
        dbgprint("\n");
    }
}

// The parse trace line of a known descriptor type; null for an unknown one.
const char* ParseTrace(uint8_t validType) {
    switch (validType) {
        case BUS_TYPE:
            return "StoreAslTable():  BUS_TYPE\n";
        case SLOT_TYPE:
            return "StoreAslTable():  SLOT_TYPE\n";
        case CHASSIS_TYPE:
            return "StoreAslTable():  CHASSIS_TYPE\n";
        case DRAWER_TYPE:
            return "StoreAslTable():  DRAWER_TYPE\n";
        case STRING_TYPE:
            return "StoreAslTable():  STRING_TYPE\n";
        default:
            return nullptr;
    }
}

void ReportError(const wchar_t* function) {
    dbgprint("%s, %s:  ", _ProgramName, function);
}

// Stores each valid descriptor as the walk hands it out and collects the strings.
class AslStorer : public AslVisitor {
  public:
    explicit AslStorer(const _ASL_PACKET* packet) : Packet(packet) {}

    void Visit(const AslDescriptor& descriptor) override {
        const char* trace = ParseTrace(descriptor.ValidType);
        if (trace == nullptr) {
            dbgprint("\n");
            ReportError(L"StoreAslTable()");
            dbgprint("Unknown descriptor type (0x%02x)\n", descriptor.Type);
            dbgprint("\n");
            return;
        }
        Trace(trace);
        if ((descriptor.Type & VALID_DESCRIPTOR) == 0) {
            return;
        }
        switch (descriptor.ValidType) {
            case BUS_TYPE: {
                const auto bus = DescriptorRecord<_ASL_BUS_DESCRIPTOR>(descriptor);
                StoreBusDescriptor(&bus);
                break;
            }
            case SLOT_TYPE: {
                const auto slot = DescriptorRecord<_ASL_SLOT_DESCRIPTOR>(descriptor);
                StoreSlotDescriptor(&slot);
                break;
            }
            case CHASSIS_TYPE: {
                const auto chassis = DescriptorRecord<_ASL_CHASSIS_DESCRIPTOR>(descriptor);
                StoreChassisDescriptor(&chassis, SystemCount++);
                break;
            }
            case DRAWER_TYPE: {
                const auto drawer = DescriptorRecord<_ASL_DRAWER_DESCRIPTOR>(descriptor);
                StoreDrawerDescriptor(&drawer, SystemCount++);
                break;
            }
            default:
                StoreString(Strings, descriptor);
                break;
        }
    }

    void Stepped(uint32_t next) override {
        if (Tracing(TRACE_PARSE)) {
            dbgprint("StoreAslTable();  next descriptor:  %08x\n", TraceAddress(Packet) + next);
        }
    }

    static void Trace(const char* line) {
        if (Tracing(TRACE_PARSE)) {
            dbgprint(line);
        }
    }

    AslStringTable Strings{};

  private:
    const _ASL_PACKET* Packet;
    uint32_t SystemCount = 0;
};

}  // namespace

void StoreAslTable(const _ASL_PACKET* packet, uint32_t size) {
    AslStorer storer(packet);
    storer.Trace("StoreAslTable():  entry\n");
    if (!IsAslPacket(packet, size)) {
        dbgprint("\n");
        ReportError(L"StoreAslTable()");
        dbgprint("Packet at 0x%08x is not an ASL packet\n", TraceAddress(packet));
        dbgprint("\n");
        return;
    }
    storer.Trace("StoreAslTable():  packet is valid\n");
    storer.Trace("StoreAslTable():  strings initialized\n");
    if (Tracing(TRACE_PARSE)) {
        dbgprint("StoreAslTable();  first descriptor:  %08x\n",
                 TraceAddress(reinterpret_cast<const RAW_ASL_DATA*>(packet) +
                              sizeof(_ASL_TABLE_HEADER)));
    }
    WalkAslPacket(packet, size, storer);
    storer.Trace("StoreAslTable();  parse complete, calling XRefAsl()\n");
    XRefAsl(storer.Strings);
    storer.Trace("StoreAslTable():  exit\n");
}

int StoreChassisDescriptor(const _ASL_CHASSIS_DESCRIPTOR* descriptor, uint32_t systemIndex) {
    std::unique_ptr<SystemDescriptor> system = NewObject<SystemDescriptor>("StoreAslTable()");
    if (system == nullptr) {
        return 0;
    }
    system->SystemID = systemIndex;
    system->ChassisNum = descriptor->ChassisID;
    system->DrawerNum = NONE_BYTE;
    system->ExpnDrawer = 0;
    system->StringID = descriptor->StringID;
    return StoreSystem(std::move(system), "Stored Chassis Descriptor:\n");
}

int StoreDrawerDescriptor(const _ASL_DRAWER_DESCRIPTOR* descriptor, uint32_t systemIndex) {
    std::unique_ptr<SystemDescriptor> system = NewObject<SystemDescriptor>("StoreAslTable()");
    if (system == nullptr) {
        return 0;
    }
    system->SystemID = systemIndex;
    system->ChassisNum = NONE_BYTE;
    system->DrawerNum = descriptor->DrawerID;
    system->ExpnDrawer = 1;
    system->StringID = descriptor->StringID;
    return StoreSystem(std::move(system), "Stored Drawer Descriptor:\n");
}

int StoreBusDescriptor(const _ASL_BUS_DESCRIPTOR* descriptor) {
    std::unique_ptr<BusDescriptor> bus = NewObject<BusDescriptor>("StoreAslTable()");
    if (bus == nullptr) {
        return 0;
    }
    bus->BusID = descriptor->BusID;
    bus->ChassisNum = descriptor->ChassisID;
    bus->DrawerNum = descriptor->DrawerID;
    bus->BusNum = descriptor->BusNumber;
    bus->LoadAt33 = descriptor->MaxAdapterAt33;
    bus->LoadAt66 = descriptor->MaxAdapterAt66;
    bus->LoadAtX66 = descriptor->MaxAdapterAtX66;
    bus->LoadAtX100 = descriptor->MaxAdapterAtX100;
    bus->LoadAtX133 = descriptor->MaxAdapterAtX133;
    bus->InPciXMode = descriptor->CurrentBusSpeed > 1;
    bus->SupHotPlug = false;
    bool known = false;
    bus->CurBusSpeed = BusSpeedMHz(descriptor->CurrentBusSpeed, known);
    if (!known) {
        ReportError(L"StoreBusDescriptor()");
        dbgprint("Unknown bus speed (%02x)\n", descriptor->CurrentBusSpeed);
    }
    bus->FirstSlot = NONE_VALUE;
    bus->SlotCt = 0;

    if (Tracing(TRACE_STORE_ASL | TRACE_STORE_BUS)) {
        dbgprint("\n");
        dbgprint("Stored Bus Descriptor:\n");
        dbgprint("\n");
        TraceValue("          desc->BusID:  0x%02x  (%d)\n", bus->BusID);
        TraceValue("     desc->ChassisNum:  0x%02x  (%d)\n", bus->ChassisNum);
        TraceValue("      desc->DrawerNum:  0x%02x  (%d)\n", bus->DrawerNum);
        TraceValue("         desc->BusNum:  0x%02x  (%d)\n", bus->BusNum);
        TraceValue("       desc->LoadAt33:  0x%02x  (%d)\n", bus->LoadAt33);
        TraceValue("       desc->LoadAt66:  0x%02x  (%d)\n", bus->LoadAt66);
        TraceValue("      desc->LoadAtX66:  0x%02x  (%d)\n", bus->LoadAtX66);
        TraceValue("     desc->LoadAtX100:  0x%02x  (%d)\n", bus->LoadAtX100);
        TraceValue("     desc->LoadAtX133:  0x%02x  (%d)\n", bus->LoadAtX133);
        TraceValue("    desc->CurBusSpeed:  0x%02x  (%d)\n", bus->CurBusSpeed);
        dbgprint("     desc->InPciXMode:  %s\n", BoolText(bus->InPciXMode));
        dbgprint("     desc->SupHotPlug:  %s\n", BoolText(bus->SupHotPlug));
        dbgprint("\n");
        dbgprint("      desc->FirstSlot initialized to 0x%08x\n", bus->FirstSlot);
        dbgprint("         desc->SlotCt initialized to 0x%08x\n", bus->SlotCt);
        dbgprint("\n");
    }
    AddOrReport(BusList, std::move(bus), "StoreAslTable()");
    return 0;
}

int StoreSlotDescriptor(const _ASL_SLOT_DESCRIPTOR* descriptor) {
    std::unique_ptr<SlotDescriptor> slot = NewObject<SlotDescriptor>("StoreAslTable()");
    if (slot == nullptr) {
        return 0;
    }
    const uint8_t attrib1 = descriptor->Attrib1;
    slot->SlotID = descriptor->SlotID;
    slot->BusID = descriptor->BusID;
    slot->DevNum = descriptor->DeviceNum;
    slot->FriendlyNum = descriptor->Sun;
    slot->AttnReason = descriptor->AttnReason;
    slot->Status = descriptor->Status;
    slot->SpeedBits = descriptor->Attrib2 & 0x7Fu;
    slot->PciX = (descriptor->Attrib2 & 0x7Cu) != 0;
    slot->AttnLedBlinking = Bit(descriptor->LedStatus, 3);
    slot->SlotUiNumber = descriptor->SlotUiNumber;
    slot->Width = Bit(attrib1, 2) ? 64 : 32;
    slot->SupHotPlug = Bit(attrib1, 0);
    slot->Sup5V = Bit(attrib1, 1);
    slot->SupPME = Bit(attrib1, 4);
    slot->SupSMBUS = Bit(attrib1, 5);
    slot->HalfLength = Bit(attrib1, 6);
    slot->LowProfile = Bit(attrib1, 7);

    if (Tracing(TRACE_STORE_ASL | TRACE_STORE_SLOT)) {
        dbgprint("\n");
        dbgprint("Stored Slot Descriptor:\n");
        dbgprint("\n");
        TraceValue("             desc->SlotID:  0x%02x  (%d)\n", slot->SlotID);
        TraceValue("              desc->BusID:  0x%02x  (%d)\n", slot->BusID);
        TraceValue("             desc->DevNum:  0x%02x  (%d)\n", slot->DevNum);
        TraceValue("        desc->FriendlyNum:  0x%02x  (%d)\n", slot->FriendlyNum);
        TraceValue("         desc->AttnReason:  0x%02x  (%d)\n", slot->AttnReason);
        TraceValue("             desc->Status:  0x%02x  (%d)\n", slot->Status);
        TraceValue("          desc->SpeedBits:  0x%02x  (%d)\n", slot->SpeedBits);
        TraceValue("              desc->Width:  0x%02x  (%d)\n", slot->Width);
        dbgprint("               desc->PciX:  %s\n", BoolText(slot->PciX));
        dbgprint("    desc->AttnLedBlinking:  %s\n", BoolText(slot->AttnLedBlinking));
        dbgprint("              desc->Sup5V:  %s\n", BoolText(slot->Sup5V));
        dbgprint("             desc->SupPME:  %s\n", BoolText(slot->SupPME));
        dbgprint("           desc->SupSMBUS:  %s\n", BoolText(slot->SupSMBUS));
        dbgprint("         desc->SupHotPlug:  %s\n", BoolText(slot->SupHotPlug));
        dbgprint("         desc->HalfLength:  %s\n", BoolText(slot->HalfLength));
        dbgprint("         desc->LowProfile:  %s\n", BoolText(slot->LowProfile));
        dbgprint("\n");
    }
    AddOrReport(SlotList, std::move(slot), "StoreAslTable()");
    return 0;
}
