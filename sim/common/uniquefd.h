// Owns one file descriptor and closes it when it goes.
#pragma once

#include <unistd.h>

#include <utility>

namespace velhsim {

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

}  // namespace velhsim
