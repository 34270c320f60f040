// The slot driver's ioctl protocol on /dev/velhpdrv: argument records and request codes.
// Shared by the library and the simulator's emulated driver.
#pragma once

#include <linux/ioctl.h>

#include <cstdint>

constexpr const char* VELHPDRV_DEVICE = "/dev/velhpdrv";
constexpr unsigned VELHPDRV_IOC_TYPE = 0xAD;

struct _VELH_VERSION {
    int32_t Major;
    int32_t Minor;
    int32_t Patch;
};

// The address is a user-space pointer, so the record is 8 bytes on the 32-bit target and
// 16 bytes on x86_64, where the size in the request codes follows it.
struct _VELH_TABLE_XFER {
    void* Buffer;
    uint32_t Size;
#if UINTPTR_MAX > 0xFFFFFFFFu
    uint32_t Reserved;
#endif
};

struct _VELH_BLINK {
    uint32_t Slot;
    uint32_t State;
};

constexpr unsigned long VELH_IOCTL_VERSION = _IOR(VELHPDRV_IOC_TYPE, 1, _VELH_VERSION);
constexpr unsigned long VELH_IOCTL_TABLE_SIZE = _IOR(VELHPDRV_IOC_TYPE, 2, _VELH_TABLE_XFER);
constexpr unsigned long VELH_IOCTL_TABLE = _IOR(VELHPDRV_IOC_TYPE, 3, _VELH_TABLE_XFER);
constexpr unsigned long VELH_IOCTL_BLINK = _IOW(VELHPDRV_IOC_TYPE, 4, _VELH_BLINK);

static_assert(sizeof(_VELH_VERSION) == 12, "version record layout");
static_assert(sizeof(_VELH_BLINK) == 8, "blink record layout");
static_assert(VELH_IOCTL_VERSION == 0x800CAD01u, "version request code");
static_assert(VELH_IOCTL_BLINK == 0x4008AD04u, "blink request code");
#if UINTPTR_MAX > 0xFFFFFFFFu
static_assert(sizeof(_VELH_TABLE_XFER) == 16, "table transfer record layout");
static_assert(VELH_IOCTL_TABLE_SIZE == 0x8010AD02u, "table size request code");
static_assert(VELH_IOCTL_TABLE == 0x8010AD03u, "table request code");
#else
static_assert(sizeof(_VELH_TABLE_XFER) == 8, "table transfer record layout");
static_assert(VELH_IOCTL_TABLE_SIZE == 0x8008AD02u, "table size request code");
static_assert(VELH_IOCTL_TABLE == 0x8008AD03u, "table request code");
#endif
