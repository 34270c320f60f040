// Size of one descriptor of an ASL packet and the one bounded walk over a packet.
#pragma once

#include <cstdint>

#include "asl.h"

uint32_t DescriptorSize(const RAW_ASL_DATA* descriptor);
