#include "cardfile/cardfile.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "cardfile/spclcase.h"
#include "diag/hwdebug.h"
#include "scratchdir.h"
#include "setup/linsetup.h"

namespace {

const std::string ID = "0123456789abcdef01";

std::string Narrow(const std::wstring& text) {
    return std::string(text.begin(), text.end());
}

std::string Slurp(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

std::string Record(const std::string& name, const std::string& slot) {
    return "[" + name + "] " + slot + " 0 66 15 64 0 0 t " + ID + " drv.o ";
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
    // Reads the text as the card file with a fresh log; a line per adapter, in file order.
    std::string Read(const std::string& text) {
        Tree.Scratch().Write("inst/velhadp.crd", text);
        ResetDebugOut();
        const int count = GetAdapterFile();
        std::string described;
        FileAdapters.BeginEnumeration();
        while (AdapterDescriptor* a = FileAdapters.Next()) {
            std::string line = Narrow(a->Name);
            for (uint32_t value : {a->SlotID, a->Function, a->MaxSpeed, a->PowerReq, a->Width,
                                   uint32_t(a->HasBridge), uint32_t(a->IsBootDev),
                                   uint32_t(a->SupPciX), uint32_t(a->OnBoard)}) {
                line += "|" + std::to_string(value);
            }
            described = line + "|" + Narrow(a->PciId) + "|" + Narrow(a->Driver) + "\n" + described;
        }
        EXPECT_EQ(count, std::count(described.begin(), described.end(), '\n'));
        return described;
    }
    InstallTree Tree;
};

TEST_F(CardFileTest, EveryReadGivesTheFilesAdaptersAndErrorBlocks) {
    const std::string data = CARDFILE_TEST_DATA "/fields.";
    for (int read = 0; read < 2; ++read) {
        EXPECT_EQ(Read(Slurp(data + "crd")), Slurp(data + "adapters"));
        EXPECT_EQ(Tree.Log(), Slurp(data + "log"));
    }
}

// Slots 5 and 7 on bus 3; discovered: ID 2 in slot 5 (with a module and a configuration image)
// and ID 1 in no slot. Declared: slot 5, slot 7 twice, an unknown slot and "no slot".
TEST_F(CardFileTest, DeclaredAdaptersReplaceOrJoinAndEachListDestroysItsOwnOver50Reads) {
    const std::string file = Record("Five", "5") + Record("Seven", "7") + Record("Nowhere", "99") +
                             Record("NoSlot", "0xffffffff") + Record("Again", "7");
    const std::string missing = "\n    Error:  File:  \"velhadp.crd\"\n            Slot with ID ";
    for (int round = 0; round < 50; ++round) {
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
        const std::string declared = Read(file);
        ASSERT_EQ(std::count(declared.begin(), declared.end(), '\n'), 5);
        XRefAdapterFile();
        MergeAdapterFile();

        std::vector<std::string> merged;
        AdapterList.BeginEnumeration();
        while (AdapterDescriptor* a = AdapterList.Next()) {
            merged.push_back(
                Narrow(a->Name) + ":" + std::to_string(a->AdapterID) + ":" +
                std::to_string(int32_t(a->SlotID)) + ":" + std::to_string(int32_t(a->FriendlyNum)) +
                ":" + std::to_string(int32_t(a->BusID)) + ":" + std::to_string(int32_t(a->Bus)) +
                ":" + std::to_string(int32_t(a->Device)));
            EXPECT_FALSE(a->OnBoard || a->ModuleName != nullptr || a->ConfigSpace[0] != 0);
            EXPECT_EQ(Narrow(a->Driver), "drv.o");
        }
        EXPECT_EQ(merged,
                  (std::vector<std::string>{"Nowhere:4:99:-1:-1:-1:-1", "Seven:3:7:17:1:3:8",
                                            "Five:2:5:15:1:3:6", "NoSlot:1:-1:-1:-1:-1:-1"}));
        EXPECT_EQ(AdapterIndex, 5u);
        EXPECT_EQ(Tree.Log(), missing + "-1 not found\n\n" + missing + "99 not found\n\n");
    }
}

TEST_F(CardFileTest, SlesEightLosesHotPlugAndOneGraphicsControllerIsABootDevice) {
    struct Case {
        const char* distributor;
        const char* version;
        bool hotPlug;
    } cases[] = {{"SuSE", "SLES-8", false},
                 {"SuSE", "SLES-9", true},
                 {"SUSE", "SLES-8", true},
                 {nullptr, nullptr, true}};
    for (const Case& c : cases) {
        SlotList.DestroyAll();
        auto* slot = new SlotDescriptor{};
        slot->SupHotPlug = true;
        SlotList.Add(slot);
        Distributor = c.distributor;
        DistVersion = c.version;
        SpecialCaseSystems();
        SpecialCaseBusses();
        SpecialCaseSlots();
        EXPECT_EQ(slot->SupHotPlug, c.hotPlug) << c.version;
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
