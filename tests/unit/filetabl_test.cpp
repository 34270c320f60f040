#include "sources/filetabl.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "adapters/linvpd.h"
#include "scratchdir.h"

namespace {

using Bytes = std::vector<uint8_t>;

struct Table {
    uint32_t Count;
    uint32_t End;  // bytes the packet occupies
    std::unique_ptr<_ASL_PACKET> Packet;

    const uint8_t* Data() const { return reinterpret_cast<const uint8_t*>(Packet.get()); }
    Bytes Range(size_t from, size_t length) const {
        return Bytes(Data() + from, Data() + from + length);
    }
    Bytes Descriptors() const { return Range(16, End - 16); }
};

// Reads text as a PCI architecture file into a buffer that held garbage before.
Table Read(const std::string& text, uint32_t size = ASL_PACKET_CAPACITY) {
    Table table{0, 0, std::make_unique<_ASL_PACKET>()};
    std::memset(table.Packet.get(), 0xEE, sizeof(_ASL_PACKET));
    std::memcpy(table.Packet.get(), "VHSL", 4);
    FILE* stream = std::tmpfile();
    EXPECT_NE(stream, nullptr);
    std::fputs(text.c_str(), stream);
    std::rewind(stream);
    table.Count = ReadFileTable(stream, table.Packet.get(), size, &table.End);
    std::fclose(stream);
    return table;
}

Bytes Bus(std::initializer_list<uint8_t> fields) {
    Bytes bytes(16, 0);
    bytes[0] = BUS_TYPE;
    bytes[1] = 16;
    std::copy(fields.begin(), fields.end(), bytes.begin() + 2);
    return bytes;
}

Bytes Cat(std::initializer_list<Bytes> parts) {
    Bytes all;
    for (const Bytes& part : parts) {
        all.insert(all.end(), part.begin(), part.end());
    }
    return all;
}

const Bytes END{0xA0};

class FileTableTest : public ::testing::Test {
  protected:
    void TearDown() override {
        ValidVPD = false;
        std::memset(&Vpd, 0, sizeof(Vpd));
    }
    InstallTree Tree;  // the reader's messages land in its log
};

TEST_F(FileTableTest, HeaderChassisAndStringGiveTheExpectedPacket) {
    Table table = Read(
        "// sample machine\n"
        "[table header]\n"
        "VHSL 1 0 MACH01\n"
        "\n"
        "[chassis]\n"
        "0 1\n"
        "[string]\n"
        "1 \"Twelve chars\"   // the chassis name\n");
    EXPECT_EQ(table.Count, 48u);
    EXPECT_EQ(table.End, 48u);
    const Bytes header{'V', 'H', 'S', 'L', 16, 1, 0, 'M', 'A', 'C', 'H', '0', '1', 0, 0, 0};
    const Bytes chassis{0x86, 16, 0, 0, 1, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0};
    Bytes string{0x91, 1};
    for (char c : std::string("Twelve chars")) {
        string.push_back(static_cast<uint8_t>(c));
    }
    string.push_back(0);
    EXPECT_EQ(table.Range(0, 48), Cat({header, chassis, string, END}));
    EXPECT_EQ(Tree.Log(), "");
}

TEST_F(FileTableTest, AFileWithoutLinesIsAnEndMarkerInACleanBuffer) {
    for (const char* text : {"", "// only\n   // comments\n\n"}) {
        Table table = Read(text);
        EXPECT_EQ(table.Count, 1u);
        EXPECT_EQ(table.End, 17u);
        // The signature the buffer held before is gone: the packet cannot pass for a table.
        EXPECT_EQ(table.Range(0, 17), Cat({Bytes(16, 0), END}));
    }
}

TEST_F(FileTableTest, SectionLinesAreMatchedWholeAfterCuttingCommentsAndCase) {
    Table table = Read(
        "[Table Header]\n"
        "VHSL 1 0 M\n"
        "[BUS] // busses follow\n"
        "1\n"
        "[slot]\n"
        "7 1\n"
        "  [Bus]\n"
        "2\n"
        "[busses]\n"
        "3\n"
        "[ bus ]\n"
        "4\n"
        "[table  header]\n"
        "5\n"
        "[drawer]\n"
        "9 4\n");
    Bytes slot{0x82, 16, 7, 0, 1};
    slot.resize(16, 0);
    Bytes drawer{0x87, 16, 9, 0, 4};
    drawer.resize(16, 0);
    EXPECT_EQ(table.Descriptors(), Cat({Bus({1}), slot, Bus({2}), drawer, END}));
    EXPECT_EQ(table.Count, 16u + 4 * 16 + 1);
    const std::string log = Tree.Log();
    const std::string message = "\nParseLine(): unknown parse mode 0\n\n";
    size_t first = log.find(message);
    ASSERT_NE(first, std::string::npos) << log;
    EXPECT_EQ(log.size(), 3 * message.size()) << log;  // one per line of an unknown section
}

TEST_F(FileTableTest, DataBeforeTheFirstSectionIsReportedAndIgnored) {
    Table table = Read("1 2 3\n[bus]\n4\n");
    EXPECT_EQ(table.Descriptors(), Cat({Bus({4}), END}));
    EXPECT_EQ(Tree.Log(), "\nParseLine(): unknown parse mode 0\n\n");
    // A last line without its line feed counts like any other.
    EXPECT_EQ(Read("[bus]\n5").Descriptors(), Cat({Bus({5}), END}));
}

TEST_F(FileTableTest, NumbersAreCutToTheirFieldWidths) {
    Table table = Read(
        "[bus]\n"
        "1 2 255 0X1F 4 5 6 7 8 9 10 11 12 13\n"
        "1 2 3 256 0x101 0 0 0 0 0 0 0x1ff\n"
        "[slot]\n"
        "300 1 2 3 4 5 6 7 8 9\n"
        "70000 0x1 0xff\n");
    Bytes slot300{0x82, 16, 0x2C, 0x01, 1, 2, 3, 4, 5, 6, 7, 8, 9, 0, 0, 0};
    Bytes slot70000{0x82, 16, 0x70, 0x11, 1, 255, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0};
    EXPECT_EQ(table.Descriptors(),
              Cat({Bus({1, 2, 255, 31, 4, 5, 6, 7, 8, 9, 10, 11}),
                   Bus({1, 2, 3, 0, 1, 0, 0, 0, 0, 0, 0, 255}), slot300, slot70000, END}));
}

TEST_F(FileTableTest, HeaderTextFieldsAreCutOrPaddedAndRepeatedHeadersRewrite) {
    Table table = Read(
        "[table header]\n"
        "VHSLX 2 3 ABCDEFGH\n"
        "[bus]\n"
        "1\n"
        "[table header]\n"
        "VHSL 4 5 AB\n");
    EXPECT_EQ(table.Range(0, 16),
              (Bytes{'V', 'H', 'S', 'L', 16, 4, 5, 'A', 'B', 0, 0, 0, 0, 0, 0, 0}));
    EXPECT_EQ(table.Count, 16u + 16 + 16 + 1);
    EXPECT_EQ(table.End, 16u + 16 + 1);

    // A header line of one token: the rest is zero.
    table = Read("[table header]\nVH\n");
    EXPECT_EQ(table.Range(0, 17), Cat({Bytes{'V', 'H', 0, 0, 16}, Bytes(11, 0), END}));
}

TEST_F(FileTableTest, StringTextsAreQuotedOrEndAtTheFirstBlank) {
    Table table = Read(
        "[string]\n"
        "1 two words\n"
        "0x102 \"two  words\" ignored\n"
        "3\n");
    EXPECT_EQ(table.Descriptors(),
              Cat({Bytes{0x91, 1, 't', 'w', 'o', 0},
                   Bytes{0x91, 2, 't', 'w', 'o', ' ', ' ', 'w', 'o', 'r', 'd', 's', 0},
                   Bytes{0x91, 3, 0}, END}));
    EXPECT_EQ(table.Count, 6u + 13 + 3 + 1);
}

TEST_F(FileTableTest, ShortLinesFillZerosAndReadNothingPastTheLine) {
    // The line's terminator is followed by bytes that look like more tokens.
    char line[] = "5 1\0 9 9 9 9 9 9 9 9 9 9";
    _ASL_BUS_DESCRIPTOR bus;
    std::memset(&bus, 0xEE, sizeof(bus));
    EXPECT_EQ(StoreBus(&bus, line), 16u);
    EXPECT_EQ(Bytes(reinterpret_cast<uint8_t*>(&bus), reinterpret_cast<uint8_t*>(&bus) + 16),
              Bus({5, 1}));

    char empty[] = "\0 1 2";
    _ASL_SLOT_DESCRIPTOR slot;
    std::memset(&slot, 0xEE, sizeof(slot));
    EXPECT_EQ(StoreSlot(&slot, empty), 16u);
    EXPECT_EQ(slot.SlotID, 0);
    EXPECT_EQ(slot.SlotUiNumber, 0);

    char chassis[] = "4";
    _ASL_CHASSIS_DESCRIPTOR system;
    std::memset(&system, 0xEE, sizeof(system));
    EXPECT_EQ(StoreChassis(&system, chassis), 16u);
    EXPECT_EQ(system.ChassisID, 4);
    EXPECT_EQ(system.StringID, 0);
    EXPECT_EQ(system.Reserved[10], 0);
}

TEST_F(FileTableTest, AnOversizedFileStopsAtTheLastDescriptorThatFits) {
    std::string text = "[table header]\nVHSL 1 0 BIG\n[bus]\n";
    for (int i = 0; i < 6000; i++) {
        text += std::to_string(i % 256) + "\n";
    }
    // 16 + 16 * k + 1 <= 80016 leaves room for 4999 busses and the end marker.
    Table full = Read(text);
    EXPECT_EQ(full.End, 16u + 4999 * 16 + 1);
    EXPECT_EQ(full.Count, full.End);
    EXPECT_EQ(full.Data()[full.End - 1], END_TYPE);
    EXPECT_EQ(full.Range(full.End - 17, 16), Bus({4998 % 256}));
    EXPECT_NE(Tree.Log().find("ReadFileTable():  Table exceeds the packet buffer of 80016 bytes"),
              std::string::npos)
        << Tree.Log();

    // A smaller buffer: nothing beyond it is written, not even by a string that would not fit.
    Table small = Read("[bus]\n1\n2\n[string]\n3 " + std::string(40, 'x') + "\n[bus]\n4\n", 60);
    EXPECT_EQ(small.End, 16u + 2 * 16 + 1);
    EXPECT_EQ(small.Count, 2u * 16 + 1);  // no header line
    EXPECT_EQ(small.Descriptors(), Cat({Bus({1}), Bus({2}), END}));
    EXPECT_EQ(small.Range(small.End, 60 - small.End), Bytes(60 - small.End, 0));
    EXPECT_EQ(small.Range(60, 16), Bytes(16, 0xEE));

    // No room for even a header and an end marker: nothing is written.
    Table none = Read("[bus]\n1\n", 16);
    EXPECT_EQ(none.Count, 0u);
    EXPECT_EQ(none.Range(4, 12), Bytes(12, 0xEE));
}

TEST_F(FileTableTest, GetFileTableReadsTheMachinesFile) {
    _ASL_PACKET packet;
    ValidVPD = false;
    Tree.Scratch().Write("inst/4321.pci", "[table header]\nVHSL 1 0 M\n[bus]\n7\n");
    EXPECT_EQ(GetFileTable(&packet, sizeof(packet)), 0u);  // no vital product data

    std::memcpy(Vpd.MachineTypeModel, "4321XYZ", 7);
    ValidVPD = true;
    EXPECT_EQ(GetFileTable(&packet, sizeof(packet)), 16u + 16 + 1);
    EXPECT_EQ(std::memcmp(packet.Header.Signature, "VHSL", 4), 0);
    EXPECT_EQ(packet.Data[0], BUS_TYPE);
    EXPECT_EQ(packet.Data[2], 7);
    EXPECT_EQ(packet.Data[16], END_TYPE);

    ASSERT_EQ(std::remove(Tree.InstFile("4321.pci").c_str()), 0);
    EXPECT_EQ(GetFileTable(&packet, sizeof(packet)), 0u);  // no file for the machine
}

}  // namespace
