// The library's operator new and delete, in every form it uses, over malloc and free. A failed
// allocation comes back as a null pointer: the library is built without exceptions and with
// -fcheck-new, so a new-expression whose allocation fails yields null and runs no constructor,
// and every caller checks. The C++ runtime of the process that loads the library (if it has one)
// is never asked for memory, and malloc stays the one allocator that sanitizers watch.
#include <cstdint>
#include <cstdlib>
#include <new>

namespace {

void* Allocate(std::size_t size) noexcept {
    // No object may be larger than PTRDIFF_MAX; such a size only comes from an overflowed count.
    if (size > static_cast<std::size_t>(PTRDIFF_MAX)) {
        return nullptr;
    }
    return std::malloc(size != 0 ? size : 1);
}

}  // namespace

void* operator new(std::size_t size) {
    return Allocate(size);
}
void* operator new[](std::size_t size) {
    return Allocate(size);
}
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    return Allocate(size);
}
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept {
    return Allocate(size);
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
