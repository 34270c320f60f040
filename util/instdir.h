// The install directory (the working directory) and the data files in it.
#pragma once

#include <cstdint>

constexpr int32_t INSTALL_DIR_CHARS = 4096;

bool GetInstallDir(wchar_t* buffer, int32_t size);
// The path of name inside the install directory, allocated with malloc; the caller frees it.
char* InstallDirFile(const char* name);
bool Exist(const char* path);
