// Readable dumps into the hardware-information log: byte buffers, the systems, busses and slots,
// the agent statistics. They only read; whether a dump runs is the caller's choice of debug
// level bit. The packet dumps are in sources/asldump.h, the adapter and configuration space
// dumps in adapters/adapterdump.h.
#pragma once

#include <cstdint>

#include "agentstats.h"
#include "model/hwobjects.h"

// Hex and character dump of the bytes start .. start + length - 1 of buffer, perLine a line;
// the offsets shown are those within buffer.
void DumpByteBuffer(const char* buffer, uint32_t length, uint32_t start, uint32_t perLine);

void DumpSystems();
void DumpBusses();
void DumpSlots();
void DumpSystem(const SystemDescriptor* system);
void DumpBus(const BusDescriptor* bus);
void DumpSlot(const SlotDescriptor* slot);

// A null title prints as an empty text.
void DumpAgentStats(const _AgentStats* stats, const wchar_t* title);

// The blank line, the object's kind, its address when SHOW_OBJECT_ADDRESS is set, and a blank
// line: the heading of every object dump.
void ObjectHeading(const char* kind, const void* object);
