#include <gtest/gtest.h>

#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "diag/hwdebug.h"
#include "filehandle.h"
#include "scratchdir.h"
#include "util/debuglevel.h"
#include "util/instdir.h"

namespace {

std::string Path(const char* name) {
    UniqueMalloc<char> path(InstallDirFile(name));
    return path != nullptr ? path.get() : "(null)";
}

}  // namespace

TEST(InstallDir, IsTheWorkingDirectoryAndHoldsEveryName) {
    InstallTree tree;
    const std::string cwd = std::filesystem::current_path();
    std::vector<wchar_t> buffer(cwd.size() + 1, L'?');
    ASSERT_TRUE(GetInstallDir(buffer.data(), static_cast<int32_t>(buffer.size())));
    EXPECT_EQ(std::wstring(buffer.data()), std::wstring(cwd.begin(), cwd.end()));
    EXPECT_FALSE(GetInstallDir(buffer.data(), static_cast<int32_t>(cwd.size())));
    EXPECT_FALSE(GetInstallDir(buffer.data(), 0));
    EXPECT_FALSE(GetInstallDir(nullptr, 100));
    const std::string insufficient =
        "\nVELHLIB, GetInstallDir:  Insufficient buffer for install path\n";
    EXPECT_EQ(tree.Log(), insufficient + insufficient +
                              "\nVELHLIB, GetInstallDir:  Called with a NULL buffer\n");

    EXPECT_EQ(Path("dbgprint"), cwd + "/dbgprint");
    EXPECT_EQ(Path("/x.pci"), cwd + "/x.pci");
    EXPECT_EQ(Path(""), cwd);
    EXPECT_EQ(Path(nullptr), cwd);
    EXPECT_FALSE(Exist(Path("velhadp.crd").c_str()));
    tree.Scratch().Write("inst/velhadp.crd", "x");
    EXPECT_TRUE(Exist(Path("velhadp.crd").c_str()));
    EXPECT_FALSE(Exist(nullptr));
}

// A working directory that is gone, or of more than 4096 characters: nothing in it can be
// named, so the level file there is not read, and the log beside it says why.
TEST(InstallDirFile, NoneWhenTheWorkingDirectoryIsGoneOrBeyondTheBuffer) {
    ScratchDir dir;
    WorkingDir cwd(dir.Path());
    ASSERT_EQ(mkdir("gone", 0700), 0);
    ASSERT_EQ(chdir("gone"), 0);
    ASSERT_EQ(rmdir(dir.Path("gone").c_str()), 0);
    wchar_t buffer[INSTALL_DIR_CHARS];
    EXPECT_FALSE(GetInstallDir(buffer, INSTALL_DIR_CHARS));
    EXPECT_EQ(InstallDirFile("dbgprint"), nullptr);

    ASSERT_EQ(chdir(dir.Path().c_str()), 0);
    const std::string component(200, 'd');
    for (int i = 0; i < 21; i++) {
        ASSERT_EQ(mkdir(component.c_str(), 0700), 0);
        ASSERT_EQ(chdir(component.c_str()), 0);
    }
    ASSERT_EQ(mkdir("log", 0700), 0);
    ASSERT_EQ(mkdir("inst", 0700), 0);
    ASSERT_EQ(chdir("inst"), 0);
    ASSERT_GE(std::filesystem::current_path().string().size(), size_t{INSTALL_DIR_CHARS});
    std::ofstream("dbgprint") << "hwdbgprint 0x10\n";
    GetDebugPrintLevel(0);
    EXPECT_EQ(HwInfoPrintLevel, 0u);
    EXPECT_EQ(InstallDirFile("dbgprint"), nullptr);
    const std::string line = "\nVELHLIB, GetInstallDir:  Insufficient buffer for install path\n";
    EXPECT_EQ(ReadAll("../log/velhslot.slotmgr.hwinfo.log"), line + line);
}
