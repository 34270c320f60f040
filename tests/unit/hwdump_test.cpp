#include "diag/hwdump.h"
#include "adapters/adapterdump.h"
#include "sources/asldump.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "aslbuilder.h"
#include "diag/hwdebug.h"
#include "scratchdir.h"

namespace {

class HwDumpTest : public ::testing::Test {
  protected:
    void TearDown() override { HwInfoPrintLevel = 0; }
    // What one dump writes to a fresh log.
    template <typename Dump>
    std::string Logged(Dump dump) {
        std::remove("../log/velhslot.slotmgr.hwinfo.log");
        dump();
        return Tree.Log();
    }
    InstallTree Tree;
};

}  // namespace

TEST_F(HwDumpTest, HexDumpLinesKeepTheirWidth) {
    const std::string bytes = std::string("ABCDEFGHIJKLMNO\x7f~ 0123456789abcd") + '\0';
    struct {
        const std::string& Buffer;
        uint32_t Length, Start, PerLine;
        std::string Log;
    } const cases[] = {
        {bytes, 33, 0, 16,
         " 00000000:  41 42 43 44 45 46 47 48 - 49 4a 4b 4c 4d 4e 4f 7f  ABCDEFGH IJKLMNO.\r\n"
         " 00000010:  7e 20 30 31 32 33 34 35 - 36 37 38 39 61 62 63 64  ~ 012345 6789abcd\r\n"
         " 00000020:  00" +
             std::string(49, ' ') + "." + std::string(16, ' ') + "\r\n"},
        // A start inside the buffer: its offset shows; 4 a line puts "- " before the third.
        {bytes, 3, 30, 4, " 0000001e:  63 64 - 00     cd . \r\n"},
        {bytes, 0, 0, 16, ""},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(Logged([&] { DumpByteBuffer(c.Buffer.data(), c.Length, c.Start, c.PerLine); }),
                  c.Log)
            << c.Length;
    }
}

TEST_F(HwDumpTest, ConfigurationSpaceByHeaderType) {
    const std::pair<uint8_t, std::string> cases[] = {
        {0x00, "\nType 0 PCI Configuration Space\n\n            VendorID:  0x1234\n"},
        {0x80, "             BAR[5]:  0x00000000\n       CardbusCisPtr:  0x00000000\n"},
        {0x81, "                 BIST:  0x00\n\n               BAR[0]:  0x00000000\n"},
        {0x01, "SecondaryLatencyTimer:  0x00\n"},
        {0x02, "\nType 2 PCI Configuration Space\n"},
        {0x82, "      Range[3].Limit:  0x00000000\n       InterruptLine:  0x00\n"},
        {0x03, "\nDumpPciConfigSpace(); unknown header type: 0x03 (3)\n\n"},
    };
    for (const auto& [headerType, expected] : cases) {
        _PCI_CONFIG0 config{};
        config.VendorID = 0x1234;
        config.HeaderType = headerType;
        const std::string log = Logged([&] { DumpPciConfigSpace(&config, 0); });
        EXPECT_NE(log.find(expected), std::string::npos) << int(headerType) << log;
        EXPECT_EQ(log.find("OEM Specific Registers"), std::string::npos);
    }
}

TEST_F(HwDumpTest, DecodedPacketEndsWhereTheWalkEnds) {
    struct Case {
        AslBuilder Packet;
        std::vector<std::string> Expected;
    };
    AslBuilder header;
    header.Header();
    const std::vector<Case> cases = {
        {AslBuilder(header).Bus({}).Slot({}).Invalid().Raw({0x20}),
         {"\nBus Descriptor\n", "    DescriptorType: 0x02   (2)\n",
          "\nUnknown descriptor type (0x20)\n\n\nFound 2 valid descriptors\n\n"}},
        {AslBuilder(header).String(7, "Drawer"),
         {"         StringNum: 0x07  (7)\n            String: Drawer\n",
          "No end marker within the 25 bytes", "Found 1 valid descriptors"}},
        {AslBuilder(header).Bus({}).Length(0).End(), {"has length 0", "Found 0 valid"}},
        {AslBuilder().Raw({'V', 'H', 'S', 'X'}), {"is not an ASL packet\n"}},
    };
    for (const Case& c : cases) {
        const std::string log = Logged([&] {
            DumpAslPacket(c.Packet.Packet().get(), static_cast<uint32_t>(c.Packet.Size()));
        });
        for (const std::string& expected : c.Expected) {
            EXPECT_NE(log.find(expected), std::string::npos) << expected << "\n" << log;
        }
    }
}

TEST_F(HwDumpTest, CapabilityListIsBoundedAndNamed) {
    struct Case {
        uint8_t Status, First, Id, Next;
        std::string Expected;
        size_t Items;
    };
    const std::vector<Case> cases = {
        {0x10, 0x53, 7, 0x00,
         "Capability List Item at 0x50:  PCI-X\n\n"
         " 00000050:  07 00 41 42 - 43 44 45 46  ..AB CDEF\r\n\n\n",
         1},
        // A list that points back at itself ends after the items that fit in the image.
        {0x10, 0x50, 1, 0x50, "Capability List Item at 0x50:  Power Management Interface\n", 48},
        {0x10, 0x50, 0x09, 0x00, "Capability List Item at 0x50:  Not Recognized\n\n\n\n", 1},
        {0x00, 0x50, 7, 0x00, "", 0},
    };
    for (const Case& c : cases) {
        _PCI_CONFIG0 config{};
        config.Status = c.Status;
        config.CapabilitiesPtr = c.First;
        const uint8_t item[] = {c.Id, c.Next, 'A', 'B', 'C', 'D', 'E', 'F'};
        std::memcpy(config.DeviceSpecific + 0x10, item, sizeof(item));
        const std::string log = Logged([&] { DumpCapabilityList(&config); });
        EXPECT_EQ(log.find(c.Expected), 0u) << log;
        size_t items = 0;
        for (size_t at = log.find("Capability List"); at != std::string::npos;
             at = log.find("Capability List", at + 1)) {
            items++;
        }
        EXPECT_EQ(items, c.Items);
    }
}
