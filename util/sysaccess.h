// The one seam through which the Linux layer reaches the system: the paths it reads and the
// kernel calls that a test or a modern machine must be able to replace. The library itself
// never changes them.
#pragma once

#include <sys/utsname.h>

#include <cstddef>
#include <string>

struct SystemPaths {
    std::string ProcBusPci = "/proc/bus/pci";
    std::string Etc = "/etc";
    std::string SysconfigKernel = "/etc/sysconfig/kernel";
    std::string PciIds = "/usr/share/pci.ids";
    // Where current distributions keep the database, looked at when PciIds does not open.
    std::string PciIdsMisc = "/usr/share/misc/pci.ids";
    std::string PciIdsHwdata = "/usr/share/hwdata/pci.ids";
    std::string DevMem = "/dev/mem";
    std::string SlotDriver = "/dev/velhpdrv";
};

struct KernelCalls {
    int (*Ioctl)(int fd, unsigned long request, void* argument);
    int (*QueryModule)(const char* name, int which, void* buffer, size_t size, size_t* ret);
    int (*Uname)(struct utsname* name);
};

SystemPaths& SysPaths();
KernelCalls& SysCalls();
// Puts the system's own paths and the real kernel calls back.
void ResetSystemAccess();
