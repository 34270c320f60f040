// The machine builders: lspci dumps to /proc/bus/pci, firmware descriptions to dev/mem.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <numeric>

#include "sim/machine/firmware.h"
#include "sim/machine/lspcidump.h"
#include "sim/machine/pcitree.h"
#include "sim/tests/simrun.h"

namespace velhsim::test {
namespace {

using ::testing::HasSubstr;

std::string Row(const std::string& offset, const std::string& bytes) {
    return offset + ": " + bytes + "\n";
}

struct Refusal {
    std::string Text;
    std::string Message;
};

const std::string ZERO_ROW = "00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00";

TEST(LspciDump, ReadsFunctionsDetailsAndExactlyTheDumpedBytes) {
    const std::string text =
        "# captured\n"
        "0000:02:1f.3 SCSI storage controller: Example\n"
        "\tFlags: bus master, 66MHz, medium devsel, latency 64, IRQ 24\n"
        "\tRegion 0: Memory at fe000000 (64-bit, prefetchable) [size=256M]\n"
        "\tRegion 4: I/O ports at 2f00 [disabled] [size=256]\n"
        "\tExpansion ROM at fc900000 [disabled] [size=128K]\n"
        "\tKernel driver in use: aic7xxx\n"
        "\tKernel modules: aic7xxx\n" +
        Row("00", "05 90 cf 00 07 00 b0 02 01 00 00 01 10 40 80 00") +
        Row("10", "0c 00 00 fe 00 00 00 00 00 00 00 00 00 00 00 00") +
        Row("20", "01 2f 00 00 00 00 00 00 00 00 00 00 05 90 ff ff") +
        Row("30", "00 00 90 fc dc 00 00 00 00 00 00 00 0b 01 27 19") + Row("40", "aa bb") +
        "\n"
        "0001:10:00.1 Other\n" +
        Row("00", "86 80 10 10");
    std::vector<PciFunctionDump> functions;
    std::string error;
    ASSERT_TRUE(ParseLspciDump(text, &functions, &error)) << error;
    ASSERT_EQ(functions.size(), 2u);
    // Exactly the dumped bytes. The IRQ the kernel routed wins over the configuration's line; the
    // upper half of the 64-bit base address takes no slot; the ROM shows without its flag bits.
    EXPECT_EQ(functions[0].Config.substr(62), "\x27\x19\xaa\xbb");
    EXPECT_EQ(DevicesLine(functions[0]),
              "02fb\t900500cf\t18\tfe00000c\t00000000\t00000000\t00000000\t00002f01\t00000000"
              "\tfc900000\t10000000\t00000000\t00000000\t00000000\t00000100\t00000000\t00020000"
              "\taic7xxx\n");
    EXPECT_EQ(functions[1].Config, "\x86\x80\x10\x10");
}

TEST(LspciDump, DevicesLineOfABridgeWithoutDriverOrInterrupt) {
    // Header type 1, an I/O and a memory base address, 0x30 that is no ROM for this type, the ROM
    // at 0xfef00000 and on, a line but no pin.
    std::vector<PciFunctionDump> bridge;
    std::string error;
    ASSERT_TRUE(ParseLspciDump(
        "03:02.0 x\n" + Row("00", "11 10 26 00 00 00 00 00 00 00 00 00 00 00 01 00") +
            Row("10", "01 00 00 00 10 00 00 00 00 00 00 00 00 00 00 00") + Row("20", ZERO_ROW) +
            Row("30", "55 00 00 00 00 00 00 00 01 00 f0 fe 0a 00 00 00"),
        &bridge, &error))
        << error;
    EXPECT_EQ(DevicesLine(bridge[0]),
              "0310\t10110026\t0\t00000001\t00000010\t00000000\t00000000\t00000000\t00000000"
              "\tfef00001\t00000000\t00000000\t00000000\t00000000\t00000000\t00000000\t00000000"
              "\t\n");
}

TEST(LspciDump, RefusesWhatIsNoDumpNamingTheLine) {
    const Refusal cases[] = {
        {Row("00", "86 80"), "line 1: configuration bytes before the first function"},
        {"00:01.0 x\n" + Row("10", ZERO_ROW), "line 2: row 10: does not continue"},
        {"00:01.0 x\n" + Row("00", "86 80") + Row("10", "00"), "line 3: row 10: does not"},
        {"00:01.0 x\n" + Row("00", "86 8"), "line 2: \"8\" is not a byte"},
        {"00:01.0 x\n" + Row("00", "86 zz"), "line 2: \"zz\" is not a byte"},
        {"00:01.0 x\n" + Row("00", ZERO_ROW + " 00"), "line 2: a row holds 1 to 16 bytes"},
        {"00:20.0 x\n", "line 1: \"00:20.0\" is neither"},
        {"00:01.8 x\n", "line 1: \"00:01.8\" is neither"},
        {"00:01.0 x\n00:02.0 y\n" + Row("00", "00"), "line 1: the function has no config"},
        {"00:01.0 x\n" + Row("00", "00") + "00:01.0 x\n", "line 3: function 00:01.0 appears"},
        {"00:01.0 x\n\tRegion 0: Memory [size=12Q]\n" + Row("00", "00"),
         "line 2: unreadable region size"},
        {"\tKernel driver in use: e1000\n", "line 1: detail line before the first function"},
    };
    for (const Refusal& c : cases) {
        std::vector<PciFunctionDump> functions;
        std::string error;
        EXPECT_FALSE(ParseLspciDump(c.Text, &functions, &error)) << c.Text;
        EXPECT_THAT(error, HasSubstr(c.Message)) << c.Text;
    }
}

TEST(PciTree, WritesBusFoldersFunctionFilesAndDevices) {
    const ScratchDir dir;
    dir.Write("dump", "00:01.0 x\n" + Row("00", "86 80 29 12") + "0001:10:1f.7 y\n" +
                          Row("00", "86 80 10 10 00"));
    std::string error;
    ASSERT_TRUE(BuildPciTree(dir / "dump", dir / "pci", &error)) << error;
    EXPECT_EQ(FileText(dir / "pci/00/01.0"), std::string("\x86\x80\x29\x12"));
    EXPECT_EQ(FileText(dir / "pci/0001:10/1f.7"), std::string("\x86\x80\x10\x10\x00", 5));
    const std::string devices = FileText(dir / "pci/devices");
    EXPECT_EQ(devices.substr(0, 14), "0008\t80861229\t");
    EXPECT_THAT(devices, HasSubstr("\n10ff\t80861010\t"));

    EXPECT_FALSE(BuildPciTree(dir / "none", dir / "pci2", &error));
    EXPECT_THAT(error, HasSubstr("none: No such file or directory"));
}

TEST(Firmware, EncodesTheRecordWithPaddedTextsAndAChecksum) {
    FirmwareRecord record;
    record.Type = "K740";
    record.Model = "C4";
    record.BuildId = "KVD140AKV";
    record.Serial = "K7D0412";
    record.UniqueId = "2303A4B5C6D";
    const std::string bytes = EncodeVpdRecord(record);
    ASSERT_EQ(bytes.size(), 48u);
    EXPECT_EQ(bytes.substr(0, 6), std::string("\xaa\x55VPD\x30"));
    EXPECT_EQ(bytes.substr(13, 34), "KVD140AKVK7D04122303A4B5C6DK740C4 ");
    EXPECT_EQ(std::accumulate(bytes.begin(), bytes.end(), 0,
                              [](int sum, unsigned char byte) { return sum + byte; }) %
                  256,
              0);

    record.Signature = "XYZ";
    record.Length = 0x21;
    record.Checksum = 0x7f;
    const std::string decoy = EncodeVpdRecord(record);
    EXPECT_EQ(decoy.substr(2, 4), "XYZ\x21");
    EXPECT_EQ(decoy[47], '\x7f');
}

TEST(Firmware, BuildsASparseImageWithTheSegmentAtF0000) {
    const ScratchDir dir;
    std::string segment(0x10000, '\0');
    segment[0] = 'S';
    segment[0xffff] = 'E';
    dir.Write("bios.bin", segment);
    // Two records and a captured segment; the last record is cut at the segment's end.
    dir.Write("firmware",
              "# comment\nsegment bios.bin\nrecord 0x100\ntype K740 # the machine type\n"
              "model \"C4 \"\nrecord 0xFFE0\ntype 1234\n");
    std::string error;
    ASSERT_TRUE(BuildMemoryImage(dir / "firmware", dir / "mem", &error)) << error;
    const std::string image = FileText(dir / "mem");
    ASSERT_EQ(image.size(), MEMORY_IMAGE_SIZE);
    EXPECT_EQ(image[0xF0000], 'S');
    EXPECT_EQ(image.substr(0xF0100, 5), "\xaa\x55VPD");
    EXPECT_EQ(image.substr(0xF0100 + 40, 7), "K740C4 ");
    EXPECT_EQ(image.substr(0xFFFE0, 5), "\xaa\x55VPD");
    EXPECT_EQ(image.substr(0xFFFE0 + 13, 19), std::string(19, ' '));
    EXPECT_EQ(image[0xEFFFF], '\0');
    struct stat info {};
    ASSERT_EQ(stat((dir / "mem").c_str(), &info), 0);
    EXPECT_LT(info.st_blocks * 512, 0x40000);
}

TEST(Firmware, RefusesDescriptionsItCannotHonour) {
    const Refusal cases[] = {
        {"type K740\n", "line 1: \"type\" before the first \"record\" line"},
        {"record 0x10000\n", "line 1: the record's offset must be a number below"},
        // The comment mark of this format is "#", so "//" makes the offset unreadable.
        {"#\nrecord 0xFFE0  // at the end\n", "line 2: the record's offset must be a number"},
        {"record 0\ntype K7401\n", "line 2: type has at most 4 characters"},
        {"record 0\nmodel \"C4D\n", "line 2: unbalanced quote"},
        {"record 0\nlength 256\n", "line 2: length must be a number from 0 to 255"},
        {"record 0\ncolour red\n", "line 2: unknown key \"colour\""},
        {"segment short.bin\n", "a captured segment holds exactly 65536 bytes"},
    };
    const ScratchDir dir;
    dir.Write("short.bin", "abc");
    for (const Refusal& c : cases) {
        dir.Write("firmware", c.Text);
        std::string error;
        EXPECT_FALSE(BuildMemoryImage(dir / "firmware", dir / "mem", &error)) << c.Text;
        EXPECT_THAT(error, HasSubstr(c.Message)) << c.Text;
    }
}

}  // namespace
}  // namespace velhsim::test
