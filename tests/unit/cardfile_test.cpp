#include "cardfile/cardfile.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <string>

#include "cardfile/spclcase.h"
#include "diag/hwdebug.h"
#include "scratchdir.h"
#include "setup/linsetup.h"

namespace {

// A line per adapter, in list order; -1 for none.
std::string Describe(ObjListTemp<AdapterDescriptor>& list) {
    std::wstring described;
    list.BeginEnumeration();
    while (AdapterDescriptor* a = list.Next()) {
        described += a->Name;
        for (uint32_t value :
             {a->AdapterID, a->SlotID, a->FriendlyNum, a->BusID, a->Bus, a->Device, a->Function,
              a->MaxSpeed, a->PowerReq, a->Width, uint32_t(a->HasBridge), uint32_t(a->IsBootDev),
              uint32_t(a->SupPciX), uint32_t(a->OnBoard), uint32_t(a->ModuleName != nullptr),
              uint32_t(a->ConfigSpace[0])}) {
            described += L"|" + std::to_wstring(int32_t(value));
        }
        described += L"|" + a->PciId + L"|" + a->Driver + L"\n";
    }
    return std::string(described.begin(), described.end());
}

class CardFileTest : public ::testing::Test {
  protected:
    void TearDown() override {
        FileAdapters.DestroyAll();
        AdapterList.DestroyAll();
        SlotList.DestroyAll();
        CardDesc.reset();
        ResetPreReqState();
    }
    // Reads the data file NAME.crd as the card file, with a fresh log; then compares the list
    // and the log with NAME.adapters and NAME.log.
    int Read(const std::string& name) {
        Tree.Scratch().Write("inst/velhadp.crd", TestData("cardfile/" + name + ".crd"));
        ResetDebugOut();
        return GetAdapterFile();
    }
    void ExpectData(const std::string& name, ObjListTemp<AdapterDescriptor>& list) {
        EXPECT_EQ(Describe(list), TestData("cardfile/" + name + ".adapters"));
        EXPECT_EQ(Tree.Log(), TestData("cardfile/" + name + ".log"));
    }
    InstallTree Tree;
};

// Declared adapters replace or join the found ones; each list destroys its own descriptors.
TEST_F(CardFileTest, EveryReadGivesTheFilesAdaptersAndDeclaredOnesReplaceOrJoinOver50Reads) {
    for (int round = 0; round < 50; ++round) {
        EXPECT_EQ(Read("fields"), 12);
        ExpectData("fields", FileAdapters);
        AdapterList.DestroyAll();
        SlotList.DestroyAll();
        for (uint32_t id : {5u, 7u}) {
            SlotList.Add(new SlotDescriptor{id, 1, 3, 0, 0, id + 1, id + 10});
        }
        for (uint32_t slot : {NONE_VALUE, 5u}) {
            auto* found = new AdapterDescriptor;
            found->AdapterID = slot == 5 ? 2 : 1;
            found->SlotID = slot;
            found->ModuleName = DupHeapCString("mod");
            found->ConfigSpace[0] = 0x86;
            AdapterList.Add(found);
        }
        AdapterIndex = 3;
        ASSERT_EQ(Read("merge"), 5);
        XRefAdapterFile();
        MergeAdapterFile();
        ExpectData("merge", AdapterList);
        EXPECT_EQ(AdapterIndex, 5u);
        std::filesystem::remove(Tree.InstFile("velhadp.crd"));
        EXPECT_EQ(GetAdapterFile(), 0);
        EXPECT_EQ(Describe(FileAdapters), "");
    }
}

TEST_F(CardFileTest, SlesEightLosesHotPlugAndOneGraphicsControllerIsABootDevice) {
    const char* const systems[][2] = {
        {"SuSE", "SLES-8"}, {"SuSE", "SLES-9"}, {"SUSE", "SLES-8"}, {nullptr, nullptr}};
    for (const auto& system : systems) {
        auto* slot = new SlotDescriptor{.SupHotPlug = true};
        SlotList.Add(slot);
        Distributor = system[0];
        DistVersion = system[1];
        SpecialCaseSlots();
        EXPECT_EQ(slot->SupHotPlug, &system != &systems[0]) << system[1];
    }
    for (uint8_t subsystemLow : {0xC1, 0xC2}) {
        auto* adapter = new AdapterDescriptor;
        const uint8_t ids[] = {0x02, 0x10, 0x59, 0x51, 0x52, 0x7E, subsystemLow, 0x03};
        std::copy(ids, ids + 4, adapter->ConfigSpace);
        std::copy(ids + 4, ids + 8, adapter->ConfigSpace + 44);
        AdapterList.Add(adapter);
        SpecialCaseAdapters();
        EXPECT_EQ(adapter->IsBootDev, subsystemLow == 0xC1);
    }
}

}  // namespace
