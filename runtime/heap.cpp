// The library's operator new and delete, in every form it uses, over malloc and free. A failed
// allocation comes back as a null pointer: the library is built without exceptions and with
// -fcheck-new, so a new-expression whose allocation fails yields null and runs no constructor,
// and every caller checks. The C++ runtime of the process that loads the library (if it has one)
// is never asked for memory, and malloc stays the one allocator that sanitizers watch.
#include "runtime/heap.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <new>

namespace {

HeapFaultHook faultHook = {0, 0};

// checked: the caller tests the result, as the library's own allocations do (the nothrow forms
// and the C ones). Only those are counted for a test: the standard containers' plain-form
// allocations cannot survive a null.
void* Allocate(std::size_t size, bool checked) noexcept {
    // No object may be larger than PTRDIFF_MAX; such a size only comes from an overflowed count.
    if (size > static_cast<std::size_t>(PTRDIFF_MAX)) {
        return nullptr;
    }
    if (checked && faultHook.FailAt != 0 && ++faultHook.Count == faultHook.FailAt) {
        return nullptr;
    }
    return std::malloc(size != 0 ? size : 1);
}

}  // namespace

HeapFaultHook& HeapFaults() {
    return faultHook;
}

void* HeapMalloc(size_t size) {
    return Allocate(size, true);
}

void* HeapCalloc(size_t count, size_t size) {
    if (size != 0 && count > SIZE_MAX / size) {
        return nullptr;
    }
    void* memory = Allocate(count * size, true);
    if (memory != nullptr) {
        std::memset(memory, 0, count * size != 0 ? count * size : 1);
    }
    return memory;
}

char* HeapStrdup(const char* text) {
    const size_t size = std::strlen(text) + 1;
    auto* copy = static_cast<char*>(Allocate(size, true));
    if (copy != nullptr) {
        std::memcpy(copy, text, size);
    }
    return copy;
}

void* operator new(std::size_t size) {
    return Allocate(size, false);
}
void* operator new[](std::size_t size) {
    return Allocate(size, false);
}
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    return Allocate(size, true);
}
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept {
    return Allocate(size, true);
}

void operator delete(void* memory) noexcept {
    std::free(memory);
}
void operator delete[](void* memory) noexcept {
    std::free(memory);
}
void operator delete(void* memory, std::size_t) noexcept {
    std::free(memory);
}
void operator delete[](void* memory, std::size_t) noexcept {
    std::free(memory);
}
void operator delete(void* memory, const std::nothrow_t&) noexcept {
    std::free(memory);
}
void operator delete[](void* memory, const std::nothrow_t&) noexcept {
    std::free(memory);
}
