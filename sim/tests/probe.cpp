// velhsim_probe REQUEST [ARG...]: makes the calls of the library's Linux layer for real, so that
// the simulator's tests see what a command under velhsim meets (sim/tests/transcripts): open,
// version, table [CAPACITY], blink SLOT STATE and ioctl REQUEST on the slot driver's device;
// qm NAME|- WHICH SIZE (query_module); uname. Errors print as "error NAME" with errno's name.
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

// One request on the device, saying `done` when it succeeds.
bool Request(const UniqueFd& fd, unsigned long request, void* argument, const char* done) {
    if (!fd || ioctl(fd.Get(), request, argument) != 0) {
        return Error() == 0;
    }
    return std::printf("%s", done) >= 0;
}

int QueryModule(const char* name, int which, size_t capacity) {
    using QueryModuleFunction = int (*)(const char*, int, void*, size_t, size_t*);
    const auto query = reinterpret_cast<QueryModuleFunction>(dlsym(RTLD_DEFAULT, "query_module"));
    std::vector<unsigned long> words(capacity / sizeof(unsigned long) + 1);
    char* buffer = capacity != 0 ? reinterpret_cast<char*>(words.data()) : nullptr;
    size_t ret = 0;
    errno = ENOSYS;
    const int result = query == nullptr ? -1
                                        : query(std::strcmp(name, "-") == 0 ? nullptr : name, which,
                                                buffer, capacity, &ret);
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
    const auto number = [&](int i) {
        return i < argc ? static_cast<uint32_t>(std::strtoul(argv[i], nullptr, 0)) : 0;
    };
    if (command == "qm" && argc == 5) {
        return QueryModule(argv[2], static_cast<int>(number(3)), number(4));
    }
    struct utsname name {};
    if (command == "uname") {
        return uname(&name) != 0 ? Error() : (std::printf("release %s\n", name.release), 0);
    }
    const UniqueFd fd(open(VELHPDRV_DEVICE, O_RDWR));
    _VELH_VERSION version{};
    _VELH_BLINK blink{number(2), number(3)};
    _VELH_TABLE_XFER transfer{};
    int other = 0;
    if (command == "open") {
        return fd ? (std::printf("open ok\n"), 0) : Error();
    }
    if (command == "version") {
        return Request(fd, VELH_IOCTL_VERSION, &version, "version ")
                   ? (std::printf("%d.%d.%d\n", version.Major, version.Minor, version.Patch), 0)
                   : 1;
    }
    if (command == "table") {
        if (!Request(fd, VELH_IOCTL_TABLE_SIZE, &transfer, "size ")) {
            return 1;
        }
        std::printf("%u\n", transfer.Size);
        // One byte more than the driver is told, which shows whether it wrote past the table.
        std::vector<unsigned char> buffer((argc > 2 ? number(2) : transfer.Size) + 1, 0xEE);
        transfer.Size = static_cast<uint32_t>(buffer.size() - 1);
        transfer.Buffer = buffer.data();
        if (!Request(fd, VELH_IOCTL_TABLE, &transfer, "table ")) {
            return 1;
        }
        std::printf("%u ", transfer.Size);
        for (uint32_t i = 0; i <= transfer.Size; ++i) {
            std::printf(i < transfer.Size ? "%02x" : " next %02x\n", buffer[i]);
        }
        return 0;
    }
    if (command == "blink") {
        return Request(fd, VELH_IOCTL_BLINK, &blink, "blink ok\n") ? 0 : 1;
    }
    if (command == "ioctl") {
        return Request(fd, number(2), &other, "ioctl ok\n") ? 0 : 1;
    }
    std::fprintf(stderr, "velhsim_probe: unknown request\n");
    return 2;
}
