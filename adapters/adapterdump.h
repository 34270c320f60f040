// Dumps of adapters and of PCI configuration images with their capability lists.
#pragma once

#include "model/hwobjects.h"
#include "pciconfig.h"

// The installed and the card file's adapters, on-board ones and the others as the level asks.
void DumpAdapters();
void DumpAdapter(const AdapterDescriptor* adapter);

// `full` adds the device-specific registers (bytes 64 to 255).
void DumpPciConfigSpace(const _PCI_CONFIG0* config, int full);
void DumpPciConfigSpace0(const _PCI_CONFIG0* config, int full);
void DumpPciConfigSpace1(const _PCI_CONFIG1* config, int full);
void DumpPciConfigSpace2(const _PCI_CONFIG2* config, int full);
void DumpCapabilityList(const _PCI_CONFIG0* config);
const wchar_t* CapabilityStr(const CAP_ITEM_HEADER* item);
