#include "hw/hwinfo.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

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
        SysPaths().ProcBusPci = Tree.Scratch().Path("no-pci");
        Driver.Install();
        Tree.Scratch().Write("inst/dbgprint", "hwdbgprint 0x10\n");
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
    EXPECT_EQ(log.find("getting table from file"), std::string::npos);
    const std::string line = "velhlib, GetHwInfo():  PCI architecture information is unavailable\n";
    EXPECT_NE(log.find(line), std::string::npos);
    EXPECT_EQ(log.find(line), log.rfind(line));
}

TEST_F(HwInfoTest, ATableFromTheDriverIsStoredAndEachAcquisitionStartsAfresh) {
    InstallDriver(AslBuilder()
                      .Header()
                      .Chassis(0, 1)
                      .String(1, "Main")
                      .Bus({.BusID = 1, .BusNumber = 3})
                      .Bus({.BusID = 2, .BusNumber = 4, .Speed = 7})
                      .Slot({.SlotID = 5, .BusID = 1, .DeviceNum = 2, .Sun = 1})
                      .End());
    // One function in the slot; one whose configuration cannot be read takes no identifier.
    SysPaths().ProcBusPci = Tree.Scratch().Path("pci");
    for (const char* folder : {"pci", "pci/03"}) {
        ASSERT_EQ(mkdir(Tree.Scratch().Path(folder).c_str(), 0700), 0);
    }
    Tree.Scratch().Write("pci/03/01.0", "short");
    Tree.Scratch().Write("pci/03/02.0", std::string(64, '\0'));
    // Declared: a new description of slot 5's adapter, and twice an adapter for slot 9, which
    // no slot has. Each list destroys its own descriptors, acquisition after acquisition.
    const std::string record = " 0 33 8 32 0 0 0 0123456789abcdef01 drv ";
    Tree.Scratch().Write("inst/velhadp.crd",
                         "[A] 5" + record + "[B] 9" + record + "[C] 9" + record);

    for (int round = 0; round < 20; ++round) {
        SCOPED_TRACE(round);
        AdapterIndex = 9;
        EXPECT_TRUE(GetHwInfo());
        EXPECT_EQ(Length(SystemList), 1u);
        EXPECT_EQ(Length(BusList), 2u);
        EXPECT_EQ(Length(SlotList), 1u);
        EXPECT_EQ(AdapterIndex, 2u);
        ASSERT_EQ(Length(AdapterList), 2u);
        AdapterList.BeginEnumeration();
        EXPECT_EQ(AdapterList.Next()->Name, L"B");
        const AdapterDescriptor* adapter = AdapterList.Next();
        EXPECT_EQ(adapter->AdapterID, 0u);
        EXPECT_EQ(adapter->BusID, 1u);
        EXPECT_EQ(adapter->SlotID, 5u);
        EXPECT_EQ(adapter->Name, L"A");
        EXPECT_EQ(AcquireTrace(Tree.Log()),
                  (std::vector<std::string>{
                      "getting table from file", "getting ASL table", "using PCI architecture ASL",
                      "storing PCI architecture table", "getting adapter info",
                      "getting adapter info file", "xrefing adapter file", "merging adapter file()",
                      "hardware info acquired"}));
    }
    // The driver's speed stands.
    BusList.BeginEnumeration();
    const BusDescriptor* bus = BusList.Next();
    EXPECT_EQ(bus->BusNum, 4u);
    EXPECT_EQ(bus->CurBusSpeed, 133u);
}

TEST_F(HwInfoTest, ThePciArchitectureFileTakesPrecedenceOverTheDriver) {
    InstallDriver(AslBuilder().Header().Bus({.BusID = 1}).Bus({.BusID = 2}).End());
    std::memcpy(Vpd.MachineTypeModel, "4321XYZ", sizeof(Vpd.MachineTypeModel));
    ValidVPD = true;
    Tree.Scratch().Write("inst/4321.pci",
                         "[table header]\nVHSL 1 0 M\n[bus]\n7 0 255 0 0 0 7 1 0 0 0 0\n");

    EXPECT_TRUE(GetHwInfo());

    ASSERT_EQ(Length(BusList), 1u);
    BusList.BeginEnumeration();
    const BusDescriptor* bus = BusList.Next();
    EXPECT_EQ(bus->BusID, 7u);
    // Without adapters the bus steps down from 133 MHz to the first step with a load limit.
    EXPECT_EQ(bus->CurBusSpeed, 33u);
    EXPECT_EQ(AcquireTrace(Tree.Log()),
              (std::vector<std::string>{"getting table from file", "using PCI architecture file",
                                        "storing PCI architecture table", "getting adapter info",
                                        "getting adapter info file", "hardware info acquired",
                                        "deriving bus speeds"}));
}

}  // namespace
