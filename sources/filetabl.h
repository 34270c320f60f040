// The PCI architecture file: the text form of the ASL table.
#pragma once

#include <cstdint>

#include "asl.h"

uint32_t GetFileTable(_ASL_PACKET* packet, uint32_t capacity);
