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
        Descriptors = OpenDescriptors();
    }
    void TearDown() override {
        // Every operation closes the device before it returns.
        EXPECT_EQ(OpenDescriptors(), Descriptors);
        ResetSystemAccess();
        HwInfoPrintLevel = 0;
    }

    InstallTree Tree;
    FakeDriver Fake;
    std::unique_ptr<_ASL_PACKET> Packet = std::make_unique<_ASL_PACKET>();
    size_t Descriptors = 0;
};

}  // namespace

// "1.0.0" is linsetup_test's; three numbers of eleven characters each are cut to the buffer's 31.
TEST_F(SlotDriverTest, DriverVersionTextIsCutToItsBuffer) {
    Fake.Version = {INT32_MIN, -2147483647, -1999999999};
    EXPECT_STREQ(GetDriverVersion(), "-2147483648.-2147483647.-199999");
    EXPECT_EQ(Fake.Requests, (std::vector<unsigned long>{VELH_IOCTL_VERSION}));
    EXPECT_EQ(Tree.Log(), "");
}

TEST_F(SlotDriverTest, ReadsTheTableInTwoStepsAndRefusesOrCutsWhatTheBufferCannotHold) {
    const std::string head = "\nVELHLIB, GetAslTable():  ";
    const unsigned long asked[] = {VELH_IOCTL_TABLE_SIZE, VELH_IOCTL_TABLE};
    // Table size, size the driver answers after the transfer (0: the buffer's), bytes taken,
    // trace level, log.
    const struct {
        uint32_t Size, Delivered, Taken, Level;
        std::string Log;
    } cases[] = {
        {1234, 0, 1234, RAW_ASL,
         "\nvelhlib, GetAslTable():  Calling VelhSlot driver\n\n\nGetAslTable(), buffer size: 80016"
         "\nGetAslTable(), got 1234 bytes from driver\n\n"},
        // A table larger than the buffer is refused before it is asked for; size 0 is none.
        {ASL_PACKET_CAPACITY + 1, 0, 0, 0,
         head + "Table of 80017 bytes does not fit the 80016-byte buffer\n"},
        {0, 0, 0, 0, ""},
        {ASL_PACKET_CAPACITY, 0, ASL_PACKET_CAPACITY, 0, ""},
        {100, 5000, 100, 0,
         head + "Driver delivered 5000 bytes into a buffer of 100; the table is cut\n"},
        {100, 60, 60, 0, ""},  // a driver answering less the second time hands over only that much
    };
    for (const auto& c : cases) {
        HwInfoPrintLevel = c.Level;
        const size_t logged = Tree.Log().size();
        Fake.Requests.clear();
        Fake.SetTable(c.Size);
        Fake.DeliveredSize = c.Delivered;
        std::memset(Packet.get(), 0xEE, sizeof(_ASL_PACKET));
        EXPECT_EQ(GetAslTable(Packet.get()), c.Taken) << c.Size;
        // The table's first bytes are in the packet, and nothing after them.
        std::vector<uint8_t> expected(Fake.Table.begin(), Fake.Table.begin() + c.Taken);
        expected.resize(sizeof(_ASL_PACKET), 0xEE);
        EXPECT_EQ(std::memcmp(Packet.get(), expected.data(), expected.size()), 0) << c.Size;
        EXPECT_EQ(Fake.Requests, std::vector(asked, asked + (c.Taken == 0 ? 1 : 2))) << c.Size;
        EXPECT_EQ(Tree.Log().substr(logged), c.Log);
    }
}
