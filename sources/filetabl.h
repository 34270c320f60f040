// The PCI architecture file: the text form of the ASL table.
#pragma once

#include <cstdint>
#include <cstdio>

#include "asl.h"

// Lines are read in pieces of at most this many bytes, terminator included.
constexpr int32_t PCI_FILE_LINE_CHARS = 2048;

// Reads this machine's PCI architecture file into packet; the byte count, or 0 when there is no
// file for the machine or it cannot be opened.
uint32_t GetFileTable(_ASL_PACKET* packet, uint32_t size);

// Reads the open file to its end into packet (size bytes). Returns the byte count: 16 per header
// line, the size of every descriptor and 1 for the end marker. When packetEnd is given it
// receives the number of bytes the packet occupies, end marker included.
uint32_t ReadFileTable(FILE* stream, _ASL_PACKET* packet, uint32_t size,
                       uint32_t* packetEnd = nullptr);

// Each fills its record from the tokens of a prepared data line (cut in place) and returns the
// record's size. Missing tokens count as 0 or as empty text.
uint32_t StoreHeader(_ASL_TABLE_HEADER* header, char* line);
uint32_t StoreBus(_ASL_BUS_DESCRIPTOR* descriptor, char* line);
uint32_t StoreSlot(_ASL_SLOT_DESCRIPTOR* descriptor, char* line);
uint32_t StoreChassis(_ASL_CHASSIS_DESCRIPTOR* descriptor, char* line);
uint32_t StoreDrawer(_ASL_DRAWER_DESCRIPTOR* descriptor, char* line);
uint32_t StoreString(_ASL_STRING_DESCRIPTOR* descriptor, char* line);
