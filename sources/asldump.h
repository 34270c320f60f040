// Dumps of the ASL packet, raw and decoded along the same bounded walk as the storing.
#pragma once

#include <cstdint>

#include "asl.h"

// `size` is the count of bytes the source delivered; nothing past them is read.
void DumpRawAslPacket(const _ASL_PACKET* packet, uint32_t size);
void DumpAslPacket(const _ASL_PACKET* packet, uint32_t size);
void DumpChassisDescriptor(const _ASL_CHASSIS_DESCRIPTOR* descriptor);
void DumpDrawerDescriptor(const _ASL_DRAWER_DESCRIPTOR* descriptor);
void DumpBusDescriptor(const _ASL_BUS_DESCRIPTOR* descriptor);
void DumpSlotDescriptor(const _ASL_SLOT_DESCRIPTOR* descriptor);
// The descriptor's text must be terminated.
void DumpStringDescriptor(const _ASL_STRING_DESCRIPTOR* descriptor);
