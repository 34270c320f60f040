// The library's heap (heap.cpp): operator new and delete, and the C allocations that the library
// makes itself, all of which come back null when memory runs out.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <new>

#include "diag/hwdebug.h"
#include "hwobjects.h"

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

// A new value-initialised T from the checked path, or null with an error line from function when
// memory runs out.
template <typename T>
std::unique_ptr<T> NewObject(const char* function) {
    std::unique_ptr<T> object(new (std::nothrow) T());
    if (object == nullptr) {
        ErrMsg(function, "malloc(%d) failed", static_cast<int>(sizeof(T)));
    }
    return object;
}

// Hands object to list (AddOwned); when the list has no memory for its entry the object is
// destroyed and function writes an error line. Returns the listed object or null.
template <typename T>
T* AddOrReport(ObjListTemp<T>& list, std::unique_ptr<T> object, const char* function) {
    T* listed = AddOwned(list, std::move(object));
    if (listed == nullptr) {
        ErrMsg(function, "list entry malloc() failed");
    }
    return listed;
}
