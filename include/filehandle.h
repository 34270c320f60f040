// Owning handles for C library resources: a stdio stream, malloc'ed memory, a file descriptor,
// and a read that goes on after short reads.
#pragma once

#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <utility>

struct FileCloser {
    void operator()(FILE* file) const { std::fclose(file); }
};
using UniqueFile = std::unique_ptr<FILE, FileCloser>;

struct MallocFreer {
    void operator()(void* memory) const { std::free(memory); }
};
template <typename T>
using UniqueMalloc = std::unique_ptr<T, MallocFreer>;

class UniqueFd {
  public:
    explicit UniqueFd(int fd = -1) : Fd(fd) {}
    ~UniqueFd() { Reset(); }
    UniqueFd(UniqueFd&& other) noexcept : Fd(std::exchange(other.Fd, -1)) {}
    UniqueFd& operator=(UniqueFd&& other) noexcept {
        if (this != &other) {
            Reset(std::exchange(other.Fd, -1));
        }
        return *this;
    }
    UniqueFd(const UniqueFd&) = delete;
    UniqueFd& operator=(const UniqueFd&) = delete;

    int Get() const { return Fd; }
    explicit operator bool() const { return Fd >= 0; }
    void Reset(int fd = -1) {
        if (Fd >= 0) {
            close(Fd);
        }
        Fd = fd;
    }

  private:
    int Fd;
};

// Reads up to size bytes, going on after short reads; the count read, or -1 on an error.
inline int32_t ReadFully(int fd, void* buffer, uint32_t size) {
    auto* bytes = static_cast<uint8_t*>(buffer);
    uint32_t total = 0;
    while (total < size) {
        ssize_t got = read(fd, bytes + total, size - total);
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got < 0) {
            return -1;
        }
        if (got == 0) {
            break;
        }
        total += static_cast<uint32_t>(got);
    }
    return static_cast<int32_t>(total);
}
