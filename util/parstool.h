// Line reading, trimming, tokenising and number and boolean conversion of narrow text.
// All work in place on the caller's buffer.
#pragma once

#include <cstdint>
#include <cstdio>

// Reads one line (at most size - 1 bytes, without its line feed); true while a line was read,
// including a last line that lacks a line feed.
bool getline(FILE* stream, char* buffer, int size);
char* TrimLine(char* line);
char* TrimStr(char* text);
char* GetToken(char** cursor);
int StrIsNum(const char* text);
int StrNum(char* text);
bool IsBoolStr(const char* text);
bool EvalBoolStr(const char* text);
// strtoul with error detection, in the 32-bit range on every build.
bool ustrl(const char* text, uint32_t* value, int base);
// strtoul and strtol as on the 32-bit target: beyond 32 bits errno is ERANGE and the value is
// clamped; errno is otherwise left as it was.
uint32_t StrToU32(const char* text, char** end, int base);
int32_t StrToI32(const char* text, char** end, int base);
