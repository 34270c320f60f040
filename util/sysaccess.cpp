#include "util/sysaccess.h"

#include <sys/ioctl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>

// Linux 2.4's query_module. C libraries of that era export it; on a modern system an emulation
// may be preloaded, and otherwise the kernel answers ENOSYS.
extern "C" int query_module(const char* name, int which, void* buffer, size_t size, size_t* ret)
    __attribute__((weak));

namespace {

int RealIoctl(int fd, unsigned long request, void* argument) {
    return ioctl(fd, request, argument);
}

int RealQueryModule(const char* name, int which, void* buffer, size_t size, size_t* ret) {
    if (query_module != nullptr) {
        return query_module(name, which, buffer, size, ret);
    }
#ifdef SYS_query_module
    return static_cast<int>(syscall(SYS_query_module, name, which, buffer, size, ret));
#else
    errno = ENOSYS;
    return -1;
#endif
}

int RealUname(struct utsname* name) {
    return uname(name);
}

SystemPaths Paths;
KernelCalls Calls{RealIoctl, RealQueryModule, RealUname};

}  // namespace

SystemPaths& SysPaths() {
    return Paths;
}
KernelCalls& SysCalls() {
    return Calls;
}

void ResetSystemAccess() {
    Paths = SystemPaths{};
    Calls = KernelCalls{RealIoctl, RealQueryModule, RealUname};
}
