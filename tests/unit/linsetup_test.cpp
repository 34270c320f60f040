#include <gtest/gtest.h>

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <string>

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

// A running driver of version 1.0.0 with a table.
void ResetDriver() {
    Driver = FakeDriver{};
    Driver.SetTable(64);
}

std::string Release;
bool UnameFails = false;

int FakeUname(struct utsname* name) {
    if (UnameFails) {
        errno = EFAULT;
        return -1;
    }
    std::strcpy(name->sysname, "Linux");
    std::snprintf(name->release, sizeof(name->release), "%s", Release.c_str());
    return 0;
}

// Every check in a fresh library lifetime, on a machine that meets all prerequisites through a
// running slot driver unless a test changes it.
class PreReq : public ::testing::Test {
  protected:
    void SetUp() override {
        SavedVpd = Vpd;
        SavedValid = ValidVPD;
        ResetPreReqState();
        InstallFakeModules();
        FakeModules().Modules.push_back({"velhpdrv", MOD_RUNNING, {}, {}});
        ResetDriver();
        Driver.Install();
        SysCalls().Uname = FakeUname;
        Release = "2.4.19-64GB-SMP";
        UnameFails = false;
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
        Vpd = SavedVpd;
        ValidVPD = SavedValid;
    }

    // Replaces /etc by a folder holding just this release file.
    void SetRelease(const std::string& name, const std::string& content) {
        std::filesystem::remove_all(SysPaths().Etc);
        std::filesystem::create_directory(SysPaths().Etc);
        Tree.Scratch().Write("etc/" + name, content);
    }

    uint32_t Check() {
        uint32_t code = 0xFFFFFFFF;
        bool met = CheckPreRequisites(&code);
        EXPECT_EQ(met, code == PREREQ_OK);
        return code;
    }

    // A check as the first of a new library lifetime.
    uint32_t FreshCheck() {
        ResetPreReqState();
        return Check();
    }

    InstallTree Tree;
    _VPD_LAYOUT SavedVpd;
    bool SavedValid = false;
};

}  // namespace

TEST(GetField, SplitsWithoutRunningPastTheText) {
    char text[] = "2..4.";
    char* cursor = text;
    EXPECT_STREQ(GetField(&cursor, '.'), "2");
    EXPECT_STREQ(GetField(&cursor, '.'), "4");
    EXPECT_EQ(GetField(&cursor, '.'), nullptr);
    EXPECT_EQ(GetField(&cursor, '.'), nullptr);

    char leading[] = ".5";
    cursor = leading;
    EXPECT_STREQ(GetField(&cursor, '.'), "");
    EXPECT_STREQ(GetField(&cursor, '.'), "5");
    EXPECT_EQ(GetField(&cursor, '.'), nullptr);

    // A terminator as separator must not step over the end of the text.
    char whole[] = "ab\0zz";
    cursor = whole;
    EXPECT_STREQ(GetField(&cursor, '\0'), "ab");
    EXPECT_EQ(cursor, whole + 2);
    EXPECT_EQ(GetField(&cursor, '\0'), nullptr);

    char* none = nullptr;
    EXPECT_EQ(GetField(&none, '.'), nullptr);
    EXPECT_EQ(GetField(nullptr, '.'), nullptr);
}

TEST(VerCompare, ComparesFieldByField) {
    InstallTree tree;
    struct Case {
        const char* Left;
        const char* Right;
        int Fields;
        int Expected;
    };
    const std::string sixteen = "1.1.1.1.1.1.1.1.1.1.1.1.1.1.1.1.";
    const std::string seventeenHigher = sixteen + "2";
    const std::string seventeenLower = sixteen + "1";
    const Case cases[] = {
        {"1.0.0", "1.0.0", 3, 0},
        {"1.2", "1.10", 3, -1},
        {"10.0.1", "9.9.9", 3, 1},
        {"2..4", "2.4", 3, 0},
        {"2.4.19smp", "2.4.19", 3, 0},
        {"2.4", "2.4.19", 3, -1},
        {"2.4", "2.4.0", 3, 0},
        {"2.4.19", "2.4.20", 2, 0},  // only the fields asked for count
        {"4294967295", "1", 1, 1},   // unsigned
        {"", "", 3, 0},
        {"1.2", "1.3", 0, 0},
        {"1.2", "1.3", -4, 0},
        // At most 16 fields: a difference in the 17th is not seen, one in the 16th is.
        {seventeenHigher.c_str(), seventeenLower.c_str(), 40, 0},
        {"1.1.1.1.1.1.1.1.1.1.1.1.1.1.1.2", "1.1.1.1.1.1.1.1.1.1.1.1.1.1.1.1", 40, 1},
        {"2.x.1", "2.4.19", 3, -2},
        {"2.4.19", "2.4.-", 3, -2},
        {"2.4.99999999999", "2.4.19", 3, -2},
    };
    for (const Case& c : cases) {
        EXPECT_EQ(VerCompare(c.Left, c.Right, c.Fields), c.Expected)
            << c.Left << " vs " << c.Right << " over " << c.Fields;
    }
    EXPECT_NE(tree.Log().find("VerCompare():  numeric conversion error:  2.x.1\n"),
              std::string::npos);

    // Both texts bad: both are reported.
    EXPECT_EQ(VerCompare("a.1", "b.1", 3), -2);
    std::string log = tree.Log();
    EXPECT_NE(log.find("numeric conversion error:  a.1\n"), std::string::npos) << log;
    EXPECT_NE(log.find("numeric conversion error:  b.1\n"), std::string::npos) << log;
}

TEST_F(PreReq, ReleaseFileMatching) {
    struct Case {
        const char* Name;
        const char* Content;
        uint32_t Expected;
    };
    const Case cases[] = {
        {"SuSE-release", "SuSE SLES-8 (i386)\nVERSION = 8\n", PREREQ_OK},
        {"suse-release", "SuSE SLES-8\n", PREREQ_OK},
        {"SuSE-release", "SuSE SLES-8", PREREQ_OK},  // no line feed after the only line
        {"SuSE-release", "SuSE SLES-9 (i386)\n", PREREQ_OS_PRODUCT},
        {"SuSE-release", "SuSE\n", PREREQ_OS_PRODUCT},
        {"SuSE-release", "RedHat SLES-8\n", PREREQ_OS_VENDOR},
        {"SuSE-release", "suse SLES-8\n", PREREQ_OS_VENDOR},
        {"SuSE-release", "\nSuSE SLES-8\n", PREREQ_OS_VENDOR},
        {"SuSE-release", "", PREREQ_OS_VENDOR},
        {"redhat-release", "SuSE SLES-8\n", PREREQ_OS_VENDOR},
    };
    for (const Case& c : cases) {
        SetRelease(c.Name, c.Content);
        EXPECT_EQ(FreshCheck(), c.Expected) << c.Name << ": " << c.Content;
        if (c.Expected == PREREQ_OK) {
            EXPECT_STREQ(Distributor, "SuSE");
            EXPECT_STREQ(DistVersion, "SLES-8");
        } else {
            EXPECT_EQ(Distributor, nullptr);
            EXPECT_EQ(DistVersion, nullptr);
            EXPECT_EQ(SupportedOsVendor, c.Expected == PREREQ_OS_PRODUCT);
        }
    }

    // A symbolic link is not a release file.
    SetRelease("other", "SuSE SLES-8\n");
    ASSERT_EQ(symlink("other", (SysPaths().Etc + "/SuSE-release").c_str()), 0);
    EXPECT_EQ(FreshCheck(), PREREQ_OS_VENDOR);
}

TEST_F(PreReq, TracesTheReleaseMatch) {
    HwInfoPrintLevel = TRACE_PREREQ_CHECK;
    EXPECT_EQ(Check(), PREREQ_OK);
    std::string expected = "    GetOS(), opening:  " + SysPaths().Etc +
                           "/SuSE-release\n"
                           "           read line:  >SuSE SLES-8 (i386)<\n"
                           "        OsVendors[0]:  SuSE\n"
                           "              vendor:  SuSE\n"
                           "       OsProducts[0]:  SLES-8\n"
                           "             version:  SLES-8\n"
                           "    Matched vendor and version\n";
    std::string log = Tree.Log();
    EXPECT_NE(log.find(expected), std::string::npos) << log;
    EXPECT_NE(log.find("CheckPreRequisites(),  entry\n"), std::string::npos);

    // A line of one word: the missing product is traced as empty.
    SetRelease("SuSE-release", "SuSE\n");
    EXPECT_EQ(FreshCheck(), PREREQ_OS_PRODUCT);
    EXPECT_NE(Tree.Log().find("             version:  \n"), std::string::npos);
}

TEST_F(PreReq, KernelRelease) {
    struct Case {
        const char* Release;
        uint32_t Expected;
    };
    const Case cases[] = {
        {"2.4.19-64GB-SMP", PREREQ_OK}, {"2.4.18", PREREQ_KERNEL_VERSION},
        {"2.6.5", PREREQ_OK},           {"2.4", PREREQ_KERNEL_VERSION},
        {"", PREREQ_KERNEL_VERSION},    {"2.x.1-smp", PREREQ_KERNEL_VERSION},
        {"2.4.21smp", PREREQ_OK},
    };
    for (const Case& c : cases) {
        Release = c.Release;
        EXPECT_EQ(FreshCheck(), c.Expected) << c.Release;
    }
    Release = "2.4.19-64GB-SMP";
    EXPECT_EQ(FreshCheck(), PREREQ_OK);
    EXPECT_STREQ(KernVersion, "2.4.19");
    // An empty release names no kernel version.
    Release = "";
    FreshCheck();
    EXPECT_EQ(KernVersion, nullptr);

    UnameFails = true;
    EXPECT_EQ(FreshCheck(), PREREQ_KERNEL_VERSION);
    EXPECT_NE(Tree.Log().find("GetOS():  uname() failed"), std::string::npos);
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
    EXPECT_TRUE(DriverLoaded);
    EXPECT_FALSE(DriverVerValid);
    EXPECT_EQ(DriverVersion, nullptr);
    EXPECT_EQ(Driver.Count(VELH_IOCTL_TABLE), 0u);

    // Loaded but not running: the driver is not asked at all.
    ResetDriver();
    FakeModules().Modules[0].Flags = 0;
    EXPECT_EQ(FreshCheck(), PREREQ_NO_DRIVER);
    EXPECT_TRUE(Driver.Requests.empty());

    FakeModules().Modules.clear();
    EXPECT_EQ(FreshCheck(), PREREQ_NO_DRIVER);
    EXPECT_FALSE(DriverLoaded);
    EXPECT_NE(Tree.Log().find("GetModuleInfo():  No info for module velhpdrv"), std::string::npos);
}

TEST_F(PreReq, PciArchitectureFileReplacesTheDriver) {
    FakeModules().Modules.clear();
    Tree.Scratch().Write("inst/K740ABC.pci", "");
    EXPECT_EQ(FreshCheck(), PREREQ_OK);
    EXPECT_TRUE(UsingPciFile);
    EXPECT_EQ(FakeModules().Calls, 0);
    EXPECT_TRUE(Driver.Requests.empty());

    // The kernel and distribution checks still come first.
    Release = "2.4.18";
    EXPECT_EQ(FreshCheck(), PREREQ_KERNEL_VERSION);
}

TEST_F(PreReq, VitalProductDataIsReadUntilFound) {
    ValidVPD = false;
    std::memset(&Vpd, 0, sizeof(Vpd));
    Tree.Scratch().Write("inst/K740ABC.pci", "");
    EXPECT_EQ(FreshCheck(), PREREQ_OK);  // no memory image: through the driver
    EXPECT_FALSE(UsingPciFile);

    _VPD_LAYOUT record{};
    record.Header1 = 0xAA;
    record.Header2 = 0x55;
    std::memcpy(record.Signature, "VPD", 3);
    std::memcpy(record.MachineTypeModel, "K740ABC", 7);
    std::string image(VPD_SEGMENT_OFFSET + VPD_SEGMENT_SIZE, '\0');
    image.replace(VPD_SEGMENT_OFFSET + 0x1234, sizeof(record),
                  reinterpret_cast<const char*>(&record), sizeof(record));
    Tree.Scratch().Write("mem", image);
    EXPECT_EQ(Check(), PREREQ_OK);
    EXPECT_TRUE(ValidVPD);
    EXPECT_TRUE(UsingPciFile);
}

TEST_F(PreReq, OnceAndEveryCheckFacts) {
    EXPECT_EQ(Check(), PREREQ_OK);
    EXPECT_EQ(Driver.Count(VELH_IOCTL_TABLE), 1u);

    // The table is asked for once per library lifetime.
    Driver.SetTable(0);
    EXPECT_EQ(Check(), PREREQ_OK);
    EXPECT_EQ(Driver.Count(VELH_IOCTL_TABLE), 1u);

    // The OS is identified once; the driver facts are gathered anew.
    Release = "2.4.18";
    SetRelease("SuSE-release", "RedHat x\n");
    FakeModules().Modules[0].Flags = 0;
    EXPECT_EQ(Check(), PREREQ_NO_DRIVER);
    EXPECT_STREQ(Distributor, "SuSE");
    FakeModules().Modules[0].Flags = MOD_RUNNING;
    EXPECT_EQ(Check(), PREREQ_OK);
}

TEST_F(PreReq, SetupRecordsTheOutcome) {
    FakeModules().Modules.clear();
    SetupVelhSlot();
    EXPECT_EQ(AgentStatistics.PreReqError, PREREQ_NO_DRIVER);
    EXPECT_FALSE(CheckPreRequisites(nullptr));
}
