// Line reading, trimming, tokenising and number and boolean conversion of narrow text.
// All work in place on the caller's buffer.
#pragma once

#include <cstdint>
#include <cstdio>

bool getline(FILE* stream, char* buffer, int size);
char* TrimLine(char* line);
char* TrimStr(char* text);
char* GetToken(char** cursor);
int StrIsNum(const char* text);
int StrNum(char* text);
bool IsBoolStr(const char* text);
bool EvalBoolStr(const char* text);
bool ustrl(const char* text, uint32_t* value, int base);
