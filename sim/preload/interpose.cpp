// The hooks that the launcher preloads into the command and its children. They hand the slot
// driver's device, query_module and uname to the emulation and pass everything else to the C
// library. The run folder comes from VELHSIM_RUN; without it the hooks only pass calls through.
// With VELHSIM_FAULT set they also fail the calls that a sweep asks for (sim/preload/faults.h).
#include <dirent.h>
#include <dlfcn.h>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
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
#include "sim/preload/faults.h"
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

int OpenDevice(int flags, const void* caller) {
    const std::string* run = RunFolder();
    if (run == nullptr) {
        errno = ENOENT;
        return -1;
    }
    return velhsim::DriverOpen(*run, flags, caller);
}

using OpenAtFunction = int (*)(int, const char*, int, ...);
using FopenFunction = FILE* (*)(const char*, const char*);
using ReadFunction = ssize_t (*)(int, void*, size_t);
using ForkFunction = pid_t (*)();

// Resolved at load: the fork hooks also run in a child, where the loader's lock may be held.
const ForkFunction realFork = NextSymbol<ForkFunction>("fork");
const ForkFunction realChildFork = NextSymbol<ForkFunction>("_Fork");

// The short-file fault: a regular file that the library opens for reading is replaced by a
// memory file with the first half of its bytes. Returns that file's descriptor, or -1 when this
// opening keeps its file.
int ShortCopy(int fd, int flags, const void* caller) {
    struct stat info {};
    if ((flags & O_ACCMODE) != O_RDONLY || fstat(fd, &info) != 0 || !S_ISREG(info.st_mode) ||
        !velhsim::CallFails(velhsim::FaultKind::Short, caller)) {
        return -1;
    }
    const int half = memfd_create("velhsim-short", (flags & O_CLOEXEC) != 0 ? MFD_CLOEXEC : 0);
    std::string bytes(static_cast<size_t>(info.st_size) / 2, '\0');
    const ssize_t got = half < 0 ? -1 : pread(fd, bytes.data(), bytes.size(), 0);
    if (got < 0 || write(half, bytes.data(), static_cast<size_t>(got)) != got ||
        lseek(half, 0, SEEK_SET) != 0) {
        std::fprintf(stderr, "velhsim: short file: %s\n", std::strerror(errno));
        if (half >= 0) {
            close(half);
        }
        return -1;
    }
    return half;
}

int OpenAt(int dirfd, const char* path, int flags, int mode, const void* caller) {
    int fd = -1;
    if (IsDevicePath(path)) {
        fd = OpenDevice(flags, caller);
    } else {
        static const OpenAtFunction real = NextSymbol<OpenAtFunction>("openat");
        fd = real(dirfd, path, flags, mode);
        const int half =
            fd >= 0 && velhsim::FromLibrary(caller) ? ShortCopy(fd, flags, caller) : -1;
        if (half >= 0) {
            close(fd);
            fd = half;
        }
    }
    if (velhsim::FromLibrary(caller)) {
        velhsim::NoteLibraryDescriptor(fd);
    }
    return fd;
}

FILE* OpenStream(const char* path, const char* mode, const void* caller) {
    const bool readOnly = mode != nullptr && mode[0] == 'r' && std::strchr(mode, '+') == nullptr;
    FILE* stream = nullptr;
    if (!IsDevicePath(path)) {
        static const FopenFunction real = NextSymbol<FopenFunction>("fopen");
        stream = real(path, mode);
        if (stream == nullptr || !velhsim::FromLibrary(caller)) {
            return stream;
        }
        const int half = ShortCopy(fileno(stream), readOnly ? O_RDONLY : O_RDWR, caller);
        if (half < 0) {
            velhsim::NoteLibraryDescriptor(fileno(stream));
            return stream;
        }
        fclose(stream);
        stream = fdopen(half, mode);
        if (stream == nullptr) {
            close(half);
        }
    } else {
        const int fd = OpenDevice(readOnly ? O_RDONLY : O_RDWR, caller);
        stream = fd < 0 ? nullptr : fdopen(fd, mode);
        if (fd >= 0 && stream == nullptr) {
            const int error = errno;
            close(fd);
            errno = error;
        }
    }
    if (stream != nullptr && velhsim::FromLibrary(caller)) {
        velhsim::NoteLibraryDescriptor(fileno(stream));
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
    return OpenAt(AT_FDCWD, path, flags, mode, __builtin_return_address(0));
}

VELHSIM_HOOK int open64(const char* path, int flags, ...) {
    va_list arguments;
    va_start(arguments, flags);
    const int mode = ModeArgument(flags, arguments);
    va_end(arguments);
    return OpenAt(AT_FDCWD, path, flags | O_LARGEFILE, mode, __builtin_return_address(0));
}

VELHSIM_HOOK int openat(int dirfd, const char* path, int flags, ...) {
    va_list arguments;
    va_start(arguments, flags);
    const int mode = ModeArgument(flags, arguments);
    va_end(arguments);
    return OpenAt(dirfd, path, flags, mode, __builtin_return_address(0));
}

VELHSIM_HOOK int openat64(int dirfd, const char* path, int flags, ...) {
    va_list arguments;
    va_start(arguments, flags);
    const int mode = ModeArgument(flags, arguments);
    va_end(arguments);
    return OpenAt(dirfd, path, flags | O_LARGEFILE, mode, __builtin_return_address(0));
}

// The fortified entry points that open() becomes with _FORTIFY_SOURCE.
VELHSIM_HOOK int __open_2(const char* path, int flags) {
    return OpenAt(AT_FDCWD, path, flags, 0, __builtin_return_address(0));
}
VELHSIM_HOOK int __open64_2(const char* path, int flags) {
    return OpenAt(AT_FDCWD, path, flags | O_LARGEFILE, 0, __builtin_return_address(0));
}

VELHSIM_HOOK FILE* fopen(const char* path, const char* mode) {
    return OpenStream(path, mode, __builtin_return_address(0));
}
VELHSIM_HOOK FILE* fopen64(const char* path, const char* mode) {
    return OpenStream(path, mode, __builtin_return_address(0));
}

VELHSIM_HOOK int ioctl(int fd, unsigned long request, ...) noexcept {
    va_list arguments;
    va_start(arguments, request);
    void* argument = va_arg(arguments, void*);
    va_end(arguments);
    const std::string* run = RunFolder();
    if (run != nullptr && velhsim::IsDriverDescriptor(fd)) {
        return velhsim::DriverIoctl(*run, request, argument, __builtin_return_address(0));
    }
    using IoctlFunction = int (*)(int, unsigned long, ...);
    static const IoctlFunction real = NextSymbol<IoctlFunction>("ioctl");
    return real(fd, request, argument);
}

VELHSIM_HOOK int uname(struct utsname* name) noexcept {
    if (velhsim::CallFails(velhsim::FaultKind::Uname, __builtin_return_address(0))) {
        errno = EFAULT;
        return -1;
    }
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
    const void* caller = __builtin_return_address(0);
    if (velhsim::CallFails(velhsim::FaultKind::QueryModule, caller)) {
        errno = ENOENT;
        return -1;
    }
    if (buffer != nullptr && velhsim::CallFails(velhsim::FaultKind::ModuleGrowth, caller)) {
        size_t needed = 0;
        velhsim::QueryModule(*run, name, which, nullptr, 0, &needed);
        if (ret != nullptr) {
            *ret = std::max(needed, size) + 64;
        }
        errno = ENOSPC;
        return -1;
    }
    return velhsim::QueryModule(*run, name, which, buffer, size, ret);
}

// The remaining hooks only fail calls for a sweep; otherwise they pass every call through.

VELHSIM_HOOK ssize_t read(int fd, void* buffer, size_t count) {
    static const ReadFunction real = NextSymbol<ReadFunction>("read");
    if (velhsim::CallFails(velhsim::FaultKind::Partial, __builtin_return_address(0))) {
        count = std::max<size_t>(count / 2, 1);
    }
    return real(fd, buffer, count);
}

VELHSIM_HOOK char* getcwd(char* buffer, size_t size) noexcept {
    using GetcwdFunction = char* (*)(char*, size_t);
    static const GetcwdFunction real = NextSymbol<GetcwdFunction>("getcwd");
    if (velhsim::CallFails(velhsim::FaultKind::Getcwd, __builtin_return_address(0))) {
        errno = ENOMEM;
        return nullptr;
    }
    return real(buffer, size);
}

using Dirent64Filter = int (*)(const struct dirent64*);
using Dirent64Compare = int (*)(const struct dirent64**, const struct dirent64**);
VELHSIM_HOOK int scandir64(const char* directory, struct dirent64*** list, Dirent64Filter filter,
                           Dirent64Compare compare) {
    using ScandirFunction =
        int (*)(const char*, struct dirent64***, Dirent64Filter, Dirent64Compare);
    static const ScandirFunction real = NextSymbol<ScandirFunction>("scandir64");
    if (velhsim::CallFails(velhsim::FaultKind::Scandir, __builtin_return_address(0))) {
        errno = ENOMEM;
        return -1;
    }
    return real(directory, list, filter, compare);
}

VELHSIM_HOOK pid_t fork() noexcept {
    if (velhsim::CallFails(velhsim::FaultKind::Fork, __builtin_return_address(0))) {
        errno = EAGAIN;
        return -1;
    }
    return realFork();
}

VELHSIM_HOOK pid_t _Fork() noexcept {
    if (velhsim::CallFails(velhsim::FaultKind::Fork, __builtin_return_address(0))) {
        errno = EAGAIN;
        return -1;
    }
    return realChildFork();
}

VELHSIM_HOOK int execlp(const char* file, const char* argument, ...) noexcept {
    constexpr size_t MAX_ARGUMENTS = 64;
    const char* arguments[MAX_ARGUMENTS + 1] = {argument};
    size_t count = 1;
    va_list rest;
    va_start(rest, argument);
    while (count < MAX_ARGUMENTS && (arguments[count] = va_arg(rest, const char*)) != nullptr) {
        ++count;
    }
    va_end(rest);
    arguments[count] = nullptr;
    if (velhsim::CallFails(velhsim::FaultKind::Exec, __builtin_return_address(0))) {
        errno = ENOENT;
        return -1;
    }
    return execvp(file, const_cast<char* const*>(arguments));
}

}  // extern "C"
