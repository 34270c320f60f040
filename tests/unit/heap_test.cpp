#include <gtest/gtest.h>

#include <cstdint>
#include <memory>
#include <new>

namespace {

// A type whose every allocation fails, to see what a new-expression makes of a null result.
struct Refused {
    static void* operator new(std::size_t) { return nullptr; }
    static void operator delete(void*) {}
    Refused() { Constructed = true; }
    static inline bool Constructed = false;
};

}  // namespace

// Every form of the library's allocator reports failure as null, and with -fcheck-new (which the
// whole build uses) a new-expression over a failed allocation is null and constructs nothing.
TEST(Heap, FailedAllocationsAreNullInEveryForm) {
    EXPECT_EQ(::operator new(SIZE_MAX), nullptr);
    EXPECT_EQ(::operator new[](SIZE_MAX), nullptr);
    EXPECT_EQ(::operator new(SIZE_MAX, std::nothrow), nullptr);
    EXPECT_EQ(::operator new[](SIZE_MAX, std::nothrow), nullptr);
    EXPECT_EQ(std::unique_ptr<Refused>(new Refused), nullptr);
    EXPECT_FALSE(Refused::Constructed);

    void* empty = ::operator new(0);
    EXPECT_NE(empty, nullptr);
    ::operator delete(empty);
}
