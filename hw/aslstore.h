// Turning an ASL packet into systems, busses and slots, and linking them.
#pragma once

#include <array>
#include <cstdint>

#include "asl.h"

// String number to text inside the packet buffer; null where the packet held no such string.
using AslStringTable = std::array<const char*, 256>;

// Stores the descriptors of the `size` bytes of `packet` that the source delivered and links
// the objects. The packet buffer must stay unchanged until the call returns.
void StoreAslTable(const _ASL_PACKET* packet, uint32_t size);

int StoreChassisDescriptor(const _ASL_CHASSIS_DESCRIPTOR* descriptor, uint32_t systemIndex);
int StoreDrawerDescriptor(const _ASL_DRAWER_DESCRIPTOR* descriptor, uint32_t systemIndex);
int StoreBusDescriptor(const _ASL_BUS_DESCRIPTOR* descriptor);
int StoreSlotDescriptor(const _ASL_SLOT_DESCRIPTOR* descriptor);

// Completes slots, busses and systems from each other and names the systems from `strings`.
void XRefAsl(const AslStringTable& strings);
