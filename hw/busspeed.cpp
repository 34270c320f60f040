#include "hw/busspeed.h"

namespace {

constexpr uint32_t FASTEST_SPEED = 533;

// Steps down until the bus's load limit is at least `needed`, or it cannot step further.
void SettleSpeed(BusDescriptor* bus, uint32_t needed) {
    while (MaxBusLoad(bus) < needed && ReduceBusSpeed(bus) != 0) {
    }
}

}  // namespace

int SlowerAdapter(const AdapterDescriptor* current, const AdapterDescriptor* candidate) {
    if (current == nullptr) {
        return 1;
    }
    if (current->MaxSpeed == 66 && candidate->MaxSpeed == 66) {
        // A conventional 66 MHz adapter is slower than a PCI-X one at 66 MHz.
        return !candidate->SupPciX && current->SupPciX ? 1 : 0;
    }
    return candidate->MaxSpeed < current->MaxSpeed ? 1 : 0;
}

uint32_t MaxBusLoad(const BusDescriptor* bus) {
    switch (bus->CurBusSpeed) {
        case 133:
            return bus->LoadAtX133;
        case 100:
            return bus->LoadAtX100;
        case 66:
            return bus->InPciXMode ? bus->LoadAtX66 : bus->LoadAt66;
        case 33:
            return bus->LoadAt33;
        default:
            return 0;
    }
}

int ReduceBusSpeed(BusDescriptor* bus) {
    switch (bus->CurBusSpeed) {
        case 533:
            bus->CurBusSpeed = 266;
            return 1;
        case 266:
            bus->CurBusSpeed = 133;
            return 1;
        case 133:
            bus->CurBusSpeed = 100;
            return 1;
        case 100:
            bus->CurBusSpeed = 66;
            return 1;
        case 66:
            if (bus->InPciXMode) {
                bus->InPciXMode = false;
            } else {
                bus->CurBusSpeed = 33;
            }
            return 1;
        default:
            return 0;
    }
}

void DeriveCurrentBusSpeeds() {
    BusList.BeginEnumeration();
    while (BusDescriptor* bus = BusList.Next()) {
        uint32_t count = 0;
        const AdapterDescriptor* slowest = nullptr;
        AdapterList.BeginEnumeration();
        while (const AdapterDescriptor* adapter = AdapterList.Next()) {
            if (adapter->BusID != bus->BusID || adapter->BusID == NONE_VALUE) {
                continue;
            }
            ++count;
            if (SlowerAdapter(slowest, adapter) != 0) {
                slowest = adapter;
            }
        }
        if (slowest != nullptr) {
            bus->CurBusSpeed = slowest->MaxSpeed;
            bus->InPciXMode = slowest->SupPciX;
            SettleSpeed(bus, count);
        } else {
            // With nothing on it, the bus runs at the fastest step that carries any load.
            bus->CurBusSpeed = FASTEST_SPEED;
            bus->InPciXMode = true;
            SettleSpeed(bus, 1);
        }
    }
}
