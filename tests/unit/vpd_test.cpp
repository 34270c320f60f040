#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <string>

#include "adapters/linvpd.h"
#include "filehandle.h"
#include "scratchdir.h"
#include "util/sysaccess.h"

namespace {

_VPD_LAYOUT Record(const char* typeModel) {
    _VPD_LAYOUT record;
    std::memset(&record, 0x20, sizeof(record));
    std::memcpy(&record, "\xAA\x55VPD", 5);  // the two header bytes and the signature
    record.VpdLength = 48;
    std::memcpy(record.MachineTypeModel, typeModel, 7);
    record.Checksum = 0x5A;
    return record;
}

class VpdTest : public ::testing::Test {
  protected:
    void SetUp() override {
        TearDown();
        // A sparse memory image that ends with the BIOS segment.
        SysPaths().DevMem = Image = Tree.Scratch().Write("mem", "");
        ASSERT_EQ(truncate(Image.c_str(), VPD_SEGMENT_OFFSET + VPD_SEGMENT_SIZE), 0);
    }
    void TearDown() override {
        ResetSystemAccess();
        ValidVPD = false;
        std::memset(&Vpd, 0, sizeof(Vpd));
    }
    // Writes bytes at an offset within the segment, cut at the image's end.
    void Put(uint32_t offset, const void* bytes, size_t length = sizeof(_VPD_LAYOUT)) {
        UniqueFile image(std::fopen(Image.c_str(), "r+b"));
        ASSERT_NE(image, nullptr);
        length = std::min<size_t>(length, VPD_SEGMENT_SIZE - offset);
        ASSERT_EQ(std::fseek(image.get(), VPD_SEGMENT_OFFSET + offset, SEEK_SET), 0);
        ASSERT_EQ(std::fwrite(bytes, 1, length, image.get()), length);
    }
    // GetVPD finds `record`, or with nullptr none and leaves its output untouched.
    void Expect(const _VPD_LAYOUT* record) {
        _VPD_LAYOUT out, untouched;
        std::memset(&out, 0x11, sizeof(out));
        std::memset(&untouched, 0x11, sizeof(untouched));
        EXPECT_EQ(GetVPD(&out), record != nullptr);
        EXPECT_EQ(ValidVPD, record != nullptr);
        EXPECT_EQ(std::memcmp(&out, record != nullptr ? record : &untouched, sizeof(out)), 0);
    }
    InstallTree Tree;
    std::string Image;
};

TEST_F(VpdTest, TakesTheRecordAtTheLowestOffsetThatFitsWhollyInTheSegmentAndKeepsIt) {
    Expect(nullptr);

    const _VPD_LAYOUT last = Record("1234XYZ");
    Put(VPD_SEGMENT_SIZE - sizeof(_VPD_LAYOUT) + 1, &last);  // its last byte would lie outside
    Expect(nullptr);
    Put(VPD_SEGMENT_SIZE - sizeof(_VPD_LAYOUT), &last);  // exactly the last place that fits
    Expect(&last);

    const _VPD_LAYOUT low = Record("K740AAA"), high = Record("K740BBB");
    Put(0x1234, &low);
    Put(0x8000, &high);
    // Header bytes followed by another signature are no record.
    Put(0x0100, "\xAA\x55VPX", 5);
    Put(0x0200, "\xAA\x54VPD", 5);
    Expect(&low);
    EXPECT_EQ(Tree.Log(), "");  // no message for a missing record

    // A found record stays when a later search fails.
    ASSERT_TRUE(GetVPD(&Vpd));
    SysPaths().DevMem = Tree.Scratch().Path("missing");
    EXPECT_FALSE(GetVPD(&Vpd));
    EXPECT_TRUE(ValidVPD);
    EXPECT_EQ(std::memcmp(&Vpd, &low, sizeof(Vpd)), 0);
    EXPECT_TRUE(Tree.Logged("GetVPD():  error opening memory file " + SysPaths().DevMem))
        << Tree.Log();

    // A short image is a read failure.
    ValidVPD = false;
    SysPaths().DevMem = Image;
    ASSERT_EQ(truncate(Image.c_str(), VPD_SEGMENT_OFFSET + 100), 0);
    Put(0, &low);
    Expect(nullptr);
    EXPECT_TRUE(Tree.Logged("GetVPD():  read failed, got 100 bytes")) << Tree.Log();
}

}  // namespace
