// The hardware-information log: debug level, trace lines, error lines and string widening.
// Every "%s" conversion of a format passed here takes a wide string.
#pragma once

#include <cstdarg>
#include <cstddef>
#include <cstdint>

#include "dbglevel.h"

// Size, terminator included, of every wide buffer of the trace writer.
constexpr size_t WIDE_BUFFER_CHARS = 1024;

constexpr const char* HWINFO_LOG_PATH = "../log/velhslot.slotmgr.hwinfo.log";

extern int32_t EnterExitIndent;
// Shared scratch buffer for widening one narrow argument of a trace or error call.
extern wchar_t WideBuffer[WIDE_BUFFER_CHARS];

void ResetDebugOut();

void dbgprint(const char* format, ...);
void dbg(const char* function, const char* format, ...);
void Enter(int32_t* indent, const char* format, ...);
void Exit(int32_t* indent, const char* format, ...);
void DebugPrint(const wchar_t* format, ...);

void ErrMsg(const char* function, const char* format, ...);
int32_t LastErr(const int32_t* error, const char* function, const char* format, ...);
int32_t LastErrorMsg(const char* text, const int32_t* error);

// Each widens into a target of WIDE_BUFFER_CHARS characters and returns it; a longer text is
// cut to WIDE_BUFFER_CHARS - 1 characters after a warning line in the log.
wchar_t* MakeWideString(const char* source, wchar_t* target);
wchar_t* MakeWideStringI(const char* source, wchar_t* target, int indent);
wchar_t* MakeWideStringN(const char* source, wchar_t* target, int count);
// Widens count bytes, each to the character of the same code (0x80 to 0xFF included); writes no
// terminator.
void WidenBytes(const char* source, size_t count, wchar_t* target);
// Formats into out (size characters) after turning every "%s" of format into "%S"; the text
// is terminated and cut to fit even when the result is negative.
int varargs(wchar_t* out, unsigned int size, wchar_t* format, va_list arguments);
int HexToAscii(uint32_t value, char* out, int digits);

// The low 32 bits of an address, as the traces print it with "0x%08x".
inline uint32_t TraceAddress(const void* address) {
    return static_cast<uint32_t>(reinterpret_cast<uintptr_t>(address));
}
