#include "cardfile/cardfile.h"

#include <gtest/gtest.h>

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

std::string Record(const std::string& name, const std::string& slot) {
    return "[" + name + "] " + slot + " 0 66 15 64 0 0 t " + ID + " drv.o ";
}

std::string Block(int line, const std::string& invalid, const std::string& rule) {
    return "\n  Error: velhadp.crd, line " + std::to_string(line) + "\n         " + invalid +
           "\n         " + rule + "\n\n";
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
    // Reads the text as the card file with a fresh log; FileAdapters' names in list order.
    std::vector<std::string> Read(const std::string& text) {
        Tree.Scratch().Write("inst/velhadp.crd", text);
        ResetDebugOut();
        const int count = GetAdapterFile();
        std::vector<std::string> names;
        FileAdapters.BeginEnumeration();
        while (AdapterDescriptor* adapter = FileAdapters.Next()) {
            names.push_back(Narrow(adapter->Name));
        }
        EXPECT_EQ(count, static_cast<int>(names.size()));
        return names;
    }
    InstallTree Tree;
};

TEST_F(CardFileTest, RecordsRunAcrossLinesAndRestartAtNames) {
    const std::string lastWithoutLineEnd = "[C] 3 0\n66 15 64 0 0 0 " + ID + "\n\"c drv\"";
    struct Case {
        std::string text;
        std::vector<std::string> names;
        std::string log;
    } cases[] = {
        {Record("A", "1") + Record("B", "2") + "\n" + lastWithoutLineEnd, {"C", "B", "A"}, ""},
        {"5 6 " + Record("A", "1"),
         {"A"},
         Block(1, "Invalid adapter name (5)", "Name must begin with '[' and end with ']'")},
        {"[A] 1 0 " + Record("B", "2"), {"B"}, ""},
        {"// one\n[] 1 0 66\n" + Record("B", "2"),
         {"B"},
         "\n  Error: velhadp.crd, line 2\n         Adapter name is blank, discarded adapter\n\n"},
        {Record("A", "1") + "\n[B] 2 0 66 15 64 0 0 0 " + ID + "\n", {"A"}, ""},
    };
    for (const Case& c : cases) {
        // A second read starts afresh: same adapters, same line numbers.
        for (int read = 0; read < 2; ++read) {
            EXPECT_EQ(Read(c.text), c.names) << c.text;
            EXPECT_EQ(Tree.Log(), c.log) << c.text;
        }
    }
}

TEST_F(CardFileTest, EachFieldStoresWhatItAcceptsAndReportsTheRestOnItsLine) {
    const std::string base[CARD_RECORD_FIELDS] = {"[Card]", "5", "1", "66", "15",   "64",
                                                  "0",      "0", "t", ID,   "drv.o"};
    const char* const invalid[] = {"adapter name", "Slot ID",           "Function Number",
                                   "Bus speed",    "Power Requirement", "bus width",
                                   "bridge value", "boot device value", "PCI-X support value",
                                   "PCI ID"};
    const std::string values =
        "'0', '1', 'T', 'F', \"True\" or \"False\"\n         Non-numeric values are case "
        "insensitive";
    const std::string rules[] = {"Name must begin with '[' and end with ']'",
                                 "Slot ID must be a number",
                                 "Function Number must be a number between 0 and 7",
                                 "Bus speed must be 33, 66, 100 or 133\n         Pre-pend or "
                                 "append 'x' to denote PCI-X",
                                 "Power Requirement must be 8, 15 or 25",
                                 "Bus width must be 32 or 64",
                                 "Bridge value must one of: " + values,
                                 "Boot Device value must one of: " + values,
                                 "PCI-X support value must one of: " + values,
                                 "PCI ID must be 18 characters long"};
    struct Case {
        int field;
        std::string token;
        const char* stored;  // null: rejected
    } cases[] = {
        {0, "[[ My Card ]]", "My Card"},
        {0, "[ ]", ""},
        {0, "Card", nullptr},
        {1, "0x1F", "31"},
        {1, "12a", nullptr},
        {2, "0", "0"},
        {2, "7", "7"},
        {2, "8", nullptr},
        {2, "07", nullptr},
        {2, "-1", nullptr},
        {3, "x133", "133"},
        {3, "133x", "133"},
        {3, "X66", "66"},
        {3, "x66x", "66"},
        {3, "x", nullptr},
        {3, "120", nullptr},
        {3, "33.0", nullptr},
        {4, "8", "8"},
        {4, "10", nullptr},
        {5, "32", "32"},
        {5, "16", nullptr},
        {6, "T", "1"},
        {6, "yes", nullptr},
        {7, "true", "1"},
        {7, "1", "1"},
        {7, "no", nullptr},
        {8, "FALSE", "0"},
        {8, "0", "0"},
        {8, "2", nullptr},
        {9, "0123456789ABCDEF01", "0123456789ABCDEF01"},
        {9, ID.substr(1), nullptr},
        {9, ID + "2", nullptr},
        {10, "\"my  driver\"", "my  driver"},
    };
    for (const Case& c : cases) {
        // One token a line under a comment: field f sits on line f + 2.
        std::string text = "// card\n";
        for (int field = 0; field < CARD_RECORD_FIELDS; ++field) {
            text += (field == c.field ? c.token : base[field]) + "\n";
        }
        const std::vector<std::string> names = Read(text);
        ASSERT_EQ(names.size(), c.stored != nullptr ? 1u : 0u) << c.token;
        if (c.stored == nullptr) {
            EXPECT_EQ(Tree.Log(),
                      Block(c.field + 2,
                            "Invalid " + std::string(invalid[c.field]) + " (" + c.token + ")",
                            rules[c.field]));
            continue;
        }
        FileAdapters.BeginEnumeration();
        const AdapterDescriptor& a = *FileAdapters.Next();
        const uint32_t numbers[] = {0,       a.SlotID,    a.Function,  a.MaxSpeed, a.PowerReq,
                                    a.Width, a.HasBridge, a.IsBootDev, a.SupPciX};
        const std::string stored = c.field == 0    ? Narrow(a.Name)
                                   : c.field == 9  ? Narrow(a.PciId)
                                   : c.field == 10 ? Narrow(a.Driver)
                                                   : std::to_string(numbers[c.field]);
        EXPECT_EQ(stored, c.stored) << c.token;
        EXPECT_FALSE(a.OnBoard);
        EXPECT_EQ(Tree.Log(), "");
    }
}

}  // namespace
