// The firmware's vital product data: GetVPD over a physical-memory image whose BIOS segment
// ends with arbitrary bytes (records that cross the segment's end are the interesting ones).
//
// Input: the last bytes of the segment, at most the whole segment; the bytes before them are 0.
#include <fcntl.h>
#include <unistd.h>

#include "adapters/linvpd.h"
#include "fuzz/fuzzsupport.h"

static int Image = -1;

void SetUpHarness() {
    SysPaths().DevMem = ScratchPath("mem");
    Image = open(SysPaths().DevMem.c_str(), O_RDWR | O_CREAT | O_TRUNC, 0600);
    Check(Image >= 0 && ftruncate(Image, VPD_SEGMENT_OFFSET + VPD_SEGMENT_SIZE) == 0,
          "cannot make the memory image");
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const InputScope input;
    const size_t taken = std::min<size_t>(size, VPD_SEGMENT_SIZE);
    std::vector<uint8_t> segment(VPD_SEGMENT_SIZE - taken, 0);
    segment.insert(segment.end(), data + size - taken, data + size);
    Check(pwrite(Image, segment.data(), segment.size(), VPD_SEGMENT_OFFSET) ==
              static_cast<ssize_t>(segment.size()),
          "cannot write the memory image");
    _VPD_LAYOUT found;
    std::memset(&found, 0x5A, sizeof(found));
    const _VPD_LAYOUT before = found;
    const bool valid = GetVPD(&found);
    // What GetVPD must find: the first whole record in the segment.
    const uint8_t signature[] = {0xAA, 0x55, 'V', 'P', 'D'};
    const auto last = segment.end() - sizeof(_VPD_LAYOUT) + 1;
    const auto record = std::search(segment.begin(), segment.end(), signature, signature + 5);
    Check(valid == (record < last), "GetVPD's answer differs from a plain search of the segment");
    Check(!valid || std::memcmp(&found, &*record, sizeof(found)) == 0,
          "GetVPD copied another record than the first");
    Check(valid || std::memcmp(&found, &before, sizeof(found)) == 0,
          "GetVPD wrote the record although it found none");
    return 0;
}
