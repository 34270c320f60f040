// The allocation sweep: one whole acquisition with the eight inventories built, its N-th checked
// allocation failing, for every N it reaches, on a run folder that the simulator prepared from
// a sample machine (tests/faults/allocations passes it in VELH_SWEEP_RUN).
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <set>
#include <sstream>

#include "adapters/linvpd.h"
#include "agent/inventory.h"
#include "fake_driver.h"
#include "fake_jni.h"
#include "fake_modules.h"
#include "hw/hwinfo.h"
#include "model/hwobjects.h"
#include "runtime/heap.h"
#include "scratchdir.h"
#include "setup/linsetup.h"

namespace {

std::string Release;

int MachineUname(struct utsname* name) {
    *name = {};
    Release.copy(name->release, sizeof(name->release) - 1);
    return 0;
}

// The machine's paths, driver, modules and kernel release behind the seams.
void UseMachine(const std::string& run, FakeDriver& driver) {
    SystemPaths& paths = SysPaths();
    paths = {run + "/proc/bus/pci",
             run + "/etc",
             run + "/etc/sysconfig/kernel",
             run + "/usr/share/pci.ids",
             run + "/usr/share/misc/pci.ids",
             run + "/none",
             run + "/dev/mem",
             run + "/driver/asl.bin"};
    const std::string table = ReadAll(run + "/driver/asl.bin");
    driver.Table.assign(table.begin(), table.end());
    driver.Install();
    InstallFakeModules();
    for (const auto& entry : std::filesystem::directory_iterator(run + "/modules")) {
        FakeModule module{entry.path().filename(), 1, {}, {}};
        std::ifstream(entry.path() / "flags") >> module.Flags;
        std::istringstream symbols(ReadAll(entry.path() / "symbols"));
        for (std::string line; std::getline(symbols, line);) {
            module.Symbols.emplace_back(0, line.substr(line.find(' ') + 1));
        }
        FakeModules().Modules.push_back(module);
    }
    std::getline(std::istringstream(ReadAll(run + "/uname")), Release);
    SysCalls().Uname = MachineUname;
}

std::string Render(jobjectArray array) {
    std::string text = array == nullptr ? "null" : "";
    for (FakeObject* element :
         array ? FakeJni::Object(array)->elements : std::vector<FakeObject*>{}) {
        for (jlong value : element->longs) {
            text += std::to_string(value) + ",";
        }
        text += std::string(element->text.begin(), element->text.end()) + ";";
    }
    return text + "\n";
}

// Every adapter's slot and bus exist (or are none) and the identifiers are unique.
template <typename T>
std::set<uint32_t> Ids(ObjListTemp<T>& list, uint32_t T::*field, bool* unique) {
    std::set<uint32_t> ids{NONE_VALUE};
    list.BeginEnumeration();
    while (T* object = list.Next()) {
        *unique = ids.insert(object->*field).second && *unique;
    }
    return ids;
}

bool Consistent() {
    bool unique = true;
    Ids(SystemList, &SystemDescriptor::SystemID, &unique);
    auto busses = Ids(BusList, &BusDescriptor::BusID, &unique);
    const auto slots = Ids(SlotList, &SlotDescriptor::SlotID, &unique);
    // A slot whose bus could not be stored keeps naming it, with an error line, and so do the
    // adapters declared in it.
    SlotList.BeginEnumeration();
    while (SlotDescriptor* slot = SlotList.Next()) {
        busses.insert(slot->BusID);
    }
    Ids(AdapterList, &AdapterDescriptor::AdapterID, &unique);
    AdapterList.BeginEnumeration();
    while (AdapterDescriptor* adapter = AdapterList.Next()) {
        unique = unique && busses.count(adapter->BusID) != 0 &&
                 (adapter->Device == NONE_VALUE || slots.count(adapter->SlotID) != 0);
    }
    return unique;
}

// One acquisition and the eight inventories with allocation failAt failing (0: none).
std::string Acquire(uint32_t failAt, uint32_t* acquired) {
    HeapFaults() = {0, failAt};
    GetHwInfo();
    *acquired = HeapFaults().Count;
    CountInventories();
    FakeJni jni;
    std::string text;
    for (auto* build : {BusNumInv, SlotNumInv, SystemNumInv, AdapterNumInv, SystemNameInv,
                        AdapterNameInv, AdapterPciIdInv, AdapterDriverInv}) {
        text += Render(build(jni.Env()));
    }
    EXPECT_TRUE(Consistent()) << "allocation " << failAt;
    return text;
}

// The same as the first acquisition of a library lifetime.
std::string Fresh(uint32_t failAt, uint32_t* acquired) {
    ResetPreReqState();
    ValidVPD = false;
    return Acquire(failAt, acquired);
}

TEST(AllocationSweep, EachAllocationOfAnAcquisitionFailsInTurn) {
    const char* run = std::getenv("VELH_SWEEP_RUN");
    if (run == nullptr) {
        GTEST_SKIP() << "tests/faults/allocations runs it on the samples";
    }
    const uint32_t stride = std::stoul(std::getenv("VELH_SWEEP_STRIDE") ?: "1");
    FakeDriver driver;
    UseMachine(run, driver);
    WorkingDir cwd(std::string(run) + "/install");
    uint32_t count = 0;
    const std::string clean = Fresh(UINT32_MAX, &count);
    count = HeapFaults().Count;
    for (uint32_t n = 1; n <= count; n += stride) {
        uint32_t acquired = 0;
        Fresh(n, &acquired);
        EXPECT_GE(HeapFaults().Count, n) << "allocation " << n << " not reached";
        if (n <= acquired) {
            EXPECT_NE(ReadAll("../log/velhslot.slotmgr.hwinfo.log").find("\nVELHLIB, "),
                      std::string::npos)
                << "no error line for allocation " << n;
        }
        EXPECT_EQ(Acquire(0, &acquired), clean) << "after allocation " << n;
    }
    std::printf("%u allocations, every %u-th failed\n", count, stride);
    HeapFaults() = {0, 0};
    SystemList.DestroyAll();
    BusList.DestroyAll();
    SlotList.DestroyAll();
    AdapterList.DestroyAll();
    FileAdapters.DestroyAll();
    ResetSystemAccess();
}

}  // namespace
