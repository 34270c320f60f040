#include "hw/hwinfo.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <string>
#include <vector>

#include "adapters/linvpd.h"
#include "aslbuilder.h"
#include "diag/hwdebug.h"
#include "fake_driver.h"
#include "model/hwobjects.h"
#include "scratchdir.h"
#include "setup/linsetup.h"
#include "util/sysaccess.h"

namespace {

class HwInfoTest : public ::testing::Test {
  protected:
    void SetUp() override {
        SavedValid = ValidVPD;
        ResetPreReqState();
        ValidVPD = false;
        SysPaths().DevMem = Tree.Scratch().Path("no-mem");
        SysPaths().Etc = Tree.Scratch().Path("no-etc");
        SysPaths().SlotDriver = Tree.Scratch().Path("no-driver");
        SysPaths().ProcBusPci = Tree.Scratch().Path("no-pci");
        Driver.Install();
        // The acquisition's trace and the dumps of systems, busses, slots and adapters.
        Tree.Scratch().Write("inst/dbgprint", "hwdbgprint 0x3E0010\n");
    }
    void TearDown() override {
        SystemList.DestroyAll();
        BusList.DestroyAll();
        SlotList.DestroyAll();
        AdapterList.DestroyAll();
        FileAdapters.DestroyAll();
        ResetSystemAccess();
        ResetPreReqState();
        HwInfoPrintLevel = 0;
        ValidVPD = SavedValid;
    }

    InstallTree Tree;
    FakeDriver Driver;
    bool SavedValid = false;
};

TEST_F(HwInfoTest, ATableFromTheDriverIsStoredAndEachAcquisitionStartsAfresh) {
    SysPaths().SlotDriver = Tree.Scratch().Write("velhpdrv", "");
    Driver.Table = AslBuilder()
                       .Header()
                       .Chassis(0, 1)
                       .String(1, "Main")
                       .Bus({.BusID = 1, .BusNumber = 3})
                       .Bus({.BusID = 2, .BusNumber = 4, .Speed = 7})
                       .Slot({.SlotID = 5, .BusID = 1, .DeviceNum = 2, .Sun = 1})
                       .End()
                       .Bytes;
    // One function in the slot; one whose configuration cannot be read takes no identifier.
    SysPaths().ProcBusPci = Tree.Scratch().Path("pci");
    for (const char* folder : {"pci", "pci/03"}) {
        ASSERT_EQ(mkdir(Tree.Scratch().Path(folder).c_str(), 0700), 0);
    }
    Tree.Scratch().Write("pci/03/01.0", "short");
    Tree.Scratch().Write("pci/03/02.0", std::string(64, '\0'));
    Tree.Scratch().Write("pci/devices", "");
    // Declared: a new description of slot 5's adapter, and twice an adapter for slot 9, which
    // no slot has. Each list destroys its own descriptors, acquisition after acquisition.
    const std::string record = " 0 33 8 32 0 0 0 0123456789abcdef01 drv ";
    Tree.Scratch().Write("inst/velhadp.crd",
                         "[A] 5" + record + "[B] 9" + record + "[C] 9" + record);

    for (int round = 0; round < 20; ++round) {
        SCOPED_TRACE(round);
        AdapterIndex = 9;
        EXPECT_TRUE(GetHwInfo());
        EXPECT_EQ(AdapterIndex, 2u);
        std::string log = Tree.Log();
        for (size_t at; (at = log.find(Tree.Scratch().Path())) != std::string::npos;) {
            log.replace(at, Tree.Scratch().Path().size(), "SCRATCH");
        }
        EXPECT_EQ(log, TestData("hwinfo.log"));
    }
}

}  // namespace
