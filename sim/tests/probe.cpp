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

// One request on the open device, saying `done` when it succeeds.
int Request(const UniqueFd& fd, unsigned long request, void* argument, const char* done) {
    if (!fd || ioctl(fd.Get(), request, argument) != 0) {
        return Error();
    }
    std::printf("%s", done);
    return 0;
}

uint32_t Number(const char* text) {
    return static_cast<uint32_t>(std::strtoul(text, nullptr, 0));
}

int Table(int fd, const char* capacity) {
    _VELH_TABLE_XFER transfer{};
    if (ioctl(fd, VELH_IOCTL_TABLE_SIZE, &transfer) != 0) {
        return Error();
    }
    std::printf("size %u\n", transfer.Size);
    transfer.Size = capacity != nullptr ? Number(capacity) : transfer.Size;
    std::vector<unsigned char> buffer(transfer.Size + 1, 0xEE);
    transfer.Buffer = buffer.data();
    if (ioctl(fd, VELH_IOCTL_TABLE, &transfer) != 0) {
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

int QueryModule(const char* name, int which, size_t capacity) {
    using QueryModuleFunction = int (*)(const char*, int, void*, size_t, size_t*);
    const auto query = reinterpret_cast<QueryModuleFunction>(dlsym(RTLD_DEFAULT, "query_module"));
    if (query == nullptr) {
        std::printf("no query_module\n");
        return 1;
    }
    std::vector<unsigned long> words(capacity / sizeof(unsigned long) + 1);
    char* buffer = capacity != 0 ? reinterpret_cast<char*>(words.data()) : nullptr;
    size_t ret = 0;
    const int result =
        query(std::strcmp(name, "-") == 0 ? nullptr : name, which, buffer, capacity, &ret);
    const int error = errno;
    std::printf("ret %zu\n", ret);
    errno = error;
    if (result != 0) {
        return Error();
    }
    for (size_t i = 0; which == 4 && i < ret; ++i) {
        std::printf("symbol %lx %s\n", words[2 * i], buffer + words[2 * i + 1]);
    }
    if (which == 5) {
        std::printf("info %lx %lx %lx %ld\n", words[0], words[1], words[2],
                    static_cast<long>(words[3]));
    }
    for (size_t i = 0; which >= 1 && which <= 3 && buffer != nullptr && i < ret; ++i) {
        std::printf("name %s\n", buffer);
        buffer += std::strlen(buffer) + 1;
    }
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    const std::string command = argc > 1 ? argv[1] : "";
    if (command == "qm" && argc == 5) {
        return QueryModule(argv[2], static_cast<int>(Number(argv[3])), Number(argv[4]));
    }
    if (command == "uname" && argc == 2) {
        struct utsname name {};
        return uname(&name) != 0 ? Error() : (std::printf("release %s\n", name.release), 0);
    }
    const UniqueFd fd(open(VELHPDRV_DEVICE, O_RDWR));
    if (command == "open" && argc == 2) {
        return fd ? (std::printf("open ok\n"), 0) : Error();
    }
    if (command == "version" && argc == 2) {
        _VELH_VERSION version{};
        const int failed = Request(fd, VELH_IOCTL_VERSION, &version, "version ");
        return failed != 0
                   ? failed
                   : (std::printf("%d.%d.%d\n", version.Major, version.Minor, version.Patch), 0);
    }
    if (command == "table" && (argc == 2 || argc == 3)) {
        return fd ? Table(fd.Get(), argc == 3 ? argv[2] : nullptr) : Error();
    }
    if (command == "blink" && argc == 4) {
        _VELH_BLINK blink{Number(argv[2]), Number(argv[3])};
        return Request(fd, VELH_IOCTL_BLINK, &blink, "blink ok\n");
    }
    if (command == "ioctl" && argc == 3) {
        int other = 0;
        return Request(fd, Number(argv[2]), &other, "ioctl ok\n");
    }
    std::fprintf(stderr, "velhsim_probe: unknown request\n");
    return 2;
}
