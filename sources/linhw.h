// The hot-plug slot driver on /dev/velhpdrv: version, ASL table, attention LED.
#pragma once

#include <cstdint>

#include "asl.h"

char* GetDriverVersion();
uint32_t GetAslTable(_ASL_PACKET* packet);
bool HwSetBlinkState(uint32_t slot, uint32_t state);
