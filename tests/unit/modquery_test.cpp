#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <string>
#include <vector>

#include "adapters/modquery.h"
#include "tests/unit/fake_modules.h"
#include "tests/unit/scratchdir.h"
#include "util/sysaccess.h"

namespace {

// A kernel answer made by hand, to feed the reader lists the real kernel would never send.
std::vector<char> RawImage;
size_t RawCount = 0;

int RawQueryModule(const char*, int, void* buffer, size_t size, size_t* ret) {
    *ret = size < RawImage.size() ? RawImage.size() : RawCount;
    errno = ENOSPC;
    if (size < RawImage.size()) {
        return -1;
    }
    std::memcpy(buffer, RawImage.data(), RawImage.size());
    return 0;
}

// Entries of (value, offset of the name), then the names; the kernel claims count entries.
void SetRaw(std::vector<module_symbol> entries, const std::string& names, size_t count) {
    const char* start = reinterpret_cast<const char*>(entries.data());
    RawImage.assign(start, start + entries.size() * sizeof(module_symbol));
    RawImage.insert(RawImage.end(), names.begin(), names.end());
    RawCount = count;
}

class ModQuery : public ::testing::Test {
  protected:
    void SetUp() override { InstallFakeModules(); }
    void TearDown() override { ResetSystemAccess(); }
    InstallTree Tree;
};

}  // namespace

// Reading the names of a module's symbols is naming_test's too (a driver's file from its marker
// symbol).
TEST_F(ModQuery, SymbolListOfALoadedModule) {
    FakeModules().Modules = {{"e1000", 1, {{0x1000, "e1000_probe"}, {0x2000, "e1000_remove"}}, {}},
                             {"bare", 1, {}, {}},
                             {"late", 1, {{1, "first"}}, {{2, "second"}, {3, "third"}}}};
    EXPECT_EQ(SizeBuffer("e1000", QM_SYMBOLS),
              static_cast<int>(SymbolImage(FakeModules().Modules[0].Symbols).size()));
    ModuleSymbols list;
    ASSERT_EQ(GetModuleSymbols("e1000", &list), 2);
    EXPECT_STREQ(list.Name(1), "e1000_remove");
    EXPECT_EQ(list.Name(2), nullptr);
    EXPECT_EQ(list.Name(-1), nullptr);
    // Not loaded, or loaded without symbols: nothing handed out.
    for (const char* module : {"e100", "bare"}) {
        EXPECT_EQ(GetModuleSymbols(module, &list), 0);
        EXPECT_EQ(list.Buffer, nullptr);
        EXPECT_EQ(list.Name(0), nullptr);
    }
    // A list that grows between the size question and the read is read again.
    ASSERT_EQ(GetModuleSymbols("late", &list), 3);
    EXPECT_STREQ(list.Name(2), "third");
}

TEST_F(ModQuery, MalformedSymbolListsAreReadOnlyInsideTheBuffer) {
    SysCalls().QueryModule = RawQueryModule;
    // One name after two entries: one pointing at it, one past the end, then one into the
    // entries; and a count claiming more entries than fit.
    const unsigned long good = 2 * sizeof(module_symbol);
    const std::string ok("ok", 3);
    ModuleSymbols list;
    SetRaw({{1, good}, {2, good + 8}}, ok, 1000);
    ASSERT_EQ(GetModuleSymbols("raw", &list), 2);
    EXPECT_STREQ(list.Name(0), "ok");
    EXPECT_EQ(list.Name(1), nullptr);
    SetRaw({{1, good}, {2, 3}}, ok, 2);
    ASSERT_EQ(GetModuleSymbols("raw", &list), 2);
    EXPECT_EQ(list.Name(1), nullptr);
    // A last name that runs to the end of the buffer without its terminator.
    SetRaw({{1, good}, {2, good}}, "ok", 2);
    ASSERT_EQ(GetModuleSymbols("raw", &list), 2);
    EXPECT_EQ(list.Name(0), nullptr);
    // A buffer too small for a single entry holds no symbols.
    SetRaw({}, std::string(sizeof(module_symbol) - 1, 'x'), 1);
    EXPECT_EQ(GetModuleSymbols("raw", &list), 0);
    EXPECT_EQ(list.Buffer, nullptr);
}

// The record of a running, a stopped and a missing module, and its message, are the
// prerequisite check's (linsetup_test).
TEST_F(ModQuery, ModuleInfoIsNeverReadPastTheKernelsRecord) {
    FakeModules().Modules.push_back({"velhpdrv", 0x5, {}, {}});
    UniqueMalloc<module_info> info;
    ASSERT_TRUE(GetModuleInfo("velhpdrv", &info));
    EXPECT_FALSE(GetModuleInfo("absent", &info));
    EXPECT_EQ(info, nullptr);  // no record left from the query before
    // A kernel whose record is shorter than ours: the flags are read as zero, never past it.
    SysCalls().QueryModule = RawQueryModule;
    SetRaw({}, std::string(sizeof(unsigned long), '\x7f'), 0);
    ASSERT_TRUE(GetModuleInfo("short", &info));
    EXPECT_EQ(info->flags, 0ul);
    EXPECT_NE(info->addr, 0ul);
}
