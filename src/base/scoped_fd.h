// A file descriptor that is closed when its scope ends, also on an error path. Thread rule: one
// owner at a time, no locking.
#pragma once

#include <unistd.h>

#include <utility>

namespace vesk {
class ScopedFd {
public:
    explicit ScopedFd(int fd = -1) noexcept : fd_(fd) {}
    ~ScopedFd() {
        if (fd_ >= 0) {
            close(fd_);
        }
    }
    ScopedFd(ScopedFd &&other) noexcept : fd_(other.Release()) {}
    // What was held before is closed with `other`: `fd = ScopedFd()` closes at once.
    ScopedFd &operator=(ScopedFd &&other) noexcept {
        std::swap(fd_, other.fd_);
        return *this;
    }

    bool IsOpen() const { return fd_ >= 0; }
    int Get() const { return fd_; }
    // Hands the descriptor over to the caller, who closes it.
    int Release() noexcept { return std::exchange(fd_, -1); }

private:
    int fd_; // negative: nothing to close
};
} // namespace vesk
