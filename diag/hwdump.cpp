#include "diag/hwdump.h"

#include <string>

#include "diag/dumpfields.h"
#include "diag/hwdebug.h"
#include "diag/linport.h"

namespace {

// Columns of a hex dump line of n bytes: offset and colon, then the hex part from column 12
// ("xx " a byte, "- " before byte n/2), then the character part from column 3n + 15 (a blank
// before byte n/2); 4n + 16 columns in all.
constexpr size_t HEX_COLUMN = 12;

char HexDigit(unsigned value) {
    return "0123456789abcdef"[value & 0xFu];
}

std::string HexDumpLine(const unsigned char* bytes, uint32_t count, uint32_t offset,
                        uint32_t perLine) {
    std::string line(4 * static_cast<size_t>(perLine) + 16, ' ');
    char digits[8];
    HexToAscii(offset, digits, 8);
    line.replace(1, 8, digits, 8);
    line[9] = ':';
    size_t hex = HEX_COLUMN;
    size_t text = 3 * static_cast<size_t>(perLine) + 15;
    for (uint32_t i = 0; i < count; i++) {
        if (i == perLine / 2) {
            line[hex] = '-';
            hex += 2;
            text++;
        }
        line[hex] = HexDigit(bytes[i] >> 4u);
        line[hex + 1] = HexDigit(bytes[i]);
        hex += 3;
        line[text++] = bytes[i] >= 32 && bytes[i] <= 126 ? static_cast<char>(bytes[i]) : '.';
    }
    return line.append("\r\n");
}

template <typename T>
void DumpList(ObjListTemp<T>& list, void (*dump)(const T*)) {
    list.BeginEnumeration();
    while (const T* object = list.Next()) {
        dump(object);
    }
}

}  // namespace

void ObjectHeading(const char* kind, const void* object) {
    dbgprint("\n");
    dbgprint(kind);
    if ((HwInfoPrintLevel & SHOW_OBJECT_ADDRESS) != 0) {
        dbgprint(" at 0x%08x:\n", TraceAddress(object));
    } else {
        dbgprint(":\n");
    }
    dbgprint("\n");
}

void DumpByteBuffer(const char* buffer, uint32_t length, uint32_t start, uint32_t perLine) {
    if (buffer == nullptr || perLine == 0) {
        return;
    }
    const auto* bytes = reinterpret_cast<const unsigned char*>(buffer);
    wchar_t wide[WIDE_BUFFER_CHARS];
    for (uint32_t done = 0; done < length; done += perLine) {
        const uint32_t count = length - done < perLine ? length - done : perLine;
        const std::string line = HexDumpLine(bytes + start + done, count, start + done, perLine);
        OutputDebugString(MakeWideString(line.c_str(), wide));
    }
}

void DumpSystem(const SystemDescriptor* system) {
    const FieldWriter field(17, ": ", "0x%02x  (%d)");
    ObjectHeading("System Object", system);
    field.Number("SystemID", system->SystemID);
    field.Number("StringID", system->StringID);
    field.Number("ChassisNum", system->ChassisNum);
    field.Number("DrawerNum", system->DrawerNum);
    field.Number("ExpnDrawer", system->ExpnDrawer);
    field.Number("FirstSlotNum", system->FirstSlotNum);
    field.Number("UnitSlotCount", system->UnitSlotCount);
    field.Text("Name", system->Name.c_str());
    dbgprint("\n");
}

void DumpBus(const BusDescriptor* bus) {
    const FieldWriter field(15, ": ", "0x%02x  (%d)");
    ObjectHeading("Bus Object", bus);
    field.Number("BusID", bus->BusID);
    field.Number("BusNum", bus->BusNum);
    field.Number("ChassisNum", bus->ChassisNum);
    field.Number("DrawerNum", bus->DrawerNum);
    field.Number("LoadAt33", bus->LoadAt33);
    field.Number("LoadAt66", bus->LoadAt66);
    field.Number("LoadAtX66", bus->LoadAtX66);
    field.Number("LoadAtX100", bus->LoadAtX100);
    field.Number("LoadAtX133", bus->LoadAtX133);
    field.Number("CurBusSpeed", bus->CurBusSpeed);
    field.Flag("InPciXMode", bus->InPciXMode);
    field.Flag("SupHotPlug", bus->SupHotPlug);
    field.Number("FirstSlot", bus->FirstSlot);
    field.Number("SlotCt", bus->SlotCt);
    dbgprint("\n");
}

void DumpSlot(const SlotDescriptor* slot) {
    const FieldWriter field(19, ": ", "0x%02x  (%d)");
    ObjectHeading("Slot Object", slot);
    field.Number("BusID", slot->BusID);
    field.Number("BusNum", slot->BusNum);
    field.Number("ChassisNum", slot->ChassisNum);
    field.Number("DrawerNum", slot->DrawerNum);
    field.Number("DevNum", slot->DevNum);
    field.Number("FriendlyNum", slot->FriendlyNum);
    field.Number("SlotID", slot->SlotID);
    field.Number("Width", slot->Width);
    field.Number("AttnReason", slot->AttnReason);
    field.Number("Status", slot->Status);
    field.Number("SpeedBits", slot->SpeedBits);
    field.Number("SlotUiNumber", slot->SlotUiNumber);
    field.Flag("Sup5V", slot->Sup5V);
    field.Flag("SupPME", slot->SupPME);
    field.Flag("SupSMBUS", slot->SupSMBUS);
    field.Flag("SupHotPlug", slot->SupHotPlug);
    field.Flag("PciX", slot->PciX);
    field.Flag("AttnLedBlinking", slot->AttnLedBlinking);
    field.Flag("HalfLength", slot->HalfLength);
    field.Flag("LowProfile", slot->LowProfile);
    dbgprint("\n");
}

void DumpSystems() {
    DumpList(SystemList, DumpSystem);
}

void DumpBusses() {
    DumpList(BusList, DumpBus);
}

void DumpSlots() {
    DumpList(SlotList, DumpSlot);
}

void DumpAgentStats(const _AgentStats* stats, const wchar_t* title) {
    const FieldWriter field(20, ":  ", "%d");
    dbgprint("\n");
    dbgprint("AgentStatistics Structure:  %s\n", title != nullptr ? title : L"");
    dbgprint("\n");
    field.Text("AgentVersion", stats->AgentVersion.c_str());
    field.Number("PreReqError", stats->PreReqError);
    dbgprint("\n");
}
