// One hardware acquisition and its platform hooks.
#pragma once

bool GetHwInfo();
bool StartHwInfo();
void StopHwInfo();
