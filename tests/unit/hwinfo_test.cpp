#include "hw/hwinfo.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <string>
#include <tuple>
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
    // Declared: a new description of slot 5's adapter, and twice an adapter for slot 9, which
    // no slot has. Each list destroys its own descriptors, acquisition after acquisition.
    const std::string record = " 0 33 8 32 0 0 0 0123456789abcdef01 drv ";
    Tree.Scratch().Write("inst/velhadp.crd",
                         "[A] 5" + record + "[B] 9" + record + "[C] 9" + record);

    for (int round = 0; round < 20; ++round) {
        SCOPED_TRACE(round);
        AdapterIndex = 9;
        EXPECT_TRUE(GetHwInfo());
        ASSERT_EQ(std::vector({Length(SystemList), Length(BusList), Length(SlotList),
                               Length(AdapterList), size_t{AdapterIndex}}),
                  std::vector<size_t>({1, 2, 1, 2, 2}));
        AdapterList.BeginEnumeration();
        EXPECT_EQ(AdapterList.Next()->Name, L"B");
        const AdapterDescriptor* a = AdapterList.Next();
        EXPECT_EQ(std::tie(a->AdapterID, a->BusID, a->SlotID, a->Name),
                  std::make_tuple(0u, 1u, 5u, std::wstring(L"A")));
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
    EXPECT_EQ(std::tie(bus->BusNum, bus->CurBusSpeed), std::make_tuple(4u, 133u));
}

}  // namespace
