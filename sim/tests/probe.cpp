// velhsim_probe: makes the calls of the library's Linux layer for real, so that the simulator's
// tests can see what a command run under velhsim meets. One request per run; results go to
// standard output, errors as "error NAME" with the errno's name.
//
//   open                          open /dev/velhpdrv read-write
//   version                       the version request
//   table [CAPACITY]              the size request, then the table request with a buffer of
//                                 CAPACITY bytes (the size the driver gave, when not given)
//   blink SLOT STATE              the blink request
//   ioctl REQUEST                 an ioctl with another request code
//   qm NAME|- WHICH SIZE          query_module through the symbol that the process has
//   uname                         the kernel release
#include <dlfcn.h>
#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/utsname.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "filehandle.h"
#include "velhpdrv.h"

namespace {

int Error() {
    const char* name = strerrorname_np(errno);
    std::printf("error %s\n", name != nullptr ? name : std::to_string(errno).c_str());
    return 1;
}

unsigned long Number(const char* text) {
    return std::strtoul(text, nullptr, 0);
}

UniqueFd OpenDevice() {
    return UniqueFd(open(VELHPDRV_DEVICE, O_RDWR));
}

int Version() {
    const UniqueFd fd = OpenDevice();
    _VELH_VERSION version{};
    if (!fd || ioctl(fd.Get(), VELH_IOCTL_VERSION, &version) != 0) {
        return Error();
    }
    std::printf("version %d.%d.%d\n", version.Major, version.Minor, version.Patch);
    return 0;
}

int Table(const char* capacity) {
    const UniqueFd fd = OpenDevice();
    _VELH_TABLE_XFER transfer{};
    if (!fd || ioctl(fd.Get(), VELH_IOCTL_TABLE_SIZE, &transfer) != 0) {
        return Error();
    }
    std::printf("size %u\n", transfer.Size);
    if (capacity != nullptr) {
        transfer.Size = static_cast<uint32_t>(Number(capacity));
    }
    std::vector<unsigned char> buffer(transfer.Size + 1, 0xEE);
    transfer.Buffer = buffer.data();
    if (ioctl(fd.Get(), VELH_IOCTL_TABLE, &transfer) != 0) {
        return Error();
    }
    std::printf("table %u ", transfer.Size);
    for (uint32_t i = 0; i < transfer.Size; ++i) {
        std::printf("%02x", buffer[i]);
    }
    // The byte after the table shows whether the driver wrote past it.
    std::printf(" next %02x\n", buffer[transfer.Size]);
    return 0;
}

int Blink(const char* slot, const char* state) {
    const UniqueFd fd = OpenDevice();
    _VELH_BLINK blink{static_cast<uint32_t>(Number(slot)), static_cast<uint32_t>(Number(state))};
    if (!fd || ioctl(fd.Get(), VELH_IOCTL_BLINK, &blink) != 0) {
        return Error();
    }
    std::printf("blink ok\n");
    return 0;
}

int OtherIoctl(const char* request) {
    const UniqueFd fd = OpenDevice();
    int argument = 0;
    if (!fd || ioctl(fd.Get(), Number(request), &argument) != 0) {
        return Error();
    }
    std::printf("ioctl ok\n");
    return 0;
}

void PrintNames(const char* buffer, size_t count) {
    if (buffer == nullptr) {
        return;
    }
    for (size_t i = 0; i < count; ++i) {
        std::printf("name %s\n", buffer);
        buffer += std::strlen(buffer) + 1;
    }
}

int QueryModule(const char* name, const char* which, const char* size) {
    using QueryModuleFunction = int (*)(const char*, int, void*, size_t, size_t*);
    const auto query = reinterpret_cast<QueryModuleFunction>(dlsym(RTLD_DEFAULT, "query_module"));
    if (query == nullptr) {
        std::printf("no query_module\n");
        return 1;
    }
    const int request = static_cast<int>(Number(which));
    const size_t capacity = Number(size);
    std::vector<unsigned long> words(capacity / sizeof(unsigned long) + 1);
    char* buffer = capacity != 0 ? reinterpret_cast<char*>(words.data()) : nullptr;
    size_t ret = 0;
    const int result =
        query(std::strcmp(name, "-") == 0 ? nullptr : name, request, buffer, capacity, &ret);
    if (result != 0) {
        const int error = errno;
        std::printf("ret %zu\n", ret);
        errno = error;
        return Error();
    }
    std::printf("ret %zu\n", ret);
    if (request == 4) {
        for (size_t i = 0; i < ret; ++i) {
            std::printf("symbol %lx %s\n", words[2 * i], buffer + words[2 * i + 1]);
        }
    } else if (request == 5) {
        std::printf("info %lx %lx %lx %ld\n", words[0], words[1], words[2],
                    static_cast<long>(words[3]));
    } else if (request >= 1 && request <= 3) {
        PrintNames(buffer, ret);
    }
    return 0;
}

int Uname() {
    struct utsname name {};
    if (uname(&name) != 0) {
        return Error();
    }
    std::printf("release %s\n", name.release);
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    const std::string command = argc > 1 ? argv[1] : "";
    if (command == "open" && argc == 2) {
        const UniqueFd fd = OpenDevice();
        return fd ? (std::printf("open ok\n"), 0) : Error();
    }
    if (command == "version" && argc == 2) {
        return Version();
    }
    if (command == "table" && (argc == 2 || argc == 3)) {
        return Table(argc == 3 ? argv[2] : nullptr);
    }
    if (command == "blink" && argc == 4) {
        return Blink(argv[2], argv[3]);
    }
    if (command == "ioctl" && argc == 3) {
        return OtherIoctl(argv[2]);
    }
    if (command == "qm" && argc == 5) {
        return QueryModule(argv[2], argv[3], argv[4]);
    }
    if (command == "uname" && argc == 2) {
        return Uname();
    }
    std::fprintf(stderr, "velhsim_probe: unknown request\n");
    return 2;
}
