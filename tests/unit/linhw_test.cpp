#include "sources/linhw.h"

#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <iterator>
#include <memory>
#include <string>
#include <vector>

#include "diag/hwdebug.h"
#include "fake_driver.h"
#include "scratchdir.h"
#include "util/sysaccess.h"

namespace {

size_t OpenDescriptors() {
    return static_cast<size_t>(std::distance(std::filesystem::directory_iterator("/proc/self/fd"),
                                             std::filesystem::directory_iterator()));
}

// The failing requests, the missing device and the blink request are checked end to end by
// the JVM tests on the simulated driver (MachineTest, data/driver-failures.json).
class SlotDriverTest : public ::testing::Test {
  protected:
    void SetUp() override {
        Fake.Install();
        SysPaths().SlotDriver = Tree.Scratch().Write("velhpdrv", "");
        std::memset(Packet.get(), 0xEE, sizeof(_ASL_PACKET));
        Descriptors = OpenDescriptors();
    }
    void TearDown() override {
        // Every operation closes the device before it returns.
        EXPECT_EQ(OpenDescriptors(), Descriptors);
        ResetSystemAccess();
        HwInfoPrintLevel = 0;
    }

    // The table's first `size` bytes are in the packet, and nothing after them.
    void ExpectTable(uint32_t size) const {
        const auto* bytes = reinterpret_cast<const uint8_t*>(Packet.get());
        EXPECT_EQ(std::memcmp(bytes, Fake.Table.data(), size), 0);
        for (size_t i = size; i < sizeof(_ASL_PACKET); ++i) {
            ASSERT_EQ(bytes[i], 0xEE) << i;
        }
    }

    InstallTree Tree;
    FakeDriver Fake;
    std::unique_ptr<_ASL_PACKET> Packet = std::make_unique<_ASL_PACKET>();
    size_t Descriptors = 0;
};

}  // namespace

TEST_F(SlotDriverTest, DriverVersionText) {
    Fake.Version = {1, 2, 3};
    char* first = GetDriverVersion();
    ASSERT_NE(first, nullptr);
    EXPECT_STREQ(first, "1.2.3");
    EXPECT_EQ(Fake.Requests, (std::vector<unsigned long>{VELH_IOCTL_VERSION}));
    // Three numbers of eleven characters each are cut to the buffer's 31.
    Fake.Version = {INT32_MIN, INT32_MIN, INT32_MIN};
    EXPECT_EQ(GetDriverVersion(), first);
    EXPECT_STREQ(first, "-2147483648.-2147483648.-214748");
    EXPECT_EQ(Tree.Log(), "");
}

TEST_F(SlotDriverTest, ReadsTheTableInTwoSteps) {
    HwInfoPrintLevel = RAW_ASL;
    Fake.SetTable(1234);
    EXPECT_EQ(GetAslTable(Packet.get()), 1234u);
    ExpectTable(1234);
    EXPECT_EQ(Fake.Requests, (std::vector<unsigned long>{VELH_IOCTL_TABLE_SIZE, VELH_IOCTL_TABLE}));
    EXPECT_EQ(Tree.Log(),
              "\nvelhlib, GetAslTable():  Calling VelhSlot driver\n\n"
              "\nGetAslTable(), buffer size: 80016\n"
              "GetAslTable(), got 1234 bytes from driver\n\n");
}

TEST_F(SlotDriverTest, TableSizesOutsideTheBuffer) {
    // A table larger than the packet buffer is refused before it is asked for; size 0 is none.
    for (uint32_t size : {ASL_PACKET_CAPACITY + 1, 0u}) {
        Fake.Requests.clear();
        Fake.SetTable(size);
        EXPECT_EQ(GetAslTable(Packet.get()), 0u);
        EXPECT_EQ(Fake.Requests, (std::vector<unsigned long>{VELH_IOCTL_TABLE_SIZE}));
        ExpectTable(0);
    }
    EXPECT_EQ(Tree.Log(),
              "\nVELHLIB, GetAslTable():  Table of 80017 bytes does not fit the 80016-byte "
              "buffer\n");
    // A table of the full capacity fits.
    Fake.SetTable(ASL_PACKET_CAPACITY);
    EXPECT_EQ(GetAslTable(Packet.get()), ASL_PACKET_CAPACITY);
}

TEST_F(SlotDriverTest, DriverChangingTheSizeCannotOverrun) {
    Fake.SetTable(100);
    Fake.DeliveredSize = 5000;
    EXPECT_EQ(GetAslTable(Packet.get()), 100u);
    ExpectTable(100);
    EXPECT_EQ(Tree.Log(),
              "\nVELHLIB, GetAslTable():  Driver delivered 5000 bytes into a buffer of 100; the "
              "table is cut\n");

    // A driver answering less the second time hands over only that much.
    Fake.DeliveredSize = 60;
    std::memset(Packet.get(), 0xEE, sizeof(_ASL_PACKET));
    EXPECT_EQ(GetAslTable(Packet.get()), 60u);
    ExpectTable(60);
}
