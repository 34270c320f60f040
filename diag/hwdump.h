// Readable dumps of the agent's data into the hardware-information log: byte buffers, the ASL
// packet, the object lists, adapters with their configuration space, the agent statistics.
// They only read. Whether a dump runs is the caller's choice of debug level bit.
#pragma once

#include <cstdint>

#include "asl.h"
#include "hwobjects.h"
#include "pciconfig.h"

struct _AgentStats;

// Hex and character dump of the bytes start .. start + length - 1 of buffer, perLine a line;
// the offsets shown are those within buffer.
void DumpByteBuffer(const char* buffer, uint32_t length, uint32_t start, uint32_t perLine);

// `size` is the count of bytes the source delivered; nothing past them is read.
void DumpRawAslPacket(const _ASL_PACKET* packet, uint32_t size);
void DumpAslPacket(const _ASL_PACKET* packet, uint32_t size);
void DumpChassisDescriptor(const _ASL_CHASSIS_DESCRIPTOR* descriptor);
void DumpDrawerDescriptor(const _ASL_DRAWER_DESCRIPTOR* descriptor);
void DumpBusDescriptor(const _ASL_BUS_DESCRIPTOR* descriptor);
void DumpSlotDescriptor(const _ASL_SLOT_DESCRIPTOR* descriptor);
// The descriptor's text must be terminated.
void DumpStringDescriptor(const _ASL_STRING_DESCRIPTOR* descriptor);

void DumpSystems();
void DumpBusses();
void DumpSlots();
// The installed and the card file's adapters, on-board ones and the others as the level asks.
void DumpAdapters();
void DumpSystem(const SystemDescriptor* system);
void DumpBus(const BusDescriptor* bus);
void DumpSlot(const SlotDescriptor* slot);
void DumpAdapter(const AdapterDescriptor* adapter);

// A null title prints as an empty text.
void DumpAgentStats(const _AgentStats* stats, const wchar_t* title);

// `full` adds the device-specific registers (bytes 64 to 255).
void DumpPciConfigSpace(const _PCI_CONFIG0* config, int full);
void DumpPciConfigSpace0(const _PCI_CONFIG0* config, int full);
void DumpPciConfigSpace1(const _PCI_CONFIG1* config, int full);
void DumpPciConfigSpace2(const _PCI_CONFIG2* config, int full);
void DumpCapabilityList(const _PCI_CONFIG0* config);
const wchar_t* CapabilityStr(const CAP_ITEM_HEADER* item);
