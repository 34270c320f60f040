// The firmware's vital product data: GetVPD over a physical-memory image whose BIOS segment
// ends with arbitrary bytes (records that cross the segment's end are the interesting ones).
//
// Input: the last bytes of the segment, at most the whole segment; the bytes before them are 0.
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <vector>

#include "adapters/linvpd.h"
#include "fuzz/fuzzsupport.h"
#include "util/sysaccess.h"

namespace {

int Image = -1;

// Where the first whole record lies in the segment, or -1: what GetVPD must find.
long FirstRecord(const std::vector<uint8_t>& segment) {
    for (size_t at = 0; at + sizeof(_VPD_LAYOUT) <= segment.size(); at++) {
        const uint8_t* p = segment.data() + at;
        if (p[0] == 0xAA && p[1] == 0x55 && p[2] == 'V' && p[3] == 'P' && p[4] == 'D') {
            return static_cast<long>(at);
        }
    }
    return -1;
}

}  // namespace

void SetUpHarness() {
    SysPaths().DevMem = ScratchPath("mem");
    Image = open(SysPaths().DevMem.c_str(), O_RDWR | O_CREAT | O_TRUNC, 0600);
    if (Image < 0 || ftruncate(Image, VPD_SEGMENT_OFFSET + VPD_SEGMENT_SIZE) != 0) {
        Violated("cannot make the memory image");
    }
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    StartInput();
    const size_t taken = std::min<size_t>(size, VPD_SEGMENT_SIZE);
    std::vector<uint8_t> segment(VPD_SEGMENT_SIZE, 0);
    if (taken > 0) {
        std::memcpy(segment.data() + segment.size() - taken, data + size - taken, taken);
    }
    if (pwrite(Image, segment.data(), segment.size(), VPD_SEGMENT_OFFSET) !=
        static_cast<ssize_t>(segment.size())) {
        Violated("cannot write the memory image");
    }

    _VPD_LAYOUT found;
    std::memset(&found, 0x5A, sizeof(found));
    const _VPD_LAYOUT before = found;
    const bool valid = GetVPD(&found);
    const long expected = FirstRecord(segment);
    if (valid != (expected >= 0)) {
        Violated("GetVPD's answer differs from a plain search of the segment");
    }
    if (valid && std::memcmp(&found, segment.data() + expected, sizeof(found)) != 0) {
        Violated("GetVPD copied another record than the first");
    }
    if (!valid && std::memcmp(&found, &before, sizeof(found)) != 0) {
        Violated("GetVPD wrote the record although it found none");
    }
    return 0;
}
