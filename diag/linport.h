// Win32-named shims over the C library, used by the portable core.
#pragma once

#include <cstdint>

constexpr int32_t FORMAT_MESSAGE_ALLOCATE_BUFFER = 0x00010000;

int32_t GetLastError();
int32_t FormatMessage(int32_t flags, const void* source, int32_t messageId, int32_t languageId,
                      wchar_t* buffer, int32_t size, char** arguments);
void* LocalFree(void* memory);
char* _strupr(char* text);
char* _strlwr(char* text);
wchar_t* _wcsupr(wchar_t* text);
wchar_t* _wcslwr(wchar_t* text);
// Appends text verbatim to the hardware-information log.
void OutputDebugString(const wchar_t* text);
