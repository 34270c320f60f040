#include <gtest/gtest.h>

#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <string>
#include <tuple>

#include "adapters/linvpd.h"
#include "adapters/modquery.h"
#include "diag/hwdebug.h"
#include "setup/linsetup.h"
#include "tests/unit/fake_driver.h"
#include "tests/unit/fake_modules.h"
#include "tests/unit/scratchdir.h"
#include "util/sysaccess.h"

namespace {

FakeDriver Driver;
std::string Release;  // the kernel release uname() answers; "fail" makes it fail

int FakeUname(struct utsname* name) {
    if (Release == "fail") {
        errno = EFAULT;
        return -1;
    }
    std::strcpy(name->sysname, "Linux");
    std::snprintf(name->release, sizeof(name->release), "%s", Release.c_str());
    return 0;
}

// Every check in a fresh library lifetime, on a machine that meets all prerequisites through a
// running slot driver of version 1.0.0 with a table, unless a test changes it.
class PreReq : public ::testing::Test {
  protected:
    void SetUp() override {
        ResetPreReqState();
        InstallFakeModules();
        FakeModules().Modules.push_back({"velhpdrv", MOD_RUNNING, {}, {}});
        ResetDriver();
        SysCalls().Uname = FakeUname;
        Release = "2.4.19-64GB-SMP";
        SysPaths().SlotDriver = Tree.Scratch().Write("velhpdrv", "");
        SysPaths().DevMem = Tree.Scratch().Path("mem");
        SysPaths().Etc = Tree.Scratch().Path("etc");
        SetRelease("SuSE-release", "SuSE SLES-8 (i386)\nVERSION = 8\n");
        ValidVPD = true;
        std::memcpy(Vpd.MachineTypeModel, "K740ABC", sizeof(Vpd.MachineTypeModel));
    }
    void TearDown() override {
        ResetSystemAccess();
        ResetPreReqState();
        HwInfoPrintLevel = 0;
        Vpd = {};
        ValidVPD = false;
    }
    void ResetDriver() {
        Driver = FakeDriver{};
        Driver.SetTable(64);
        Driver.Install();
    }
    // Replaces /etc by a folder holding just this release file.
    void SetRelease(const std::string& name, const std::string& content) {
        std::filesystem::remove_all(SysPaths().Etc);
        std::filesystem::create_directory(SysPaths().Etc);
        Tree.Scratch().Write("etc/" + name, content);
    }
    uint32_t Check() {
        uint32_t code = 0xFFFFFFFF;
        const bool met = CheckPreRequisites(&code);
        EXPECT_EQ(met, code == PREREQ_OK);
        return code;
    }
    // A check as the first of a new library lifetime.
    uint32_t FreshCheck() {
        ResetPreReqState();
        return Check();
    }

    InstallTree Tree;
};

}  // namespace

TEST(GetField, SplitsWithoutRunningPastTheText) {
    // A terminator as separator must not step over the end of the text ("zz" lies beyond it).
    using Case = std::tuple<std::string, char, const char*>;
    for (auto [text, separator, fields] : {Case("2..4.", '.', "2|4|"), Case(".5", '.', "|5|"),
                                           Case({"ab\0zz", 5}, '\0', "ab|"), Case("", '.', "")}) {
        std::string seen;
        char* cursor = text.data();
        while (char* field = GetField(&cursor, separator)) {
            seen += std::string(field) + "|";
        }
        EXPECT_EQ(seen, fields) << text;
        EXPECT_EQ(GetField(&cursor, separator), nullptr);
    }
    char* none = nullptr;
    EXPECT_EQ(GetField(&none, '.'), nullptr);
    EXPECT_EQ(GetField(nullptr, '.'), nullptr);
}

// Kernel releases against the minimum are PreReq.KernelRelease's; missing fields are zero, and
// at most 16 fields count: a difference in the 17th is not seen, one in the 16th is.
TEST(VerCompare, ComparesFieldByFieldAsNumbers) {
    InstallTree tree;
    const std::string sixteen = "1.1.1.1.1.1.1.1.1.1.1.1.1.1.1.1";
    const std::string higher = sixteen + ".2", lower = sixteen + ".1", last = sixteen + "0";
    using Case = std::tuple<const char*, const char*, int, int>;
    for (auto [left, right, fields, expected] :
         {Case("1.0.0", "1.0.0", 3, 0), Case("1.2", "1.10", 3, -1), Case("2.4", "2.4.0", 3, 0),
          Case("2.4.19", "2.4.20", 2, 0), Case("4294967295", "1", 1, 1), Case("1.2", "1.3", 0, 0),
          Case(higher.c_str(), lower.c_str(), 40, 0), Case(last.c_str(), sixteen.c_str(), 40, 1),
          Case("2.x.1", "2.4.19", 3, -2), Case("2.4.19", "2.4.-", 3, -2),
          Case("2.4.99999999999", "2.4.19", 3, -2), Case("a.1", "b.1", 3, -2)}) {
        EXPECT_EQ(VerCompare(left, right, fields), expected) << left << " vs " << right;
    }
    // Both texts bad: both are reported.
    for (const std::string text : {"2.x.1", "a.1", "b.1"}) {
        EXPECT_TRUE(tree.Logged("VerCompare():  numeric conversion error:  " + text + "\n"));
    }
}

// The trace of a matching release file is the JVM dump test's (its golden prereq-check log).
TEST_F(PreReq, ReleaseFileMatching) {
    HwInfoPrintLevel = TRACE_PREREQ_CHECK;
    using Case = std::tuple<const char*, const char*, uint32_t>;
    const char* const suse = "SuSE-release";
    for (auto [name, content, expected] :
         {Case(suse, "SuSE SLES-8 (i386)\nVERSION = 8\n", PREREQ_OK),
          Case("suse-release", "SuSE SLES-8\n", PREREQ_OK),
          Case(suse, "SuSE SLES-8", PREREQ_OK),  // no line feed after the only line
          Case(suse, "SuSE SLES-9 (i386)\n", PREREQ_OS_PRODUCT),
          Case(suse, "SuSE\n", PREREQ_OS_PRODUCT), Case(suse, "RedHat SLES-8\n", PREREQ_OS_VENDOR),
          Case(suse, "suse SLES-8\n", PREREQ_OS_VENDOR),
          Case(suse, "\nSuSE SLES-8\n", PREREQ_OS_VENDOR), Case(suse, "", PREREQ_OS_VENDOR),
          Case("redhat-release", "SuSE SLES-8\n", PREREQ_OS_VENDOR)}) {
        SetRelease(name, content);
        EXPECT_EQ(FreshCheck(), expected) << name << ": " << content;
        const bool ok = expected == PREREQ_OK;
        EXPECT_STREQ(Distributor, ok ? "SuSE" : nullptr);
        EXPECT_STREQ(DistVersion, ok ? "SLES-8" : nullptr);
        EXPECT_EQ(SupportedOsVendor, expected != PREREQ_OS_VENDOR);
    }
    // A line of one word: the missing product is traced as empty.
    EXPECT_TRUE(Tree.Logged("OsProducts[0]:  SLES-8\n             version:  \n")) << Tree.Log();
    // A symbolic link is not a release file.
    SetRelease("other", "SuSE SLES-8\n");
    ASSERT_EQ(symlink("other", (SysPaths().Etc + "/SuSE-release").c_str()), 0);
    EXPECT_EQ(FreshCheck(), PREREQ_OS_VENDOR);
}

TEST_F(PreReq, KernelRelease) {
    // The kernel version is the release up to its first dash; an empty release names none.
    using Case = std::tuple<const char*, uint32_t, const char*>;
    for (auto [release, expected, version] :
         {Case("2.4.19-64GB-SMP", PREREQ_OK, "2.4.19"),
          Case("2.4.18", PREREQ_KERNEL_VERSION, "2.4.18"), Case("2.6.5", PREREQ_OK, "2.6.5"),
          Case("2.4", PREREQ_KERNEL_VERSION, "2.4"), Case("", PREREQ_KERNEL_VERSION, nullptr),
          Case("2.x.1-smp", PREREQ_KERNEL_VERSION, "2.x.1"),
          Case("2.4.21smp", PREREQ_OK, "2.4.21smp"),
          Case("fail", PREREQ_KERNEL_VERSION, nullptr)}) {
        Release = release;
        EXPECT_EQ(FreshCheck(), expected) << release;
        EXPECT_STREQ(KernVersion, version);
    }
    EXPECT_TRUE(Tree.Logged("GetOS():  uname() failed")) << Tree.Log();
}

TEST_F(PreReq, SlotDriverBranches) {
    EXPECT_EQ(FreshCheck(), PREREQ_OK);
    EXPECT_TRUE(DriverLoaded && DriverVerValid && AslTableAvailable);
    EXPECT_STREQ(DriverVersion, "1.0.0");
    Driver.SetTable(0);
    EXPECT_EQ(FreshCheck(), PREREQ_NO_ASL_TABLE);
    ResetDriver();
    Driver.Version = {0, 9, 9};
    EXPECT_EQ(FreshCheck(), PREREQ_DRIVER_VERSION);
    // Running, but its version cannot be read: nothing to compare, and no table is asked for.
    ResetDriver();
    Driver.FailRequest = VELH_IOCTL_VERSION;
    EXPECT_EQ(FreshCheck(), PREREQ_DRIVER_VERSION);
    EXPECT_TRUE(DriverLoaded && !DriverVerValid && DriverVersion == nullptr);
    EXPECT_EQ(Driver.Count(VELH_IOCTL_TABLE), 0u);
    // Loaded but not running: the driver is not asked at all.
    ResetDriver();
    FakeModules().Modules[0].Flags = 0;
    EXPECT_EQ(FreshCheck(), PREREQ_NO_DRIVER);
    EXPECT_TRUE(Driver.Requests.empty());
    SetupVelhSlot();
    EXPECT_EQ(AgentStatistics.PreReqError, PREREQ_NO_DRIVER);
    EXPECT_FALSE(CheckPreRequisites(nullptr));
}

TEST_F(PreReq, PciArchitectureFileReplacesTheDriverOnceVitalProductDataIsFound) {
    FakeModules().Modules.clear();
    ValidVPD = false;
    Vpd = {};
    Tree.Scratch().Write("inst/K740ABC.pci", "");
    EXPECT_EQ(FreshCheck(), PREREQ_NO_DRIVER);  // no memory image: the file is not found
    EXPECT_FALSE(DriverLoaded);
    EXPECT_TRUE(Tree.Logged("GetModuleInfo():  No info for module velhpdrv")) << Tree.Log();
    // A record at 0x1234 of the segment: header, signature and at 40 the machine type and model.
    std::string image(VPD_SEGMENT_OFFSET + VPD_SEGMENT_SIZE, '\0');
    image.replace(VPD_SEGMENT_OFFSET + 0x1234, 5, "\xAA\x55VPD");
    image.replace(VPD_SEGMENT_OFFSET + 0x1234 + 40, 7, "K740ABC");
    Tree.Scratch().Write("mem", image);
    EXPECT_EQ(Check(), PREREQ_OK);
    EXPECT_TRUE(ValidVPD && UsingPciFile);
    EXPECT_EQ(FakeModules().Calls, 1);  // only before the file was found
    EXPECT_TRUE(Driver.Requests.empty());
    // The kernel and distribution checks still come first.
    Release = "2.4.18";
    EXPECT_EQ(FreshCheck(), PREREQ_KERNEL_VERSION);
}

TEST_F(PreReq, OnceAndEveryCheckFacts) {
    // A failed uname or table read is not final: the next check asks again.
    Release = "fail";
    Driver.FailRequest = VELH_IOCTL_TABLE;
    EXPECT_EQ(Check(), PREREQ_KERNEL_VERSION);
    Release = "2.4.19-64GB-SMP";
    EXPECT_EQ(Check(), PREREQ_NO_ASL_TABLE);
    Driver.FailRequest = 0;
    EXPECT_EQ(Check(), PREREQ_OK);
    // The table is asked for once per library lifetime.
    Driver.SetTable(0);
    EXPECT_EQ(Check(), PREREQ_OK);
    EXPECT_EQ(Driver.Count(VELH_IOCTL_TABLE), 3u);
    // The OS is identified once; the driver facts are gathered anew.
    Release = "2.4.18";
    SetRelease("SuSE-release", "RedHat x\n");
    FakeModules().Modules[0].Flags = 0;
    EXPECT_EQ(Check(), PREREQ_NO_DRIVER);
    EXPECT_STREQ(Distributor, "SuSE");
    FakeModules().Modules[0].Flags = MOD_RUNNING;
    EXPECT_EQ(Check(), PREREQ_OK);
}
