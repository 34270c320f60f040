#include "sim/preload/faults.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <link.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iterator>

namespace velhsim {

namespace {

constexpr const char* KIND_NAMES[] = {"driver", "query_module", "module_growth", "uname",
                                      "getcwd", "scandir",      "fork",          "exec",
                                      "short",  "partial"};
static_assert(std::size(KIND_NAMES) == static_cast<size_t>(FaultKind::Count));

constexpr const char* LIBRARY_NAME = "libvelhlib";

struct Settings {
    bool On = false;
    // The kind and call number to fail; Kind -1 only counts.
    int Kind = -1;
    uint32_t Point = 0;
    // The process that checks its descriptors at exit: the one that loaded the preload first.
    pid_t Owner = 0;
    char Log[4096] = {};
    // Call counts, in memory that forked children share, so that a call in the child of a
    // launch counts in the same life.
    uint32_t* Calls = nullptr;
};

Settings settings;

// The library's descriptors, with what each pointed at when opened.
struct Tracked {
    int Fd;
    char Target[256];
};
constexpr int MAX_TRACKED = 512;
Tracked tracked[MAX_TRACKED];
int trackedCount = 0;

// Raw system calls: these also run in a child between fork and exec, where the preload's own
// open hook and the C library's locks are not to be relied on.
void Append(const char* text) {
    const int fd = static_cast<int>(syscall(SYS_openat, AT_FDCWD, settings.Log,
                                            O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC, 0644));
    if (fd >= 0) {
        syscall(SYS_write, fd, text, std::strlen(text));
        syscall(SYS_close, fd);
    }
}

// What the descriptor points at, or an empty text.
void Target(int fd, char* target, size_t size) {
    char link[64];
    std::snprintf(link, sizeof link, "/proc/self/fd/%d", fd);
    const ssize_t length = readlink(link, target, size - 1);
    target[length > 0 ? length : 0] = '\0';
}

bool ParseFault(const char* fault) {
    if (std::strcmp(fault, "count") == 0) {
        return true;
    }
    const char* colon = std::strchr(fault, ':');
    if (colon == nullptr) {
        return false;
    }
    for (size_t i = 0; i < std::size(KIND_NAMES); ++i) {
        const size_t length = std::strlen(KIND_NAMES[i]);
        if (static_cast<size_t>(colon - fault) == length &&
            std::strncmp(fault, KIND_NAMES[i], length) == 0) {
            char* end = nullptr;
            const unsigned long point = std::strtoul(colon + 1, &end, 10);
            if (*end != '\0' || point == 0 || point > UINT32_MAX) {
                return false;
            }
            settings.Kind = static_cast<int>(i);
            settings.Point = static_cast<uint32_t>(point);
            return true;
        }
    }
    return false;
}

__attribute__((constructor)) void StartFaults() {
    const char* fault = std::getenv("VELHSIM_FAULT");
    const char* run = std::getenv("VELHSIM_RUN");
    if (fault == nullptr || *fault == '\0' || run == nullptr || *run != '/') {
        return;
    }
    if (!ParseFault(fault)) {
        std::fprintf(stderr,
                     "velhsim: VELHSIM_FAULT=%s: not \"count\" or KIND:N with N from 1 (kinds: "
                     "driver query_module module_growth uname getcwd scandir fork exec short "
                     "partial)\n",
                     fault);
        return;
    }
    void* shared = mmap(nullptr, sizeof(uint32_t) * std::size(KIND_NAMES), PROT_READ | PROT_WRITE,
                        MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    if (shared == MAP_FAILED) {
        std::perror("velhsim: fault counters");
        return;
    }
    settings.Calls = static_cast<uint32_t*>(shared);
    std::snprintf(settings.Log, sizeof settings.Log, "%s/faults.log", run);
    settings.Owner = getpid();
    settings.On = true;
}

__attribute__((destructor)) void CheckDescriptors() {
    if (!settings.On || getpid() != settings.Owner) {
        return;
    }
    for (int i = 0; i < trackedCount; ++i) {
        char now[sizeof tracked[i].Target];
        Target(tracked[i].Fd, now, sizeof now);
        if (now[0] != '\0' && std::strcmp(now, tracked[i].Target) == 0) {
            char line[sizeof now + 32];
            std::snprintf(line, sizeof line, "leak %d %s\n", tracked[i].Fd, now);
            Append(line);
        }
    }
}

}  // namespace

bool FromLibrary(const void* caller) {
    if (!settings.On) {
        return false;
    }
    dl_find_object found{};
    if (_dl_find_object(const_cast<void*>(caller), &found) != 0 || found.dlfo_link_map == nullptr ||
        found.dlfo_link_map->l_name == nullptr) {
        return false;
    }
    const char* name = found.dlfo_link_map->l_name;
    const char* slash = std::strrchr(name, '/');
    return std::strncmp(slash != nullptr ? slash + 1 : name, LIBRARY_NAME,
                        std::strlen(LIBRARY_NAME)) == 0;
}

bool CallFails(FaultKind kind, const void* caller) {
    if (!FromLibrary(caller)) {
        return false;
    }
    const auto index = static_cast<size_t>(kind);
    const uint32_t number = __atomic_add_fetch(&settings.Calls[index], 1, __ATOMIC_SEQ_CST);
    const bool fails = static_cast<int>(index) == settings.Kind && number == settings.Point;
    char line[64];
    std::snprintf(line, sizeof line, "%s %u%s\n", KIND_NAMES[index], number,
                  fails ? " failed" : "");
    Append(line);
    return fails;
}

void NoteLibraryDescriptor(int fd) {
    if (!settings.On || fd < 0) {
        return;
    }
    int slot = 0;
    while (slot < trackedCount && tracked[slot].Fd != fd) {
        ++slot;
    }
    if (slot == trackedCount) {
        if (trackedCount == MAX_TRACKED) {
            return;
        }
        ++trackedCount;
    }
    tracked[slot].Fd = fd;
    Target(fd, tracked[slot].Target, sizeof tracked[slot].Target);
}

}  // namespace velhsim
