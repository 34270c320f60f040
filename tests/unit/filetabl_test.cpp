#include "sources/filetabl.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "aslbuilder.h"
#include "filehandle.h"
#include "scratchdir.h"

namespace {

using Bytes = std::vector<uint8_t>;

struct Table {
    uint32_t Count = 0, End = 0;  // End: bytes the packet occupies
    Bytes Buffer;                 // the whole buffer after the read
    Bytes Range(size_t from, size_t to) const {
        return Bytes(Buffer.data() + from, Buffer.data() + to);
    }
    Bytes Packet() const { return Range(0, End); }
};

// Reads text as a PCI architecture file into a buffer of `size` bytes that held garbage and a
// signature before.
Table Read(const std::string& text, uint32_t size = ASL_PACKET_CAPACITY) {
    auto packet = std::make_unique<_ASL_PACKET>();
    std::memset(packet.get(), 0xEE, sizeof(_ASL_PACKET));
    std::memcpy(packet.get(), "VHSL", 4);
    UniqueFile stream(std::tmpfile());
    std::fputs(text.c_str(), stream.get());
    std::rewind(stream.get());
    Table table;
    table.Count = ReadFileTable(stream.get(), packet.get(), size, &table.End);
    const auto* bytes = reinterpret_cast<const uint8_t*>(packet.get());
    table.Buffer.assign(bytes, bytes + sizeof(_ASL_PACKET));
    return table;
}

// A packet whose file had no header line: the header is all zeros.
AslBuilder Headless() {
    return AslBuilder().Raw({0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0});
}

TEST(FileTable, LinesBecomeDescriptorsUpToTheBufferSize) {
    InstallTree tree;  // the reader's messages land in its log
    // Logged for a line outside a known section.
    const std::string unknown = "\nParseLine(): unknown parse mode 0\n\n";
    const struct {
        std::string Text;
        AslBuilder Expected;
        uint32_t Count;
        std::string Log;
    } cases[] = {
        {"// sample machine\n[table header]\nVHSL 1 0 MACH01\n\n[chassis]\n0 1\n[string]\n"
         "1 \"Twelve chars\"   // the chassis name\n",
         AslBuilder().Header("MACH01").Chassis(0, 1).String(1, "Twelve chars").End(), 48, ""},
        // No lines: the signature the buffer held before is gone, it cannot pass for a table.
        {"", Headless().End(), 1, ""},
        {"// only\n   // comments\n\n", Headless().End(), 1, ""},
        // Section lines are matched whole after cutting comments and case.
        {"[Table Header]\nVHSL 1 0 M\n[BUS] // busses follow\n1\n[slot]\n7 1\n  [Bus]\n2\n"
         "[busses]\n3\n[ bus ]\n4\n[table  header]\n5\n[drawer]\n9 4\n",
         AslBuilder()
             .Header("M")
             .Bus({1, 0, 0})
             .Slot({7, 1, 0, 0})
             .Bus({2, 0, 0})
             .Drawer(9, 4)
             .End(),
         16 + 4 * 16 + 1, unknown + unknown + unknown},
        {"1 2 3\n[bus]\n4\n", Headless().Bus({4, 0, 0}).End(), 17, unknown},
        {"[bus]\n5", Headless().Bus({5, 0, 0}).End(), 17, ""},  // a last line without line feed
        // Numbers are cut to their field widths; missing ones are zero, and a short line reads
        // nothing of the longer line before it that lies past its end in the buffer.
        {"[bus]\n1 2 255 0X1F 4 5 6 7 8 9 10 11 12 13\n1 2 3 256 0x101 0 0 0 0 0 0 0x1ff\n5 1\n"
         "[slot]\n300 1 2 3 4 5 6 7 8 9\n70000 0x1 0xff\n[chassis]\n4\n",
         Headless()
             .Raw({0x81, 16, 1, 2, 255, 31, 4, 5, 6, 7, 8, 9, 10, 11, 0, 0})
             .Raw({0x81, 16, 1, 2, 3, 0, 1, 0, 0, 0, 0, 0, 0, 255, 0, 0})
             .Bus({5, 1, 0})
             .Slot({300, 1, 2, 3, 4, 5, 6, 7, 8, 9})
             .Slot({70000 & 0xFFFF, 1, 255, 0})
             .Chassis(4, 0)
             .End(),
         6 * 16 + 1, ""},
        // Header texts are cut or padded, and a repeated header rewrites the first.
        {"[table header]\nVHSLX 2 3 ABCDEFGH\n[bus]\n1\n[table header]\nVHSL 4 5 AB\n",
         AslBuilder()
             .Raw({'V', 'H', 'S', 'L', 16, 4, 5, 'A', 'B', 0, 0, 0, 0, 0, 0, 0})
             .Bus({1, 0, 0})
             .End(),
         16 + 16 + 16 + 1, ""},
        {"[table header]\nVH\n",
         AslBuilder().Raw({'V', 'H', 0, 0, 16, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0}).End(), 17, ""},
        // A text is quoted or ends at the first blank.
        {"[string]\n1 two words\n0x102 \"two  words\" ignored\n3\n",
         Headless().String(1, "two").String(2, "two  words").String(3, "").End(), 23, ""},
    };
    for (const auto& c : cases) {
        const size_t logged = tree.Log().size();
        const Table table = Read(c.Text);
        EXPECT_EQ(table.Packet(), c.Expected.Bytes) << c.Text;
        EXPECT_EQ(table.Count, c.Count) << c.Text;
        EXPECT_EQ(tree.Log().substr(logged), c.Log) << c.Text;
    }

    // An oversized file stops at the last descriptor that fits.
    std::string text = "[table header]\nVHSL 1 0 BIG\n[bus]\n";
    for (int i = 0; i < 6000; i++) {
        text += std::to_string(i % 256) + "\n";
    }
    // 16 + 16 * k + 1 <= 80016 leaves room for 4999 busses and the end marker.
    const Table full = Read(text);
    EXPECT_EQ(full.End, 16u + 4999 * 16 + 1);
    EXPECT_EQ(full.Count, full.End);
    EXPECT_EQ(full.Range(full.End - 17, full.End),
              AslBuilder().Bus({4998 % 256, 0, 0}).End().Bytes);
    EXPECT_TRUE(tree.Logged("ReadFileTable():  Table exceeds the packet buffer of 80016 bytes"))
        << tree.Log();

    // A smaller buffer: nothing beyond it is written, not even by a string that would not fit.
    const Table small =
        Read("[bus]\n1\n2\n[string]\n3 " + std::string(40, 'x') + "\n[bus]\n4\n", 60);
    EXPECT_EQ(small.Packet(), Headless().Bus({1, 0, 0}).Bus({2, 0, 0}).End().Bytes);
    EXPECT_EQ(small.Count, 2u * 16 + 1);  // no header line
    EXPECT_EQ(small.Range(small.End, 60), Bytes(60 - small.End, 0));
    EXPECT_EQ(small.Range(60, 76), Bytes(16, 0xEE));
    // Exactly room for two busses and the end marker.
    EXPECT_EQ(Read("[bus]\n1\n2\n", 16 + 2 * 16 + 1).Count, 2u * 16 + 1);

    // No room for even a header and an end marker: nothing is written.
    const Table none = Read("[bus]\n1\n", 16);
    EXPECT_EQ(none.Count, 0u);
    EXPECT_EQ(none.End, 0u);
    EXPECT_EQ(ReadFileTable(nullptr, nullptr, ASL_PACKET_CAPACITY, nullptr), 0u);
    EXPECT_EQ(none.Range(4, 16), Bytes(12, 0xEE));
}

}  // namespace
