#include "util/enumdir.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <vector>

#include "scratchdir.h"

namespace {

using Names = std::vector<std::string>;

// The names a started walk hands out.
Names Walk(EnumDir& walker) {
    _FILE_ATTRIBS attribs;
    Names names;
    while (walker.Next(&attribs)) {
        names.emplace_back(attribs.EntryName);
    }
    return names;
}

TEST(EnumDir, WalksSortedEntriesOfTheRequestedTypesAndPatternsAndStops) {
    InstallTree tree;
    const ScratchDir& dir = tree.Scratch();
    for (const char* name : {"w", "w/0a", "w/01", "w/00"}) {
        ASSERT_EQ(mkdir(dir.Path(name).c_str(), 0700), 0);
    }
    for (const char* name : {"w/0b", "w/SuSE-release", "w/UnitedLinux-release", "w/.hidden"}) {
        dir.Write(name, "");
    }
    const std::string path = dir.Write("w/devices", "12345");
    const std::string w = dir.Path("w");
    ASSERT_EQ(symlink(dir.Path("w/00").c_str(), dir.Path("w/link-dir").c_str()), 0);
    ASSERT_EQ(symlink("nowhere", dir.Path("w/link-dangling").c_str()), 0);
    ASSERT_EQ(mkfifo(dir.Path("w/pipe").c_str(), 0600), 0);
    // Patterns fold case and treat a leading dot as ordinary; a null pattern matches all.
    const std::tuple<std::string, const char*, uint32_t, Names> cases[] = {
        {w, "*", ATTR_DIRECTORY, {"00", "01", "0a"}},
        {w, "0*", ATTR_FILE, {"0b"}},
        {w, "*", ATTR_DOT, {".", ".."}},
        {w, "0*", ATTR_DIRECTORY | ATTR_FILE, {"00", "01", "0a", "0b"}},
        {w, "*", ATTR_SOCKET, {}},
        {w, "suse-release", ATTR_FILE, {"SuSE-release"}},
        {w, "*-RELEASE", ATTR_FILE, {"SuSE-release", "UnitedLinux-release"}},
        {w, "DEV?CES", ATTR_FILE, {"devices"}},
        {w, "*hidden", ATTR_FILE, {".hidden"}},
        {w, "0[0-9]", ATTR_DIRECTORY, {"00", "01"}},
        {w, nullptr, ATTR_DIRECTORY, {"00", "01", "0a"}},
        {w, "*", ATTR_SYMLINK, {"link-dangling", "link-dir"}},
        {w, "*", ATTR_FIFO, {"pipe"}},
        {"/dev", "null", ATTR_CHAR_DEVICE, {"null"}},
        {dir.Path("gone"), "*", ATTR_FILE, {}},
        {path, "*", ATTR_FILE, {}},  // not a directory
    };
    for (const auto& [directory, pattern, mask, names] : cases) {
        EnumDir walker(directory.c_str(), pattern, mask);
        EXPECT_EQ(Walk(walker), names) << (pattern ? pattern : "") << mask;
    }
    // Nothing started; later arguments are ignored: the walk goes on in the first directory. The
    // record: type bits, size, times and a path with one slash, with or without a trailing slash.
    _FILE_ATTRIBS attribs;
    for (const std::string& directory : {w, w + "/"}) {
        EnumDir walker;
        EXPECT_FALSE(walker.Next(&attribs));
        ASSERT_TRUE(walker.Next(directory.c_str(), "[0d]*", ATTR_FILE, &attribs));
        EXPECT_STREQ(attribs.EntryName, "0b");
        ASSERT_TRUE(walker.Next("/nonexistent", "x", ATTR_SOCKET, &attribs));
        EXPECT_STREQ(attribs.EntryName, "devices");
        EXPECT_EQ(attribs.Attribs, ATTR_FILE);
        EXPECT_EQ(attribs.Size, 5u);
        EXPECT_GT(attribs.WriteTime, 0);
        EXPECT_GT(attribs.AccessTime, 0);
        EXPECT_STREQ(attribs.EntryPath, path.c_str());
        errno = 0;
        EXPECT_FALSE(walker.Next(&attribs));
        EXPECT_EQ(errno, ENOENT);
        EXPECT_STREQ(attribs.EntryName, "devices");  // untouched at the end
        EXPECT_FALSE(walker.Next(&attribs));
        EXPECT_TRUE(walker.Rewind());
        EXPECT_EQ(Walk(walker), (Names{"0b", "devices"}));
        EXPECT_TRUE(walker.Reset());
        EXPECT_FALSE(walker.Next(&attribs));
        ASSERT_TRUE(walker.Next(directory.c_str(), "*", ATTR_DIRECTORY, &attribs));
        EXPECT_STREQ(attribs.EntryName, "00");
    }
    // A missing directory: the first call fails and so does every later one, without retrying.
    EnumDir missing;
    EXPECT_FALSE(missing.StartEnum(dir.Path("gone").c_str(), "*", ATTR_FILE));
    EXPECT_FALSE(missing.Next(w.c_str(), "*", ATTR_FILE, &attribs));
    EXPECT_FALSE(missing.Next(&attribs));
    // An entry that vanishes during the walk is reported and skipped.
    EnumDir vanishing(w.c_str(), "0*", ATTR_DIRECTORY | ATTR_FILE);
    ASSERT_EQ(rmdir(dir.Path("w/01").c_str()), 0);
    EXPECT_EQ(Walk(vanishing), (Names{"00", "0a", "0b"}));
    EXPECT_TRUE(tree.Logged("EnumDir::SetAttribs():  lstat64() failed for " + w + "/01"))
        << tree.Log();
}

}  // namespace
