#include "diag/hwdump.h"
#include "adapters/adapterdump.h"
#include "sources/asldump.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "aslbuilder.h"
#include "diag/hwdebug.h"
#include "scratchdir.h"

// Hex dumps, configuration spaces, packets and capability lists write what hwdump.log has.
TEST(HwDump, DumpsWriteTheDataFile) {
    InstallTree tree;
    // Whole lines and a short last one; a start inside the buffer shows its offset, and 4 a line
    // put "- " before the third byte; nothing at all.
    const std::string bytes = std::string("ABCDEFGHIJKLMNO\x7f~ 0123456789abcd") + '\0';
    DumpByteBuffer(bytes.data(), 33, 0, 16);
    DumpByteBuffer(bytes.data(), 3, 30, 4);
    DumpByteBuffer(bytes.data(), 0, 0, 16);

    // Header types 0, 1 and 2, with and without the multi-function bit, and an unknown one.
    for (uint8_t headerType : {0x00, 0x80, 0x01, 0x81, 0x02, 0x82, 0x03}) {
        _PCI_CONFIG0 config{};
        config.VendorID = 0x1234;
        config.HeaderType = headerType;
        DumpPciConfigSpace(&config, 0);
    }

    // The decoded packet ends where the walk ends: an unknown type, no end marker, a length
    // of 0, no signature.
    AslBuilder header;
    header.Header();
    for (const AslBuilder& packet :
         {AslBuilder(header).Bus({}).Slot({}).Invalid().Raw({0x20}),
          AslBuilder(header).String(7, "Drawer"), AslBuilder(header).Bus({}).Length(0).End(),
          AslBuilder().Raw({'V', 'H', 'S', 'X'})}) {
        DumpAslPacket(packet.Packet().get(), static_cast<uint32_t>(packet.Size()));
    }

    // Capability lists (status, first item, its ID and next): one known item, one that points
    // at itself (cut after the items that fit in the image), one not recognized, and none.
    const uint8_t lists[][4] = {
        {0x10, 0x53, 7, 0}, {0x10, 0x50, 1, 0x50}, {0x10, 0x50, 9, 0}, {0, 0x50, 7, 0}};
    for (const auto& list : lists) {
        _PCI_CONFIG0 config{};
        config.Status = list[0];
        config.CapabilitiesPtr = list[1];
        const uint8_t item[] = {list[2], list[3], 'A', 'B', 'C', 'D', 'E', 'F'};
        std::memcpy(config.DeviceSpecific + 0x10, item, sizeof(item));
        DumpCapabilityList(&config);
    }
    // The refused packet's address, masked.
    std::string log = tree.Log();
    const size_t address = log.find("Packet at 0x");
    ASSERT_NE(address, std::string::npos);
    log.replace(address + 10, 10, "ADDRESS");
    EXPECT_EQ(log, TestData("hwdump.log"));
}
