// The hooks that the launcher preloads into the command and its children. They hand the slot
// driver's device, query_module and uname to the emulation and pass everything else to the C
// library. The run folder comes from VELHSIM_RUN; without it the hooks only pass calls through.
#include <dlfcn.h>
#include <fcntl.h>
#include <sys/utsname.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <optional>
#include <string>

#include "sim/common/textfile.h"
#include "sim/preload/kmodules.h"
#include "sim/preload/slotdriver.h"
#include "velhpdrv.h"

namespace {

// Never destroyed: a hook may still run in another thread while the process exits.
const std::string* RunFolder() {
    static const std::string* run = [] {
        const char* value = std::getenv("VELHSIM_RUN");
        return value != nullptr && *value == '/' ? new std::string(value) : nullptr;
    }();
    return run;
}

template <typename Function>
Function NextSymbol(const char* name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

bool IsDevicePath(const char* path) {
    return path != nullptr && std::strcmp(path, VELHPDRV_DEVICE) == 0;
}

int ModeArgument(int flags, va_list arguments) {
    return (flags & O_CREAT) != 0 || (flags & O_TMPFILE) == O_TMPFILE ? va_arg(arguments, int) : 0;
}

int OpenDevice(int flags) {
    const std::string* run = RunFolder();
    if (run == nullptr) {
        errno = ENOENT;
        return -1;
    }
    return velhsim::DriverOpen(*run, flags);
}

using OpenAtFunction = int (*)(int, const char*, int, ...);
using FopenFunction = FILE* (*)(const char*, const char*);

int OpenAt(int dirfd, const char* path, int flags, int mode) {
    if (IsDevicePath(path)) {
        return OpenDevice(flags);
    }
    static const OpenAtFunction real = NextSymbol<OpenAtFunction>("openat");
    return real(dirfd, path, flags, mode);
}

FILE* OpenStream(const char* path, const char* mode) {
    if (!IsDevicePath(path)) {
        static const FopenFunction real = NextSymbol<FopenFunction>("fopen");
        return real(path, mode);
    }
    const bool readOnly = mode != nullptr && mode[0] == 'r' && std::strchr(mode, '+') == nullptr;
    const int fd = OpenDevice(readOnly ? O_RDONLY : O_RDWR);
    if (fd < 0) {
        return nullptr;
    }
    FILE* stream = fdopen(fd, mode);
    if (stream == nullptr) {
        const int error = errno;
        close(fd);
        errno = error;
    }
    return stream;
}

}  // namespace

// The library is built with hidden visibility; only the hooks are exported.
#define VELHSIM_HOOK __attribute__((visibility("default")))

extern "C" {

VELHSIM_HOOK int open(const char* path, int flags, ...) {
    va_list arguments;
    va_start(arguments, flags);
    const int mode = ModeArgument(flags, arguments);
    va_end(arguments);
    return OpenAt(AT_FDCWD, path, flags, mode);
}

VELHSIM_HOOK int open64(const char* path, int flags, ...) {
    va_list arguments;
    va_start(arguments, flags);
    const int mode = ModeArgument(flags, arguments);
    va_end(arguments);
    return OpenAt(AT_FDCWD, path, flags | O_LARGEFILE, mode);
}

VELHSIM_HOOK int openat(int dirfd, const char* path, int flags, ...) {
    va_list arguments;
    va_start(arguments, flags);
    const int mode = ModeArgument(flags, arguments);
    va_end(arguments);
    return OpenAt(dirfd, path, flags, mode);
}

VELHSIM_HOOK int openat64(int dirfd, const char* path, int flags, ...) {
    va_list arguments;
    va_start(arguments, flags);
    const int mode = ModeArgument(flags, arguments);
    va_end(arguments);
    return OpenAt(dirfd, path, flags | O_LARGEFILE, mode);
}

// The fortified entry points that open() becomes with _FORTIFY_SOURCE.
VELHSIM_HOOK int __open_2(const char* path, int flags) {
    return OpenAt(AT_FDCWD, path, flags, 0);
}
VELHSIM_HOOK int __open64_2(const char* path, int flags) {
    return OpenAt(AT_FDCWD, path, flags | O_LARGEFILE, 0);
}

VELHSIM_HOOK FILE* fopen(const char* path, const char* mode) {
    return OpenStream(path, mode);
}
VELHSIM_HOOK FILE* fopen64(const char* path, const char* mode) {
    return OpenStream(path, mode);
}

VELHSIM_HOOK int ioctl(int fd, unsigned long request, ...) noexcept {
    va_list arguments;
    va_start(arguments, request);
    void* argument = va_arg(arguments, void*);
    va_end(arguments);
    const std::string* run = RunFolder();
    if (run != nullptr && velhsim::IsDriverDescriptor(fd)) {
        return velhsim::DriverIoctl(*run, request, argument);
    }
    using IoctlFunction = int (*)(int, unsigned long, ...);
    static const IoctlFunction real = NextSymbol<IoctlFunction>("ioctl");
    return real(fd, request, argument);
}

VELHSIM_HOOK int uname(struct utsname* name) noexcept {
    using UnameFunction = int (*)(struct utsname*);
    static const UnameFunction real = NextSymbol<UnameFunction>("uname");
    const int result = real(name);
    const std::string* run = RunFolder();
    if (result != 0 || run == nullptr) {
        return result;
    }
    const std::optional<std::string> text =
        velhsim::ReadWholeFile(velhsim::JoinPath(*run, "uname"));
    if (text) {
        const std::vector<std::string_view> lines = velhsim::SplitLines(*text);
        const std::string_view release = lines.empty() ? "" : velhsim::Trim(lines.front());
        const size_t length = std::min(release.size(), sizeof name->release - 1);
        std::memcpy(name->release, release.data(), length);
        name->release[length] = '\0';
    }
    return result;
}

// Linux 2.4's module query, which today's kernels no longer have.
VELHSIM_HOOK int query_module(const char* name, int which, void* buffer, size_t size, size_t* ret) {
    const std::string* run = RunFolder();
    if (run == nullptr) {
        errno = ENOSYS;
        return -1;
    }
    return velhsim::QueryModule(*run, name, which, buffer, size, ret);
}

}  // extern "C"
