// Binds the C library entry points that today's headers reach at versions newer than the oldest
// supported target's C library (glibc 2.2.5 on 32-bit x86, whose newest symbol version is
// GLIBC_2.2.4) to versions that it has and that every later one keeps. The 32-bit build
// force-includes this header in every source of the library and of slotwatch.
#pragma once

#include <sys/stat.h>

#if defined(__i386__) && defined(__GLIBC__)

extern "C" {

// The C99 scanf family is a GLIBC_2.7 alias of the same functions; the formats we pass read
// alike in both.
__asm__(".symver __isoc99_sscanf,sscanf@GLIBC_2.0");

// fcntl became a GLIBC_2.28 symbol when it learnt the 64-bit lock commands; the descriptor flags
// that we set read alike through the original one.
__asm__(".symver fcntl,fcntl@GLIBC_2.0");

// stat64 and its siblings became functions of their own in GLIBC_2.33; before, they were inline
// calls of the versioned __xstat64 family (structure version 3 on 32-bit x86).
int __xstat64(int version, const char* path, struct stat64* status);
int __lxstat64(int version, const char* path, struct stat64* status);
int __fxstat64(int version, int fd, struct stat64* status);
__asm__(".symver __xstat64,__xstat64@GLIBC_2.2");
__asm__(".symver __lxstat64,__lxstat64@GLIBC_2.2");
__asm__(".symver __fxstat64,__fxstat64@GLIBC_2.2");
}

enum { VELH_STAT_VERSION = 3 };

extern "C" inline int stat64(const char* path, struct stat64* status) noexcept {
    return __xstat64(VELH_STAT_VERSION, path, status);
}
extern "C" inline int lstat64(const char* path, struct stat64* status) noexcept {
    return __lxstat64(VELH_STAT_VERSION, path, status);
}
extern "C" inline int fstat64(int fd, struct stat64* status) noexcept {
    return __fxstat64(VELH_STAT_VERSION, fd, status);
}

#endif
