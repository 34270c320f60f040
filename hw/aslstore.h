// Turning an ASL packet into systems, busses and slots, and linking them.
#pragma once

#include <cstdint>

#include "asl.h"

void StoreAslTable(const _ASL_PACKET* packet, uint32_t size);
void XRefAsl();
