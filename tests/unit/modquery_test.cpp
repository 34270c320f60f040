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
    if (size < RawImage.size()) {
        *ret = RawImage.size();
        errno = ENOSPC;
        return -1;
    }
    std::memcpy(buffer, RawImage.data(), RawImage.size());
    *ret = RawCount;
    return 0;
}

void PutEntry(size_t index, unsigned long value, unsigned long name) {
    module_symbol entry{value, name};
    std::memcpy(RawImage.data() + index * sizeof(entry), &entry, sizeof(entry));
}

class ModQuery : public ::testing::Test {
  protected:
    void SetUp() override { InstallFakeModules(); }
    void TearDown() override { ResetSystemAccess(); }
    InstallTree Tree;
};

}  // namespace

TEST_F(ModQuery, SymbolListOfALoadedModule) {
    std::vector<std::pair<unsigned long, std::string>> symbols = {
        {0x1000, "e1000_probe"}, {0x2000, "__insmod_e1000_O/lib/modules/x/e1000.o_M1234_V2"}};
    FakeModules().Modules.push_back({"e1000", 1, symbols, {}});

    EXPECT_EQ(SizeBuffer("e1000", QM_SYMBOLS), static_cast<int>(SymbolImage(symbols).size()));
    ModuleSymbols list;
    ASSERT_EQ(GetModuleSymbols("e1000", &list), 2);
    EXPECT_STREQ(list.Name(0), "e1000_probe");
    EXPECT_STREQ(list.Name(1), "__insmod_e1000_O/lib/modules/x/e1000.o_M1234_V2");
    EXPECT_EQ(list.Name(2), nullptr);
    EXPECT_EQ(list.Name(-1), nullptr);

    // Not loaded, or loaded without symbols: nothing handed out.
    EXPECT_EQ(SizeBuffer("e100", QM_SYMBOLS), 0);
    EXPECT_EQ(GetModuleSymbols("e100", &list), 0);
    EXPECT_EQ(list.Buffer, nullptr);
    EXPECT_EQ(list.Name(0), nullptr);
    FakeModules().Modules.push_back({"bare", 1, {}, {}});
    EXPECT_EQ(GetModuleSymbols("bare", &list), 0);
    EXPECT_EQ(list.Buffer, nullptr);

    // A list that grows between the size question and the read is read again.
    FakeModules().Modules.push_back({"late", 1, {{1, "first"}}, {{2, "second"}, {3, "third"}}});
    ASSERT_EQ(GetModuleSymbols("late", &list), 3);
    EXPECT_STREQ(list.Name(2), "third");
}

TEST_F(ModQuery, MalformedSymbolListsAreReadOnlyInsideTheBuffer) {
    SysCalls().QueryModule = RawQueryModule;
    // Three entries' worth of names after two entries: one good, one pointing past the end,
    // one pointing back into the entries, and a count claiming more entries than fit.
    RawImage.assign(2 * sizeof(module_symbol), '\0');
    size_t good = RawImage.size();
    RawImage.insert(RawImage.end(), {'o', 'k', '\0'});
    PutEntry(0, 1, good);
    PutEntry(1, 2, RawImage.size() + 5);
    RawCount = 1000;
    ModuleSymbols list;
    ASSERT_EQ(GetModuleSymbols("raw", &list), 2);
    EXPECT_STREQ(list.Name(0), "ok");
    EXPECT_EQ(list.Name(1), nullptr);

    PutEntry(1, 2, 3);  // inside the entry array
    RawCount = 2;
    ASSERT_EQ(GetModuleSymbols("raw", &list), 2);
    EXPECT_EQ(list.Name(1), nullptr);

    // A last name that runs to the end of the buffer without its terminator.
    RawImage.pop_back();
    PutEntry(1, 2, good);
    ASSERT_EQ(GetModuleSymbols("raw", &list), 2);
    EXPECT_EQ(list.Name(0), nullptr);

    // A buffer too small for a single entry holds no symbols.
    RawImage.assign(sizeof(module_symbol) - 1, 'x');
    RawCount = 1;
    EXPECT_EQ(GetModuleSymbols("raw", &list), 0);
    EXPECT_EQ(list.Buffer, nullptr);
}

TEST_F(ModQuery, ModuleInfo) {
    FakeModules().Modules.push_back({"velhpdrv", 0x5, {}, {}});
    EXPECT_EQ(SizeBuffer("velhpdrv", QM_INFO), static_cast<int>(sizeof(module_info)));
    UniqueMalloc<module_info> info;
    ASSERT_TRUE(GetModuleInfo("velhpdrv", &info));
    ASSERT_NE(info, nullptr);
    EXPECT_EQ(info->flags, 0x5ul);
    EXPECT_EQ(info->usecount, 1);

    EXPECT_FALSE(GetModuleInfo("absent", &info));
    EXPECT_EQ(info, nullptr);
    EXPECT_NE(Tree.Log().find("GetModuleInfo():  No info for module absent\n"), std::string::npos)
        << Tree.Log();

    // A kernel whose record is shorter than ours: the flags are read as zero, never past it.
    SysCalls().QueryModule = RawQueryModule;
    RawImage.assign(sizeof(unsigned long), '\x7f');
    RawCount = 0;
    ASSERT_TRUE(GetModuleInfo("short", &info));
    EXPECT_EQ(info->flags, 0ul);
    EXPECT_NE(info->addr, 0ul);
}
