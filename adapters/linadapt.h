// Discovery of the machine's PCI functions in the kernel's /proc/bus/pci tree.
#pragma once

#include <cstdint>

#include "util/enumdir.h"

// One adapter per readable function, named, with its module, driver and boot flag, tied to its
// bus. Placing them in slots (XRefSlotAdapter) belongs to the acquisition above this folder.
void GetAdapterInfo();
// A bus folder: its name's leading hexadecimal number, or the number after "DDDD:" where the
// kernel names folders after their PCI domain.
bool isBus(const _FILE_ATTRIBS* attribs, uint32_t* bus);
// A function file: "DD.F", device and function in hexadecimal.
bool isAdapter(const _FILE_ATTRIBS* attribs, uint32_t* device, uint32_t* function);
