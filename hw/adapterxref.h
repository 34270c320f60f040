// Placing discovered adapters in their slots and dropping the ones the agent does not report.
#pragma once

#include <cstdint>

#include "model/hwobjects.h"

// Ties every adapter of AdapterList to its slot and destroys the adapters not kept.
void XRefSlotAdapter();
// Whether the adapter stays; `reason`, when not null, receives why (empty when kept).
bool KeepAdapter(bool inSlot, bool busHasSlots, const AdapterDescriptor* adapter,
                 const wchar_t** reason);
// The watts a slot provides, from the power code in bits 3 and 4 of its status.
uint32_t SlotPowerReq(uint32_t status);
