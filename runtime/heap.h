// The library's heap (heap.cpp): operator new and delete, and the C allocations that the library
// makes itself, all of which come back null when memory runs out.
#pragma once

#include <cstddef>
#include <cstdint>

// A test's way to make the library's allocations fail one at a time: while FailAt is not 0, every
// allocation whose result the caller checks (the nothrow forms of new and the functions below)
// counts, and the one numbered FailAt comes back null. The library itself never sets it, and
// nothing outside the library can reach it.
struct HeapFaultHook {
    uint32_t Count;
    uint32_t FailAt;
};
HeapFaultHook& HeapFaults();

// malloc, calloc and strdup through the same counted path; release with free.
void* HeapMalloc(size_t size);
void* HeapCalloc(size_t count, size_t size);
char* HeapStrdup(const char* text);
