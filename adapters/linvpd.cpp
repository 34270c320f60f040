#include "adapters/linvpd.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <new>

#include "diag/hwdebug.h"
#include "filehandle.h"
#include "util/sysaccess.h"

_VPD_LAYOUT Vpd;
bool ValidVPD = false;

namespace {

bool IsRecordAt(const uint8_t* at) {
    return at[0] == 0xAA && at[1] == 0x55 && std::memcmp(at + 2, "VPD", 3) == 0;
}

}  // namespace

bool GetVPD(_VPD_LAYOUT* vpd) {
    if (vpd == nullptr) {
        return false;
    }
    std::unique_ptr<uint8_t[]> segment(new (std::nothrow) uint8_t[VPD_SEGMENT_SIZE]);
    if (segment == nullptr) {
        LastErr(nullptr, "GetVPD()", "malloc failed, size 0x%08x\n", VPD_SEGMENT_SIZE);
        return false;
    }
    const char* device = SysPaths().DevMem.c_str();
    const UniqueFd memory(open(device, O_RDONLY));
    if (memory.Get() < 0) {
        LastErr(nullptr, "GetVPD()", "error opening memory file %S\n",
                MakeWideString(device, WideBuffer));
        return false;
    }
    if (lseek(memory.Get(), VPD_SEGMENT_OFFSET, SEEK_SET) !=
        static_cast<off_t>(VPD_SEGMENT_OFFSET)) {
        LastErr(nullptr, "GetVPD()", "seek error, offset 0x%08x\n", VPD_SEGMENT_OFFSET);
        return false;
    }
    int32_t got = ReadFully(memory.Get(), segment.get(), VPD_SEGMENT_SIZE);
    if (got != static_cast<int32_t>(VPD_SEGMENT_SIZE)) {
        LastErr(nullptr, "GetVPD()", "read failed, got %d bytes\n", got);
        return false;
    }

    // Only start positions that leave room for a whole record are tried.
    for (uint32_t at = 0; at + sizeof(_VPD_LAYOUT) <= VPD_SEGMENT_SIZE; at++) {
        if (IsRecordAt(segment.get() + at)) {
            std::memcpy(vpd, segment.get() + at, sizeof(_VPD_LAYOUT));
            ValidVPD = true;
            return true;
        }
    }
    return false;
}
