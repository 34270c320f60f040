#include "sources/linhw.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>
#include <new>

#include "diag/hwdebug.h"
#include "diag/progname.h"
#include "filehandle.h"
#include "util/sysaccess.h"
#include "velhpdrv.h"

namespace {

// The slot driver's device, open for the length of one operation.
class DriverDevice {
  public:
    // Opens the device; a failure is reported under `function`.
    explicit DriverDevice(const char* function) {
        const std::string& path = SysPaths().SlotDriver;
        Fd.Reset(open(path.c_str(), O_RDWR));
        if (!Fd) {
            const int32_t error = errno;
            wchar_t widePath[WIDE_BUFFER_CHARS];
            LastErr(&error, function, "Open \"%S\" failed", MakeWideString(path.c_str(), widePath));
        }
    }
    DriverDevice(const DriverDevice&) = delete;
    DriverDevice& operator=(const DriverDevice&) = delete;

    bool IsOpen() const { return static_cast<bool>(Fd); }

    // Sends one request; on failure returns false with errno as the driver left it.
    bool Request(unsigned long request, void* argument) const {
        return SysCalls().Ioctl(Fd.Get(), request, argument) >= 0;
    }

    void Close() { Fd.Reset(); }

  private:
    UniqueFd Fd;
};

// Reports a failed request or allocation with the error number it left.
void ReportFailure(const char* function, const char* message) {
    const int32_t error = errno;
    LastErr(&error, function, message);
}

bool TracingTableRead() {
    return (HwInfoPrintLevel & (RAW_ASL | COOKED_ASL)) != 0;
}

}  // namespace

char* GetDriverVersion() {
    static char version[32];
    DriverDevice device("GetDriverVersion()");
    if (!device.IsOpen()) {
        return nullptr;
    }
    _VELH_VERSION numbers{};
    if (!device.Request(VELH_IOCTL_VERSION, &numbers)) {
        ReportFailure("GetDriverVersion()", "Driver version IOCTL failed");
        return nullptr;
    }
    device.Close();
    // snprintf cuts numbers too long for the buffer and always terminates it.
    std::snprintf(version, sizeof(version), "%d.%d.%d", static_cast<int>(numbers.Major),
                  static_cast<int>(numbers.Minor), static_cast<int>(numbers.Patch));
    return version;
}

uint32_t GetAslTable(_ASL_PACKET* packet) {
    const char* function = "GetAslTable()";
    if (packet == nullptr) {
        return 0;
    }
    DriverDevice device(function);
    if (!device.IsOpen()) {
        return 0;
    }
    if (TracingTableRead()) {
        dbgprint("\n");
        dbgprint("%s, %s:  ", _ProgramName, L"GetAslTable()");
        dbgprint("Calling VelhSlot driver\n");
        dbgprint("\n");
    }

    _VELH_TABLE_XFER transfer{};
    if (!device.Request(VELH_IOCTL_TABLE_SIZE, &transfer)) {
        ReportFailure(function, "Read table size IOCTL failed");
        return 0;
    }
    const uint32_t announced = transfer.Size;
    if (announced == 0) {
        return 0;
    }
    if (announced > ASL_PACKET_CAPACITY) {
        ErrMsg(function, "Table of %u bytes does not fit the %u-byte buffer", announced,
               ASL_PACKET_CAPACITY);
        return 0;
    }

    std::unique_ptr<uint8_t[]> table(new (std::nothrow) uint8_t[announced]());
    if (!table) {
        ReportFailure(function, "malloc() failed");
        return 0;
    }
    transfer.Buffer = table.get();
    if (!device.Request(VELH_IOCTL_TABLE, &transfer)) {
        ReportFailure(function, "Read table IOCTL failed");
        return 0;
    }
    device.Close();

    // The driver may answer a different size the second time; never take more than the buffer
    // it was given holds.
    const uint32_t delivered = transfer.Size;
    const uint32_t size = std::min(delivered, announced);
    if (delivered > announced) {
        ErrMsg(function, "Driver delivered %u bytes into a buffer of %u; the table is cut",
               delivered, announced);
    }
    std::memcpy(packet, table.get(), size);

    if (TracingTableRead()) {
        dbgprint("\n");
        dbgprint("GetAslTable(), buffer size: %d\n", ASL_PACKET_CAPACITY);
        dbgprint("GetAslTable(), got %d bytes from driver\n", delivered);
        dbgprint("\n");
    }
    return size;
}

bool HwSetBlinkState(uint32_t slot, uint32_t state) {
    DriverDevice device("HwSetBlinkState()");
    if (!device.IsOpen()) {
        return false;
    }
    _VELH_BLINK blink{slot, state};
    if (!device.Request(VELH_IOCTL_BLINK, &blink)) {
        // Taken before the log write, which may change errno.
        const int32_t error = errno;
        dbgprint("%s, %s:  ", _ProgramName, L"HwSetBlinkState()");
        LastErrorMsg("VelhSlot driver call failed", &error);
        return false;
    }
    return true;
}
