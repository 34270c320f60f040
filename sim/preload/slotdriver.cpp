#include "sim/preload/slotdriver.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <limits>

#include "sim/common/textfile.h"
#include "sim/preload/faults.h"
#include "velhpdrv.h"

namespace velhsim {

namespace {

// The memory file that stands for an open device carries this name, which is how the ioctl hook
// recognises its descriptors even after the command has closed and reused others.
constexpr const char* DEVICE_FILE_NAME = "velhpdrv";

std::string DriverFile(const std::string& run, const char* name) {
    return JoinPath(JoinPath(run, "driver"), name);
}

struct ErrnoName {
    const char* Name;
    int Value;
};

constexpr ErrnoName ERRNO_NAMES[] = {
    {"EPERM", EPERM},   {"ENOENT", ENOENT}, {"EIO", EIO},       {"ENXIO", ENXIO},
    {"EFAULT", EFAULT}, {"EBUSY", EBUSY},   {"ENODEV", ENODEV}, {"EINVAL", EINVAL},
    {"ENOMEM", ENOMEM}, {"EACCES", EACCES}, {"ENOTTY", ENOTTY}, {"EAGAIN", EAGAIN},
};

std::optional<int> ParseErrno(const std::string& text) {
    for (const ErrnoName& entry : ERRNO_NAMES) {
        if (text == entry.Name) {
            return entry.Value;
        }
    }
    const std::optional<uint64_t> number = ParseNumber(text);
    if (number && *number > 0 && *number < 4096) {
        return static_cast<int>(*number);
    }
    return std::nullopt;
}

int Fail(int error) {
    errno = error;
    return -1;
}

// Three numbers separated by dots or blanks, as "1.0.0" or "1 0 0".
std::optional<_VELH_VERSION> ReadVersion(const std::string& run) {
    const std::optional<std::string> text = ReadWholeFile(DriverFile(run, "version"));
    if (!text) {
        return std::nullopt;
    }
    std::string spaced(StripComment(*text));
    for (char& c : spaced) {
        if (c == '.') {
            c = ' ';
        }
    }
    const std::vector<std::string> words = SplitWords(spaced);
    if (words.size() != 3) {
        return std::nullopt;
    }
    int32_t numbers[3] = {};
    for (size_t i = 0; i < 3; ++i) {
        const std::optional<uint64_t> value = ParseNumber(words[i]);
        if (!value || *value > static_cast<uint64_t>(std::numeric_limits<int32_t>::max())) {
            return std::nullopt;
        }
        numbers[i] = static_cast<int32_t>(*value);
    }
    return _VELH_VERSION{numbers[0], numbers[1], numbers[2]};
}

int AnswerVersion(const std::string& run, void* argument) {
    const std::optional<_VELH_VERSION> version = ReadVersion(run);
    if (!version) {
        std::fprintf(stderr, "velhsim: %s: no three version numbers\n",
                     DriverFile(run, "version").c_str());
        return Fail(EIO);
    }
    std::memcpy(argument, &*version, sizeof(*version));
    return 0;
}

// A driver without a table answers size 0.
std::string ReadTable(const std::string& run) {
    return ReadWholeFile(DriverFile(run, "asl.bin")).value_or(std::string());
}

int AnswerTableSize(const std::string& run, _VELH_TABLE_XFER* transfer) {
    const std::string table = ReadTable(run);
    if (table.size() > std::numeric_limits<uint32_t>::max()) {
        return Fail(EFBIG);
    }
    transfer->Size = static_cast<uint32_t>(table.size());
    return 0;
}

int AnswerTable(const std::string& run, _VELH_TABLE_XFER* transfer) {
    const std::string table = ReadTable(run);
    if (transfer->Size < table.size()) {
        return Fail(EINVAL);
    }
    if (transfer->Buffer == nullptr && !table.empty()) {
        return Fail(EFAULT);
    }
    if (!table.empty()) {
        std::memcpy(transfer->Buffer, table.data(), table.size());
    }
    transfer->Size = static_cast<uint32_t>(table.size());
    return 0;
}

// Appends one line with a single write, so that lines of concurrent requests do not mix.
bool AppendLine(const std::string& path, const std::string& line) {
    const int fd = ::open(path.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    if (fd < 0) {
        return false;
    }
    const std::string text = line + "\n";
    const ssize_t written = ::write(fd, text.data(), text.size());
    ::close(fd);
    return written == static_cast<ssize_t>(text.size());
}

std::string BlinkText(const _VELH_BLINK& blink) {
    return std::to_string(blink.Slot) + " " + std::to_string(blink.State);
}

// The request log only watches the driver: failing to write it changes no answer, but says so,
// because a test that looks for missing lines would otherwise pass on an empty log.
void LogRequest(const std::string& run, const std::string& request) {
    const std::string path = DriverFile(run, "requests.log");
    if (!AppendLine(path, request)) {
        std::fprintf(stderr, "velhsim: %s: %s\n", path.c_str(), std::strerror(errno));
    }
}

int AnswerBlink(const std::string& run, const _VELH_BLINK* blink) {
    return AppendLine(DriverFile(run, "blink.log"), BlinkText(*blink)) ? 0 : Fail(EIO);
}

}  // namespace

std::optional<int> InjectedFailure(const std::string& run, const std::string& request) {
    const std::optional<std::string> text = ReadWholeFile(DriverFile(run, "fail"));
    if (!text) {
        return std::nullopt;
    }
    for (std::string_view line : SplitLines(*text)) {
        const std::vector<std::string> words = SplitWords(StripComment(line));
        if (words.empty() || words[0] != request) {
            continue;
        }
        if (words.size() < 2) {
            return EIO;
        }
        const std::optional<int> error = ParseErrno(words[1]);
        if (!error) {
            std::fprintf(stderr, "velhsim: %s: unknown error \"%s\", failing with EIO\n",
                         DriverFile(run, "fail").c_str(), words[1].c_str());
        }
        return error.value_or(EIO);
    }
    return std::nullopt;
}

int DriverOpen(const std::string& run, int flags, const void* caller) {
    if (!IsDirectory(JoinPath(run, "driver"))) {
        return Fail(ENOENT);
    }
    LogRequest(run, "open");
    if (const std::optional<int> error = InjectedFailure(run, "open")) {
        return Fail(*error);
    }
    if (CallFails(FaultKind::Driver, caller)) {
        return Fail(EIO);
    }
    return memfd_create(DEVICE_FILE_NAME, (flags & O_CLOEXEC) != 0 ? MFD_CLOEXEC : 0);
}

bool IsDriverDescriptor(int fd) {
    struct stat info {};
    if (fd < 0 || fstat(fd, &info) != 0 || !S_ISREG(info.st_mode) || info.st_nlink != 0) {
        return false;
    }
    char link[64];
    char target[128];
    std::snprintf(link, sizeof link, "/proc/self/fd/%d", fd);
    const ssize_t length = readlink(link, target, sizeof target - 1);
    if (length <= 0) {
        return false;
    }
    target[length] = '\0';
    const std::string expected = std::string("/memfd:") + DEVICE_FILE_NAME + " ";
    return std::strncmp(target, expected.c_str(), expected.size()) == 0;
}

int DriverIoctl(const std::string& run, unsigned long request, void* argument, const void* caller) {
    const char* name = nullptr;
    switch (request) {
        case VELH_IOCTL_VERSION:
            name = "version";
            break;
        case VELH_IOCTL_TABLE_SIZE:
            name = "size";
            break;
        case VELH_IOCTL_TABLE:
            name = "table";
            break;
        case VELH_IOCTL_BLINK:
            name = "blink";
            break;
        default: {
            char code[32];
            std::snprintf(code, sizeof code, "ioctl 0x%lx", request);
            LogRequest(run, code);
            return Fail(ENOTTY);
        }
    }
    const bool blinkWithArgument = request == VELH_IOCTL_BLINK && argument != nullptr;
    LogRequest(run, blinkWithArgument ? std::string(name) + " " +
                                            BlinkText(*static_cast<const _VELH_BLINK*>(argument))
                                      : std::string(name));
    if (const std::optional<int> error = InjectedFailure(run, name)) {
        return Fail(*error);
    }
    if (CallFails(FaultKind::Driver, caller)) {
        return Fail(EIO);
    }
    if (argument == nullptr) {
        return Fail(EFAULT);
    }
    switch (request) {
        case VELH_IOCTL_VERSION:
            return AnswerVersion(run, argument);
        case VELH_IOCTL_TABLE_SIZE:
            return AnswerTableSize(run, static_cast<_VELH_TABLE_XFER*>(argument));
        case VELH_IOCTL_TABLE:
            return AnswerTable(run, static_cast<_VELH_TABLE_XFER*>(argument));
        default:
            return AnswerBlink(run, static_cast<const _VELH_BLINK*>(argument));
    }
}

}  // namespace velhsim
