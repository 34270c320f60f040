#include <gtest/gtest.h>

#include <unistd.h>

#include <cstdlib>
#include <cwchar>
#include <string>
#include <vector>

#include "diag/hwdebug.h"
#include "filehandle.h"
#include "scratchdir.h"
#include "util/debuglevel.h"
#include "util/instdir.h"

namespace {

std::string Cwd() {
    UniqueMalloc<char> cwd(getcwd(nullptr, 0));
    return cwd != nullptr ? cwd.get() : "";
}

std::string Path(const char* name) {
    UniqueMalloc<char> path(InstallDirFile(name));
    return path != nullptr ? path.get() : "(null)";
}

}  // namespace

TEST(InstallDir, IsTheWorkingDirectory) {
    InstallTree tree;
    const std::string cwd = Cwd();
    std::vector<wchar_t> buffer(cwd.size() + 1, L'?');
    ASSERT_TRUE(GetInstallDir(buffer.data(), static_cast<int32_t>(buffer.size())));
    EXPECT_EQ(std::wstring(buffer.data()), std::wstring(cwd.begin(), cwd.end()));

    EXPECT_FALSE(GetInstallDir(buffer.data(), static_cast<int32_t>(cwd.size())));
    EXPECT_FALSE(GetInstallDir(buffer.data(), 0));
    EXPECT_FALSE(GetInstallDir(nullptr, 100));
    EXPECT_EQ(tree.Log(),
              "\nVELHLIB, GetInstallDir:  Insufficient buffer for install path\n"
              "\nVELHLIB, GetInstallDir:  Insufficient buffer for install path\n"
              "\nVELHLIB, GetInstallDir:  Called with a NULL buffer\n");
}

TEST(InstallDirFile, PlacesEveryNameInsideTheInstallDirectory) {
    InstallTree tree;
    const std::string cwd = Cwd();
    EXPECT_EQ(Path("dbgprint"), cwd + "/dbgprint");
    EXPECT_EQ(Path("/x.pci"), cwd + "/x.pci");
    EXPECT_EQ(Path(""), cwd);
    EXPECT_EQ(Path(nullptr), cwd);

    EXPECT_FALSE(Exist(Path("velhadp.crd").c_str()));
    tree.Scratch().Write("inst/velhadp.crd", "x");
    EXPECT_TRUE(Exist(Path("velhadp.crd").c_str()));
    EXPECT_FALSE(Exist(nullptr));
    EXPECT_EQ(tree.Log(), "");
}

TEST(InstallDirFile, NoneWhenTheWorkingDirectoryIsGone) {
    ScratchDir dir;
    ASSERT_EQ(mkdir(dir.Path("gone").c_str(), 0700), 0);
    WorkingDir cwd(dir.Path("gone"));
    ASSERT_EQ(rmdir(dir.Path("gone").c_str()), 0);
    wchar_t buffer[INSTALL_DIR_CHARS];
    EXPECT_FALSE(GetInstallDir(buffer, INSTALL_DIR_CHARS));
    EXPECT_EQ(InstallDirFile("dbgprint"), nullptr);
}

// A working directory of more than 4096 characters: nothing in it can be named, so the level
// file there is not read, and the log beside it says why.
TEST(InstallDirFile, NoneForAWorkingDirectoryBeyondTheBuffer) {
    ScratchDir dir;
    WorkingDir cwd(dir.Path());
    const std::string component(200, 'd');
    const int levels = 21;
    for (int i = 0; i < levels; i++) {
        ASSERT_EQ(mkdir(component.c_str(), 0700), 0);
        ASSERT_EQ(chdir(component.c_str()), 0);
    }
    ASSERT_EQ(mkdir("log", 0700), 0);
    ASSERT_EQ(mkdir("inst", 0700), 0);
    ASSERT_EQ(chdir("inst"), 0);
    ASSERT_GE(Cwd().size(), static_cast<size_t>(INSTALL_DIR_CHARS));
    {
        UniqueFile level(std::fopen("dbgprint", "w"));
        ASSERT_NE(level, nullptr);
        std::fputs("hwdbgprint 0x10\n", level.get());
    }

    GetDebugPrintLevel(0);
    EXPECT_EQ(HwInfoPrintLevel, 0u);
    EXPECT_EQ(InstallDirFile("dbgprint"), nullptr);
    std::string log;
    {
        UniqueFile file(std::fopen("../log/velhslot.slotmgr.hwinfo.log", "r"));
        ASSERT_NE(file, nullptr);
        char chunk[256];
        while (std::fgets(chunk, sizeof(chunk), file.get()) != nullptr) {
            log += chunk;
        }
    }
    const std::string line = "\nVELHLIB, GetInstallDir:  Insufficient buffer for install path\n";
    EXPECT_EQ(log, line + line);

    // The tree is too deep for the scratch folder's own removal: take it down level by level.
    ASSERT_EQ(unlink("dbgprint"), 0);
    ASSERT_EQ(chdir(".."), 0);
    ASSERT_EQ(rmdir("inst"), 0);
    ASSERT_EQ(unlink("log/velhslot.slotmgr.hwinfo.log"), 0);
    ASSERT_EQ(rmdir("log"), 0);
    for (int i = 0; i < levels; i++) {
        ASSERT_EQ(chdir(".."), 0);
        ASSERT_EQ(rmdir(component.c_str()), 0);
    }
}
