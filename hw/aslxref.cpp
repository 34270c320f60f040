#include "diag/hwdebug.h"
#include "diag/progname.h"
#include "hw/aslstore.h"
#include "model/hwobjects.h"

namespace {

bool Tracing() {
    return (HwInfoPrintLevel & TRACE_XREF_ASL) != 0;
}

void TraceHeading(const char* heading) {
    if (Tracing()) {
        dbgprint("\n");
        dbgprint(heading);
        dbgprint("\n");
    }
}

BusDescriptor* FindBus(uint32_t busId) {
    BusList.BeginEnumeration();
    while (BusDescriptor* bus = BusList.Next()) {
        if (bus->BusID == busId) {
            return bus;
        }
    }
    return nullptr;
}

// Slots take their bus's location; busses learn their slot range, count and hot-plug support.
void XRefSlotsToBusses() {
    TraceHeading("XRefAsl():  XREFING BUS AND SLOT DESCRIPTORS\n");
    SlotList.BeginEnumeration();
    while (SlotDescriptor* slot = SlotList.Next()) {
        if (Tracing()) {
            dbgprint("XRefAsl():  looking for BusID %d\n", slot->BusID);
        }
        BusDescriptor* bus = FindBus(slot->BusID);
        if (bus == nullptr) {
            dbgprint("%s, %s:  ", _ProgramName, L"XRefDescriptors()");
            dbgprint("Slot with ID %d associated with an invalid bus\n", slot->SlotID);
        } else {
            if (Tracing()) {
                dbgprint("XRefAsl():  found BusID %d\n", bus->BusID);
            }
            slot->ChassisNum = bus->ChassisNum;
            slot->DrawerNum = bus->DrawerNum;
            slot->BusNum = bus->BusNum;
            if (Tracing()) {
                dbgprint("XRefAsl():  setting bus hotplug support flag\n");
            }
            if (!bus->SupHotPlug) {
                bus->SupHotPlug = slot->SupHotPlug;
            }
            if (Tracing()) {
                dbgprint("XRefAsl():  setting first slot number to %d\n", slot->SlotID);
            }
            if (slot->SlotID < bus->FirstSlot) {
                bus->FirstSlot = slot->SlotID;
            }
            ++bus->SlotCt;
            if (Tracing()) {
                dbgprint("XRefAsl():  bumped bus slot count to %d\n", bus->SlotCt);
            }
        }
        if (Tracing()) {
            dbgprint("\n");
        }
    }
}

// A drawer owns the busses of its drawer number; a chassis only those in no drawer.
bool BusOfSystem(const SystemDescriptor& system, const BusDescriptor& bus) {
    if (system.ExpnDrawer != 0) {
        return bus.DrawerNum == system.DrawerNum;
    }
    return bus.DrawerNum == NONE_BYTE && bus.ChassisNum == system.ChassisNum;
}

std::wstring SystemName(const SystemDescriptor& system, const AslStringTable& strings) {
    const char* text = system.StringID < strings.size() ? strings[system.StringID] : nullptr;
    if (text == nullptr) {
        ErrMsg("XRefAsl()", "System %d names string %d, which the packet does not hold",
               system.SystemID, system.StringID);
        return std::wstring();
    }
    wchar_t name[WIDE_BUFFER_CHARS];
    return MakeWideString(text, name);
}

// Systems take their names and the slot range and count of their busses.
void XRefSystemsToBusses(const AslStringTable& strings) {
    TraceHeading("XRefAsl():  XREFING SYSTEM AND BUS DESCRIPTORS\n");
    SystemList.BeginEnumeration();
    while (SystemDescriptor* system = SystemList.Next()) {
        if (Tracing()) {
            dbgprint("XRefAsl():  retrieving StringID %d\n", system->StringID);
        }
        std::wstring name = SystemName(*system, strings);
        if (Tracing()) {
            dbgprint("XRefAsl():  storing string, setting system's slot defaults\n");
        }
        system->Name = std::move(name);

        uint32_t lowest = NONE_VALUE;
        uint32_t total = 0;
        const bool drawer = system->ExpnDrawer != 0;
        if (Tracing()) {
            if (drawer) {
                dbgprint("XRefAsl():  looking for busses on drawer %d\n", system->DrawerNum);
            } else {
                dbgprint("XRefAsl():  looking for busses on chassis %d\n", system->ChassisNum);
            }
        }
        BusList.BeginEnumeration();
        while (BusDescriptor* bus = BusList.Next()) {
            if (!BusOfSystem(*system, *bus)) {
                continue;
            }
            if (Tracing()) {
                if (drawer) {
                    dbgprint("XRefAsl():  BusID %d on DrawerNum %d\n", bus->BusID, bus->DrawerNum);
                } else {
                    dbgprint("XRefAsl():  BusID %d on ChassisNum %d\n", bus->BusID,
                             bus->ChassisNum);
                }
            }
            if (bus->FirstSlot < lowest) {
                lowest = bus->FirstSlot;
            }
            total += bus->SlotCt;
        }
        system->FirstSlotNum = lowest;
        system->UnitSlotCount = total;
        if (Tracing()) {
            dbgprint("\n");
        }
    }
}

}  // namespace

void XRefAsl(const AslStringTable& strings) {
    XRefSlotsToBusses();
    XRefSystemsToBusses(strings);
}
