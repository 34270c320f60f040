// Questions to the kernel about loaded modules (Linux 2.4's query_module): a module's symbol
// list and its information record.
#pragma once

#include <climits>
#include <cstddef>

#include "filehandle.h"

constexpr int QM_SYMBOLS = 4;
constexpr int QM_INFO = 5;

// The module is running (bit 0 of module_info.flags).
constexpr unsigned long MOD_RUNNING = 1;

// The records below are the kernel's ABI, which uses native words: two 32-bit words per
// symbol entry on the 32-bit target, 64-bit words on x86_64. So here, and only here, the
// width follows the platform.
struct module_symbol {
    unsigned long value;
    unsigned long name;  // offset of the name from the start of the returned buffer
};

struct module_info {
    unsigned long addr;
    unsigned long size;
    unsigned long flags;
    long usecount;
};

#if ULONG_MAX == 0xFFFFFFFFul
static_assert(sizeof(module_symbol) == 8, "symbol entry: two 32-bit words");
static_assert(sizeof(module_info) == 16, "module information record");
#endif

// A loaded module's symbol list as the kernel returns it: Count entries, then their names.
struct ModuleSymbols {
    UniqueMalloc<char> Buffer;
    size_t Size = 0;  // bytes of Buffer the kernel was allowed to fill
    int Count = 0;

    // The name of entry index, or null when the index is out of range or the entry's name
    // does not lie, terminated, inside the buffer after the entries.
    const char* Name(int index) const;
};

// The number of symbols of the loaded module; the list goes to *symbols (empty when 0).
int GetModuleSymbols(const char* module, ModuleSymbols* symbols);
// True when the module's information record could be read into *info.
bool GetModuleInfo(const char* module, UniqueMalloc<module_info>* info);
// The buffer size query_module asks for the request which; 0 when the query fails.
int SizeBuffer(const char* module, int which);
