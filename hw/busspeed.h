// Each bus's current speed and mode, from its slowest adapter and its load limits.
#pragma once

#include <cstdint>

#include "model/hwobjects.h"

// Sets CurBusSpeed and InPciXMode of every bus from AdapterList.
void DeriveCurrentBusSpeeds();
// Non-zero when `candidate` is slower than `current` (null: none yet).
int SlowerAdapter(const AdapterDescriptor* current, const AdapterDescriptor* candidate);
// How many adapters the bus carries at its present speed and mode.
uint32_t MaxBusLoad(const BusDescriptor* bus);
// One step down the speed ladder; 0 when the bus is at 33 MHz or off the ladder.
int ReduceBusSpeed(BusDescriptor* bus);
