// The emulated hot-plug slot driver behind /dev/velhpdrv, answered from the run folder's driver/:
// "version" (three numbers), "asl.bin" (the table it hands out), "blink.log" (one "SLOT STATE" line
// per blink request), "requests.log" (written: one line per request received, failed or not:
// "open", "version", "size", "table", "blink SLOT STATE" or "ioctl 0xCODE") and "fail" (requests
// that are to fail, one per line: a request name, open, version, size, table or blink, and
// optionally the errno name or number to fail with, EIO when none is given). The files are read at
// every request, so a test may change them while the command runs.
#pragma once

#include <optional>
#include <string>

namespace velhsim {

// Opens the device: a descriptor, or -1 with errno (ENOENT when the machine has no driver).
// caller is the return address of the hook, for the fault sweep (faults.h).
int DriverOpen(const std::string& run, int flags, const void* caller);
// Whether fd is a descriptor that DriverOpen handed out.
bool IsDriverDescriptor(int fd);
// One ioctl request on the device: 0, or -1 with errno.
int DriverIoctl(const std::string& run, unsigned long request, void* argument, const void* caller);

// The errno that driver/fail assigns to the request, if it names it.
std::optional<int> InjectedFailure(const std::string& run, const std::string& request);

}  // namespace velhsim
