#include "hw/adapterxref.h"

#include "adapters/adapterdump.h"
#include "diag/hwdebug.h"

namespace {

constexpr uint32_t NOT_USER_VISIBLE = NONE_BYTE;

// Slot and bus facts of one adapter, from the slots of its bus.
struct Placement {
    bool InSlot = false;
    bool BusHasSlots = false;
};

// Every function of a device lands in the device's slot. The search stops at that slot, so
// BusHasSlots covers only the slots seen up to it.
Placement PlaceAdapter(AdapterDescriptor* adapter) {
    Placement placement;
    adapter->PowerReq = 0;
    adapter->SlotID = NONE_VALUE;
    SlotList.BeginEnumeration();
    while (const SlotDescriptor* slot = SlotList.Next()) {
        if (slot->BusNum != adapter->Bus) {
            continue;
        }
        if (slot->FriendlyNum != NOT_USER_VISIBLE) {
            placement.BusHasSlots = true;
        }
        if (slot->DevNum == adapter->Device) {
            adapter->SlotID = slot->SlotID;
            adapter->PowerReq = SlotPowerReq(slot->Status);
            adapter->OnBoard = false;
            adapter->FriendlyNum = slot->FriendlyNum;
            placement.InSlot = true;
            break;
        }
    }
    return placement;
}

}  // namespace

uint32_t SlotPowerReq(uint32_t status) {
    static constexpr uint32_t Watts[] = {8, 15, 25, 0};
    return Watts[(status >> 3) & 3];
}

bool KeepAdapter(bool inSlot, bool busHasSlots, const AdapterDescriptor* adapter,
                 const wchar_t** reason) {
    static constexpr const wchar_t* onBridgedCard = L"Device is under a bridge on a card";
    static constexpr const wchar_t* onBusWithoutSlots = L"Device is on a bus without slots";
    static constexpr const wchar_t* onBoardBridgeDevice = L"Device is an onboard bridge";
    static constexpr const wchar_t* keepAdapter = L"";

    const wchar_t* why = keepAdapter;
    if (!inSlot && !adapter->OnBoard) {
        why = onBridgedCard;
    } else if (!busHasSlots) {
        why = onBusWithoutSlots;
    } else if (adapter->OnBoard && adapter->HasBridge) {
        why = onBoardBridgeDevice;
    }
    if (reason != nullptr) {
        *reason = why;
    }
    return why == keepAdapter;
}

void XRefSlotAdapter() {
    AdapterList.BeginEnumeration();
    while (AdapterDescriptor* adapter = AdapterList.Next()) {
        const Placement placement = PlaceAdapter(adapter);
        const wchar_t* reason = nullptr;
        if (KeepAdapter(placement.InSlot, placement.BusHasSlots, adapter, &reason)) {
            continue;
        }
        if ((HwInfoPrintLevel & DUMP_DELETED_ADAPTERS) != 0) {
            dbgprint("\n");
            dbgprint("Deleting Adapter  (%s)\n", reason);
            DumpAdapter(adapter);
        }
        AdapterList.Delete(adapter);
        delete adapter;
    }
}
