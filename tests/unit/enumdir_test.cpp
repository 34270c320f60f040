#include "util/enumdir.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <vector>

#include "scratchdir.h"

namespace {

std::vector<std::string> Walk(const std::string& directory, const char* pattern, uint32_t mask) {
    EnumDir walker;
    _FILE_ATTRIBS attribs;
    std::vector<std::string> names;
    while (walker.Next(directory.c_str(), pattern, mask, &attribs)) {
        names.emplace_back(attribs.EntryName);
    }
    return names;
}

using Names = std::vector<std::string>;

class EnumDirTest : public ::testing::Test {
  protected:
    void SetUp() override {
        for (const char* name : {"0a", "01", "00"}) {
            ASSERT_EQ(mkdir(Dir.Path(name).c_str(), 0700), 0);
        }
        Dir.Write("devices", "12345");
        Dir.Write("0b", "");
    }
    ScratchDir Dir;
};

TEST_F(EnumDirTest, WalksSortedEntriesOfTheRequestedTypes) {
    EXPECT_EQ(Walk(Dir.Path(), "*", ATTR_DIRECTORY), (Names{"00", "01", "0a"}));
    EXPECT_EQ(Walk(Dir.Path(), "*", ATTR_FILE), (Names{"0b", "devices"}));
    EXPECT_EQ(Walk(Dir.Path(), "*", ATTR_DOT), (Names{".", ".."}));
    EXPECT_EQ(Walk(Dir.Path(), "*", ATTR_DIRECTORY | ATTR_FILE),
              (Names{"00", "01", "0a", "0b", "devices"}));
    EXPECT_EQ(Walk(Dir.Path(), "*", ATTR_SOCKET), Names{});

    // The record: type bits, size, times and a path with one slash, with or without a trailing
    // slash on the directory text.
    for (const std::string& directory : {Dir.Path(), Dir.Path() + "/"}) {
        EnumDir walker(directory.c_str(), "dev*", ATTR_FILE);
        _FILE_ATTRIBS attribs;
        ASSERT_TRUE(walker.Next(&attribs));
        EXPECT_EQ(attribs.Attribs, ATTR_FILE);
        EXPECT_EQ(attribs.Size, 5u);
        EXPECT_GT(attribs.WriteTime, 0);
        EXPECT_GT(attribs.AccessTime, 0);
        EXPECT_STREQ(attribs.EntryPath, Dir.Path("devices").c_str());
        EXPECT_FALSE(walker.Next(&attribs));
    }
}

TEST_F(EnumDirTest, PatternsFoldCaseAndTreatLeadingDotsAsOrdinary) {
    Dir.Write("SuSE-release", "");
    Dir.Write("UnitedLinux-release", "");
    Dir.Write(".hidden", "");
    EXPECT_EQ(Walk(Dir.Path(), "suse-release", ATTR_FILE), Names{"SuSE-release"});
    EXPECT_EQ(Walk(Dir.Path(), "*-RELEASE", ATTR_FILE),
              (Names{"SuSE-release", "UnitedLinux-release"}));
    EXPECT_EQ(Walk(Dir.Path(), "DEV?CES", ATTR_FILE), Names{"devices"});
    EXPECT_EQ(Walk(Dir.Path(), "*hidden", ATTR_FILE), Names{".hidden"});
    EXPECT_EQ(Walk(Dir.Path(), "0[0-9]", ATTR_DIRECTORY), (Names{"00", "01"}));
    // A null pattern matches everything.
    EXPECT_EQ(Walk(Dir.Path(), nullptr, ATTR_DIRECTORY), (Names{"00", "01", "0a"}));
}

TEST_F(EnumDirTest, LinksAndSpecialFilesAreReportedByTheirOwnType) {
    ASSERT_EQ(symlink(Dir.Path("00").c_str(), Dir.Path("link-dir").c_str()), 0);
    ASSERT_EQ(symlink("nowhere", Dir.Path("link-dangling").c_str()), 0);
    ASSERT_EQ(mkfifo(Dir.Path("pipe").c_str(), 0600), 0);
    EXPECT_EQ(Walk(Dir.Path(), "*", ATTR_DIRECTORY), (Names{"00", "01", "0a"}));
    EXPECT_EQ(Walk(Dir.Path(), "*", ATTR_SYMLINK), (Names{"link-dangling", "link-dir"}));
    EXPECT_EQ(Walk(Dir.Path(), "*", ATTR_FIFO), Names{"pipe"});
    EXPECT_EQ(Walk("/dev", "null", ATTR_CHAR_DEVICE), Names{"null"});
}

TEST_F(EnumDirTest, EndRewindResetAndMissingDirectories) {
    EnumDir walker;
    _FILE_ATTRIBS attribs;
    EXPECT_FALSE(walker.Next(&attribs));  // nothing started
    ASSERT_TRUE(walker.Next(Dir.Path().c_str(), "*", ATTR_FILE, &attribs));
    EXPECT_STREQ(attribs.EntryName, "0b");
    // Later arguments are ignored: the walk goes on in the first directory.
    ASSERT_TRUE(walker.Next("/nonexistent", "x", ATTR_SOCKET, &attribs));
    EXPECT_STREQ(attribs.EntryName, "devices");
    errno = 0;
    EXPECT_FALSE(walker.Next(&attribs));
    EXPECT_EQ(errno, ENOENT);
    EXPECT_STREQ(attribs.EntryName, "devices");  // untouched at the end
    EXPECT_FALSE(walker.Next(&attribs));

    EXPECT_TRUE(walker.Rewind());
    ASSERT_TRUE(walker.Next(&attribs));
    EXPECT_STREQ(attribs.EntryName, "0b");

    EXPECT_TRUE(walker.Reset());
    EXPECT_FALSE(walker.Next(&attribs));
    ASSERT_TRUE(walker.Next(Dir.Path().c_str(), "*", ATTR_DIRECTORY, &attribs));
    EXPECT_STREQ(attribs.EntryName, "00");

    // A missing directory: the first call fails and so does every later one, without retrying.
    EnumDir missing;
    EXPECT_FALSE(missing.StartEnum(Dir.Path("gone").c_str(), "*", ATTR_FILE));
    EXPECT_FALSE(missing.Next(Dir.Path().c_str(), "*", ATTR_FILE, &attribs));
    EXPECT_FALSE(missing.Next(&attribs));
    EXPECT_EQ(Walk(Dir.Path("gone"), "*", ATTR_FILE), Names{});
    EXPECT_EQ(Walk(Dir.Path("devices"), "*", ATTR_FILE), Names{});  // not a directory
}

TEST(EnumDir, AnEntryThatVanishesIsReportedAndSkipped) {
    InstallTree tree;
    const ScratchDir& dir = tree.Scratch();
    ASSERT_EQ(mkdir(dir.Path("bus").c_str(), 0700), 0);
    for (const char* name : {"00.0", "01.0", "02.0"}) {
        dir.Write(std::string("bus/") + name, "");
    }
    EnumDir walker(dir.Path("bus").c_str(), "*", ATTR_FILE);
    ASSERT_EQ(unlink(dir.Path("bus/01.0").c_str()), 0);
    _FILE_ATTRIBS attribs;
    std::vector<std::string> names;
    while (walker.Next(&attribs)) {
        names.emplace_back(attribs.EntryName);
    }
    EXPECT_EQ(names, (Names{"00.0", "02.0"}));
    std::string log = tree.Log();
    EXPECT_NE(log.find("EnumDir::SetAttribs():  lstat64() failed for " + dir.Path("bus/01.0")),
              std::string::npos)
        << log;
}

}  // namespace
