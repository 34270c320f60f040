#include "hw/hwinfo.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "adapters/linvpd.h"
#include "aslbuilder.h"
#include "diag/hwdebug.h"
#include "fake_driver.h"
#include "hwobjects.h"
#include "scratchdir.h"
#include "setup/linsetup.h"
#include "util/sysaccess.h"

namespace {

size_t Count(const std::string& text, const std::string& part) {
    size_t count = 0;
    for (size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) {
        ++count;
    }
    return count;
}

// The trace lines of the sequence, in the order they appear in the log.
std::vector<std::string> AcquireTrace(const std::string& log) {
    std::vector<std::string> lines;
    const std::string head = "GetHwInfo():  ";
    for (size_t at = log.find(head); at != std::string::npos; at = log.find(head, at + 1)) {
        size_t end = log.find('\n', at);
        lines.push_back(log.substr(at + head.size(), end - at - head.size()));
    }
    return lines;
}

template <typename T>
size_t Length(ObjListTemp<T>& list) {
    size_t length = 0;
    list.BeginEnumeration();
    while (list.Next() != nullptr) {
        ++length;
    }
    return length;
}

class HwInfoTest : public ::testing::Test {
  protected:
    void SetUp() override {
        SavedVpd = Vpd;
        SavedValid = ValidVPD;
        ResetPreReqState();
        ValidVPD = false;
        SysPaths().DevMem = Tree.Scratch().Path("no-mem");
        SysPaths().Etc = Tree.Scratch().Path("no-etc");
        SysPaths().SlotDriver = Tree.Scratch().Path("no-driver");
        Driver.Install();
        Tree.Scratch().Write("inst/dbgprint", "hwdbgprint 0x10\n");
    }
    void TearDown() override {
        SystemList.DestroyAll();
        BusList.DestroyAll();
        SlotList.DestroyAll();
        AdapterList.DestroyAll();
        ResetSystemAccess();
        ResetPreReqState();
        HwInfoPrintLevel = 0;
        Vpd = SavedVpd;
        ValidVPD = SavedValid;
    }

    void InstallDriver(const AslBuilder& table) {
        SysPaths().SlotDriver = Tree.Scratch().Write("velhpdrv", "");
        Driver.Table = table.Bytes;
    }

    InstallTree Tree;
    FakeDriver Driver;
    _VPD_LAYOUT SavedVpd{};
    bool SavedValid = false;
};

TEST_F(HwInfoTest, WithoutAnyTableEveryListEndsEmptyAndTheLogSaysSo) {
    SystemList.Add(new SystemDescriptor);
    BusList.Add(new BusDescriptor{});
    SlotList.Add(new SlotDescriptor{});
    AdapterList.Add(new AdapterDescriptor);
    AdapterIndex = 7;
    Tree.Scratch().Write("log/velhslot.slotmgr.hwinfo.log", "earlier acquisition\n");

    EXPECT_FALSE(GetHwInfo());

    EXPECT_EQ(Length(SystemList) + Length(BusList) + Length(SlotList) + Length(AdapterList), 0u);
    EXPECT_EQ(AdapterIndex, 0u);
    const std::string log = Tree.Log();
    EXPECT_EQ(log.find("earlier acquisition"), std::string::npos);
    EXPECT_EQ(AcquireTrace(log),
              (std::vector<std::string>{"getting table from file", "getting ASL table",
                                        "PCI architecture information is unavailable"}));
    const std::string unavailable =
        "velhlib, GetHwInfo():  PCI architecture information is unavailable\n";
    ASSERT_GE(log.size(), unavailable.size());
    EXPECT_EQ(log.substr(log.size() - unavailable.size()), unavailable);
}

TEST_F(HwInfoTest, TheUnavailabilityLineIsWrittenAtLevelZero) {
    Tree.Scratch().Write("inst/dbgprint", "");
    EXPECT_FALSE(GetHwInfo());
    const std::string log = Tree.Log();
    EXPECT_EQ(Count(log, "getting table from file"), 0u);
    EXPECT_EQ(Count(log, "velhlib, GetHwInfo():  PCI architecture information is unavailable\n"),
              1u);
}

TEST_F(HwInfoTest, ATableFromTheDriverIsStoredAndEachAcquisitionStartsAfresh) {
    InstallDriver(AslBuilder()
                      .Header()
                      .Chassis(0, 1)
                      .String(1, "Main")
                      .Bus({.BusID = 1, .BusNumber = 3})
                      .Bus({.BusID = 2, .BusNumber = 4})
                      .Slot({.SlotID = 5, .BusID = 1, .DeviceNum = 2})
                      .End());

    for (int round = 0; round < 2; ++round) {
        SCOPED_TRACE(round);
        AdapterIndex = 9;
        EXPECT_TRUE(GetHwInfo());
        EXPECT_EQ(Length(SystemList), 1u);
        EXPECT_EQ(Length(BusList), 2u);
        EXPECT_EQ(Length(SlotList), 1u);
        EXPECT_EQ(AdapterIndex, 0u);
        EXPECT_EQ(AcquireTrace(Tree.Log()),
                  (std::vector<std::string>{
                      "getting table from file", "getting ASL table", "using PCI architecture ASL",
                      "storing PCI architecture table", "hardware info acquired"}));
    }
    BusList.BeginEnumeration();
    EXPECT_EQ(BusList.Next()->BusNum, 4u);
}

TEST_F(HwInfoTest, ThePciArchitectureFileTakesPrecedenceOverTheDriver) {
    InstallDriver(AslBuilder().Header().Bus({.BusID = 1}).Bus({.BusID = 2}).End());
    std::memcpy(Vpd.MachineTypeModel, "4321XYZ", sizeof(Vpd.MachineTypeModel));
    ValidVPD = true;
    Tree.Scratch().Write("inst/4321.pci", "[table header]\nVHSL 1 0 M\n[bus]\n7\n");

    EXPECT_TRUE(GetHwInfo());

    ASSERT_EQ(Length(BusList), 1u);
    BusList.BeginEnumeration();
    EXPECT_EQ(BusList.Next()->BusID, 7u);
    EXPECT_EQ(
        AcquireTrace(Tree.Log()),
        (std::vector<std::string>{"getting table from file", "using PCI architecture file",
                                  "storing PCI architecture table", "hardware info acquired"}));
}

}  // namespace
