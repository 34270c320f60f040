#include "sim/common/textfile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <limits>

namespace velhsim {

std::optional<std::string> ReadWholeFile(const std::string& path) {
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) {
        return std::nullopt;
    }
    std::string data;
    char chunk[65536];
    ssize_t count = 0;
    while ((count = read(fd, chunk, sizeof chunk)) > 0 || (count < 0 && errno == EINTR)) {
        if (count > 0) {
            data.append(chunk, static_cast<size_t>(count));
        }
    }
    const int error = errno;
    close(fd);
    if (count < 0) {
        errno = error;
        return std::nullopt;
    }
    return data;
}

bool WriteWholeFile(const std::string& path, std::string_view data) {
    const int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0644);
    if (fd < 0) {
        return false;
    }
    size_t done = 0;
    while (done < data.size()) {
        const ssize_t count = write(fd, data.data() + done, data.size() - done);
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count <= 0) {
            const int error = count < 0 ? errno : EIO;
            close(fd);
            errno = error;
            return false;
        }
        done += static_cast<size_t>(count);
    }
    return close(fd) == 0;
}

std::string_view Trim(std::string_view text) {
    const char* blanks = " \t\r\n\f\v";
    const size_t first = text.find_first_not_of(blanks);
    if (first == std::string_view::npos) {
        return {};
    }
    const size_t last = text.find_last_not_of(blanks);
    return text.substr(first, last - first + 1);
}

std::string_view StripComment(std::string_view line, char mark) {
    const size_t at = line.find(mark);
    return Trim(at == std::string_view::npos ? line : line.substr(0, at));
}

std::vector<std::string> SplitWords(std::string_view text) {
    std::vector<std::string> words;
    const char* blanks = " \t\r\n\f\v";
    size_t pos = 0;
    while ((pos = text.find_first_not_of(blanks, pos)) != std::string_view::npos) {
        const size_t end = text.find_first_of(blanks, pos);
        words.emplace_back(text.substr(pos, end == std::string_view::npos ? end : end - pos));
        pos = end;
    }
    return words;
}

std::vector<std::string_view> SplitLines(std::string_view text) {
    std::vector<std::string_view> lines;
    size_t pos = 0;
    while (pos < text.size()) {
        size_t end = text.find('\n', pos);
        if (end == std::string_view::npos) {
            end = text.size();
        }
        std::string_view line = text.substr(pos, end - pos);
        if (!line.empty() && line.back() == '\r') {
            line.remove_suffix(1);
        }
        lines.push_back(line);
        pos = end + 1;
    }
    return lines;
}

namespace {

std::optional<uint64_t> ParseDigits(std::string_view digits, unsigned base) {
    if (digits.empty()) {
        return std::nullopt;
    }
    uint64_t value = 0;
    for (char c : digits) {
        unsigned digit = 0;
        if (c >= '0' && c <= '9') {
            digit = static_cast<unsigned>(c - '0');
        } else if (base == 16 && c >= 'a' && c <= 'f') {
            digit = static_cast<unsigned>(c - 'a' + 10);
        } else if (base == 16 && c >= 'A' && c <= 'F') {
            digit = static_cast<unsigned>(c - 'A' + 10);
        } else {
            return std::nullopt;
        }
        if (value > (std::numeric_limits<uint64_t>::max() - digit) / base) {
            return std::nullopt;
        }
        value = value * base + digit;
    }
    return value;
}

bool HasHexPrefix(std::string_view text) {
    return text.size() > 2 && text[0] == '0' && (text[1] == 'x' || text[1] == 'X');
}

}  // namespace

std::optional<uint64_t> ParseNumber(std::string_view text) {
    text = Trim(text);
    if (HasHexPrefix(text)) {
        return ParseDigits(text.substr(2), 16);
    }
    return ParseDigits(text, 10);
}

std::optional<uint64_t> ParseHex(std::string_view text) {
    text = Trim(text);
    return ParseDigits(HasHexPrefix(text) ? text.substr(2) : text, 16);
}

std::string JoinPath(std::string_view dir, std::string_view name) {
    std::string path(dir);
    if (!path.empty() && path.back() != '/') {
        path += '/';
    }
    path += name;
    return path;
}

bool IsDirectory(const std::string& path) {
    struct stat info {};
    return stat(path.c_str(), &info) == 0 && S_ISDIR(info.st_mode);
}

bool IsRegularFile(const std::string& path) {
    struct stat info {};
    return stat(path.c_str(), &info) == 0 && S_ISREG(info.st_mode);
}

}  // namespace velhsim
