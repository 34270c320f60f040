// Win32-named shims over the C library, used by the portable core.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>

constexpr int32_t FORMAT_MESSAGE_ALLOCATE_BUFFER = 0x00010000;

int32_t GetLastError();
// With FORMAT_MESSAGE_ALLOCATE_BUFFER in flags, buffer points to a wchar_t* that receives a
// buffer from MessageAlloc (release it with LocalFree); it is set to null when that fails.
int32_t FormatMessage(int32_t flags, const void* source, int32_t messageId, int32_t languageId,
                      wchar_t* buffer, int32_t size, char** arguments);
void* LocalFree(void* memory);
char* _strupr(char* text);
char* _strlwr(char* text);
wchar_t* _wcsupr(wchar_t* text);
wchar_t* _wcslwr(wchar_t* text);
// Appends text verbatim to the hardware-information log; errno is left as it was.
void OutputDebugString(const wchar_t* text);

// The allocator behind FormatMessage's allocated buffers (malloc); tests replace it.
extern void* (*MessageAlloc)(size_t bytes);

// Attempts to open the log before it is given up, when every failure is one a retry can cure.
constexpr int LOG_OPEN_ATTEMPTS = 10001;
using FileOpener = FILE* (*)(const char* path, const char* mode);
// Opens a log file with opener, trying again at once only after failures that can pass
// (interrupted call, no descriptor free); null when it cannot be opened.
FILE* OpenLogFile(const char* path, const char* mode, FileOpener opener);
