#include "sources/asldump.h"

#include <algorithm>
#include <cstring>

#include "diag/dumpfields.h"
#include "diag/hwdebug.h"
#include "diag/hwdump.h"
#include "sources/aslpacket.h"

namespace {

const FieldWriter& SystemDescriptorField() {
    static const FieldWriter field(18, ": ", "0x%02x  (%d)");
    return field;
}

// Chassis and drawer descriptors differ only in the name of byte 2.
template <typename Record>
void DumpSystemDescriptor(const char* title, const char* idLabel, uint8_t id,
                          const Record* descriptor) {
    const FieldWriter& field = SystemDescriptorField();
    DumpTitle(title);
    field.Number("DescriptorType", descriptor->DescriptorType);
    field.Number("Length", descriptor->Length);
    field.Number(idLabel, id);
    field.Number("Reserved0", descriptor->Reserved0);
    field.Number("StringID", descriptor->StringID);
}

// Dumps each descriptor the walk hands out and counts the known ones.
class AslDumper : public AslVisitor {
  public:
    void Visit(const AslDescriptor& descriptor) override {
        switch (descriptor.ValidType) {
            case BUS_TYPE: {
                const auto bus = DescriptorRecord<_ASL_BUS_DESCRIPTOR>(descriptor);
                DumpBusDescriptor(&bus);
                break;
            }
            case SLOT_TYPE: {
                const auto slot = DescriptorRecord<_ASL_SLOT_DESCRIPTOR>(descriptor);
                DumpSlotDescriptor(&slot);
                break;
            }
            case CHASSIS_TYPE: {
                const auto chassis = DescriptorRecord<_ASL_CHASSIS_DESCRIPTOR>(descriptor);
                DumpChassisDescriptor(&chassis);
                break;
            }
            case DRAWER_TYPE: {
                const auto drawer = DescriptorRecord<_ASL_DRAWER_DESCRIPTOR>(descriptor);
                DumpDrawerDescriptor(&drawer);
                break;
            }
            case STRING_TYPE:
                DumpStringDescriptor(
                    reinterpret_cast<const _ASL_STRING_DESCRIPTOR*>(descriptor.Fields));
                break;
            default:
                dbgprint("\n");
                dbgprint("Unknown descriptor type (0x%02x)\n", descriptor.Type);
                dbgprint("\n");
                return;
        }
        Count++;
    }

    int32_t Count = 0;
};

}  // namespace

void DumpRawAslPacket(const _ASL_PACKET* packet, uint32_t size) {
    if ((HwInfoPrintLevel & RAW_ASL) == 0 || packet == nullptr) {
        return;
    }
    DumpTitle("Buffer Contents:\n");
    DumpByteBuffer(reinterpret_cast<const char*>(packet), std::min(size, ASL_PACKET_CAPACITY), 0,
                   16);
    dbgprint("\n");
}

void DumpAslPacket(const _ASL_PACKET* packet, uint32_t size) {
    if (!IsAslPacket(packet, size)) {
        dbgprint("\n");
        dbgprint("Packet at 0x%08x is not an ASL packet\n", TraceAddress(packet));
        dbgprint("\n");
        return;
    }
    // Header bytes the source did not deliver show as 0.
    _ASL_TABLE_HEADER header{};
    std::memcpy(&header, packet, std::min<size_t>(size, sizeof(header)));
    wchar_t text[WIDE_BUFFER_CHARS];
    const FieldWriter field(17, ": ", "%d");
    DumpTitle("Table Header\n");
    field.Text("Signature", MakeWideStringN(header.Signature, text, sizeof(header.Signature)));
    field.Number("Length", header.Length);
    field.Number("Revision", header.Revision);
    field.Number("MinorRevision", header.MinorRevision);
    field.Text("MachineID", MakeWideStringN(header.MachineID, text, sizeof(header.MachineID)));
    dbgprint("\n");

    AslDumper dumper;
    WalkAslPacket(packet, size, dumper);
    dbgprint("\n");
    dbgprint("Found %d valid descriptors\n", dumper.Count);
    dbgprint("\n");
}

void DumpChassisDescriptor(const _ASL_CHASSIS_DESCRIPTOR* descriptor) {
    DumpSystemDescriptor("Chassis Descriptor\n", "ChassisID", descriptor->ChassisID, descriptor);
}

void DumpDrawerDescriptor(const _ASL_DRAWER_DESCRIPTOR* descriptor) {
    DumpSystemDescriptor("Drawer Descriptor\n", "DrawerID", descriptor->DrawerID, descriptor);
}

void DumpBusDescriptor(const _ASL_BUS_DESCRIPTOR* descriptor) {
    const FieldWriter field(20, ": ", "0x%02x  (%d)");
    DumpTitle("Bus Descriptor\n");
    field.Number("DescriptorType", descriptor->DescriptorType);
    field.Number("Length", descriptor->Length);
    field.Number("BusID", descriptor->BusID);
    field.Number("ChassisID", descriptor->ChassisID);
    field.Number("DrawerID", descriptor->DrawerID);
    field.Number("BusNumber", descriptor->BusNumber);
    field.Number("ParentBusID", descriptor->ParentBusID);
    field.Number("Attribute", descriptor->Attribute);
    field.Number("CurrentBusSpeed", descriptor->CurrentBusSpeed);
    field.Number("MaxAdapterAt33", descriptor->MaxAdapterAt33);
    field.Number("MaxAdapterAt66", descriptor->MaxAdapterAt66);
    field.Number("MaxAdapterAtX66", descriptor->MaxAdapterAtX66);
    field.Number("MaxAdapterAtX100", descriptor->MaxAdapterAtX100);
    field.Number("MaxAdapterAtX133", descriptor->MaxAdapterAtX133);
    dbgprint("\n");
}

void DumpSlotDescriptor(const _ASL_SLOT_DESCRIPTOR* descriptor) {
    const FieldWriter field(18, ": ", "0x%02x   (%d)");
    DumpTitle("Slot Descriptor\n");
    field.Number("DescriptorType", descriptor->DescriptorType);
    field.Number("Length", descriptor->Length);
    field.Number("SlotID", descriptor->SlotID, "0x%04x (%d)");
    field.Number("BusID", descriptor->BusID);
    field.Number("DeviceNum", descriptor->DeviceNum);
    field.Number("Sun", descriptor->Sun);
    field.Number("Attrib1", descriptor->Attrib1);
    field.Number("Attrib2", descriptor->Attrib2);
    field.Number("AttnReason", descriptor->AttnReason);
    field.Number("Status", descriptor->Status);
    dbgprint("\n");
}

void DumpStringDescriptor(const _ASL_STRING_DESCRIPTOR* descriptor) {
    const FieldWriter& field = SystemDescriptorField();
    wchar_t text[WIDE_BUFFER_CHARS];
    DumpTitle("String Descriptor\n");
    field.Number("DescriptorType", descriptor->DescriptorType);
    field.Number("StringNum", descriptor->StringNum);
    field.Text("String", MakeWideString(descriptor->String, text));
}
