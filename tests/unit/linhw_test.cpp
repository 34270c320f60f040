#include "sources/linhw.h"

#include <dirent.h>
#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "diag/hwdebug.h"
#include "fake_driver.h"
#include "scratchdir.h"
#include "util/sysaccess.h"

namespace {

size_t OpenDescriptors() {
    size_t count = 0;
    DIR* dir = opendir("/proc/self/fd");
    while (dir != nullptr && readdir(dir) != nullptr) {
        ++count;
    }
    if (dir != nullptr) {
        closedir(dir);
    }
    return count;
}

class SlotDriverTest : public ::testing::Test {
  protected:
    void SetUp() override {
        Fake.Install();
        SysPaths().SlotDriver = Tree.Scratch().Write("velhpdrv", "");
        Packet = std::make_unique<_ASL_PACKET>();
        std::memset(Packet.get(), 0xEE, sizeof(_ASL_PACKET));
        Descriptors = OpenDescriptors();
    }
    void TearDown() override {
        // Every operation closes the device before it returns.
        EXPECT_EQ(OpenDescriptors(), Descriptors);
        ResetSystemAccess();
        HwInfoPrintLevel = 0;
    }

    // The error number and its text, as a failed request or open reports them.
    static std::string Errno(int error) {
        char number[16];
        std::snprintf(number, sizeof(number), "0x%08x", error);
        return std::string(" (") + number + "):  " + std::strerror(error);
    }
    static std::string ErrorBlock(const std::string& function, const std::string& message,
                                  int error) {
        return "\nVELHLIB, " + function + ":  " + message + Errno(error) + "\n\n";
    }

    bool PacketUntouchedFrom(size_t offset) const {
        const auto* bytes = reinterpret_cast<const uint8_t*>(Packet.get());
        for (size_t i = offset; i < sizeof(_ASL_PACKET); ++i) {
            if (bytes[i] != 0xEE) {
                return false;
            }
        }
        return true;
    }

    InstallTree Tree;
    FakeDriver Fake;
    std::unique_ptr<_ASL_PACKET> Packet;
    size_t Descriptors = 0;
};

}  // namespace

TEST_F(SlotDriverTest, DriverVersionText) {
    Fake.Version = {1, 2, 3};
    char* first = GetDriverVersion();
    ASSERT_NE(first, nullptr);
    EXPECT_STREQ(first, "1.2.3");
    EXPECT_EQ(Fake.Requests, (std::vector<unsigned long>{VELH_IOCTL_VERSION}));

    Fake.Version = {10, 0, 7};
    char* second = GetDriverVersion();
    EXPECT_EQ(second, first);
    EXPECT_STREQ(second, "10.0.7");

    // Three numbers of eleven characters each are cut to the buffer's 31.
    Fake.Version = {INT32_MIN, INT32_MIN, INT32_MIN};
    EXPECT_STREQ(GetDriverVersion(), "-2147483648.-2147483648.-214748");
    EXPECT_EQ(Tree.Log(), "");

    Fake.FailRequest = VELH_IOCTL_VERSION;
    EXPECT_EQ(GetDriverVersion(), nullptr);
    EXPECT_EQ(Tree.Log(), ErrorBlock("GetDriverVersion()", "Driver version IOCTL failed", EIO));
}

TEST_F(SlotDriverTest, ReadsTheTableInTwoSteps) {
    HwInfoPrintLevel = RAW_ASL;
    Fake.SetTable(1234);
    EXPECT_EQ(GetAslTable(Packet.get()), 1234u);
    const auto* bytes = reinterpret_cast<const uint8_t*>(Packet.get());
    for (uint32_t i = 0; i < 1234; ++i) {
        ASSERT_EQ(bytes[i], Fake.Table[i]) << i;
    }
    EXPECT_TRUE(PacketUntouchedFrom(1234));

    ASSERT_EQ(Fake.Requests, (std::vector<unsigned long>{VELH_IOCTL_TABLE_SIZE, VELH_IOCTL_TABLE}));
    EXPECT_EQ(Fake.Transfers[0].Buffer, nullptr);
    EXPECT_EQ(Fake.Transfers[0].Size, 0u);
    EXPECT_NE(Fake.Transfers[1].Buffer, nullptr);
    EXPECT_EQ(Fake.Transfers[1].Size, 1234u);
    EXPECT_EQ(Tree.Log(),
              "\nvelhlib, GetAslTable():  Calling VelhSlot driver\n\n"
              "\nGetAslTable(), buffer size: 80016\n"
              "GetAslTable(), got 1234 bytes from driver\n\n");
}

TEST_F(SlotDriverTest, TableSizesOutsideTheBuffer) {
    // A table larger than the packet buffer is refused before it is asked for.
    Fake.SetTable(ASL_PACKET_CAPACITY + 1);
    EXPECT_EQ(GetAslTable(Packet.get()), 0u);
    EXPECT_EQ(Fake.Requests, (std::vector<unsigned long>{VELH_IOCTL_TABLE_SIZE}));
    EXPECT_EQ(Tree.Log(),
              "\nVELHLIB, GetAslTable():  Table of 80017 bytes does not fit the 80016-byte "
              "buffer\n");
    EXPECT_TRUE(PacketUntouchedFrom(0));

    // A table of the full capacity fits.
    Fake.Requests.clear();
    Fake.SetTable(ASL_PACKET_CAPACITY);
    EXPECT_EQ(GetAslTable(Packet.get()), ASL_PACKET_CAPACITY);

    // Size 0 is no table.
    Fake.Requests.clear();
    Fake.SetTable(0);
    EXPECT_EQ(GetAslTable(Packet.get()), 0u);
    EXPECT_EQ(Fake.Requests, (std::vector<unsigned long>{VELH_IOCTL_TABLE_SIZE}));
}

TEST_F(SlotDriverTest, DriverRaisingTheSizeCannotOverrun) {
    Fake.SetTable(100);
    Fake.DeliveredSize = 5000;
    EXPECT_EQ(GetAslTable(Packet.get()), 100u);
    EXPECT_EQ(reinterpret_cast<const uint8_t*>(Packet.get())[99], Fake.Table[99]);
    EXPECT_TRUE(PacketUntouchedFrom(100));
    EXPECT_EQ(Tree.Log(),
              "\nVELHLIB, GetAslTable():  Driver delivered 5000 bytes into a buffer of 100; the "
              "table is cut\n");

    // A driver answering less the second time hands over only that much.
    Fake.DeliveredSize = 60;
    std::memset(Packet.get(), 0xEE, sizeof(_ASL_PACKET));
    EXPECT_EQ(GetAslTable(Packet.get()), 60u);
    EXPECT_TRUE(PacketUntouchedFrom(60));
}

TEST_F(SlotDriverTest, FailedTableRequests) {
    Fake.SetTable(64);
    Fake.FailRequest = VELH_IOCTL_TABLE_SIZE;
    EXPECT_EQ(GetAslTable(Packet.get()), 0u);
    EXPECT_EQ(Tree.Log(), ErrorBlock("GetAslTable()", "Read table size IOCTL failed", EIO));

    Fake.FailRequest = VELH_IOCTL_TABLE;
    Fake.FailErrno = EFAULT;
    EXPECT_EQ(GetAslTable(Packet.get()), 0u);
    EXPECT_EQ(Tree.Log(), ErrorBlock("GetAslTable()", "Read table size IOCTL failed", EIO) +
                              ErrorBlock("GetAslTable()", "Read table IOCTL failed", EFAULT));
    EXPECT_TRUE(PacketUntouchedFrom(0));
}

TEST_F(SlotDriverTest, MissingDeviceFailsEveryOperation) {
    SysPaths().SlotDriver = Tree.Scratch().Path("no-such-device");
    EXPECT_EQ(GetDriverVersion(), nullptr);
    EXPECT_EQ(GetAslTable(Packet.get()), 0u);
    EXPECT_FALSE(HwSetBlinkState(1, 1));
    EXPECT_TRUE(Fake.Requests.empty());
    const std::string open = "Open \"" + SysPaths().SlotDriver + "\" failed";
    EXPECT_EQ(Tree.Log(), ErrorBlock("GetDriverVersion()", open, ENOENT) +
                              ErrorBlock("GetAslTable()", open, ENOENT) +
                              ErrorBlock("HwSetBlinkState()", open, ENOENT));
}

TEST_F(SlotDriverTest, BlinkRequest) {
    EXPECT_TRUE(HwSetBlinkState(7, 0xFFFFFFFFu));
    EXPECT_EQ(Fake.Requests, (std::vector<unsigned long>{VELH_IOCTL_BLINK}));
    EXPECT_EQ(Fake.Blink.Slot, 7u);
    EXPECT_EQ(Fake.Blink.State, 0xFFFFFFFFu);
    EXPECT_EQ(Tree.Log(), "");

    Fake.FailRequest = VELH_IOCTL_BLINK;
    Fake.FailErrno = EBUSY;
    EXPECT_FALSE(HwSetBlinkState(3, 1));
    EXPECT_EQ(Tree.Log(),
              "velhlib, HwSetBlinkState():  VelhSlot driver call failed" + Errno(EBUSY) + "\n");
}
