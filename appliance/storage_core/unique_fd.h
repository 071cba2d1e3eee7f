// An open file descriptor that closes itself.
//
// Thread rule: one owner at a time, no locking.
#ifndef VESK_STORAGE_CORE_UNIQUE_FD_H
#define VESK_STORAGE_CORE_UNIQUE_FD_H

#include <unistd.h>

#include <utility>

class UniqueFd {
public:
    explicit UniqueFd(int fd = -1) noexcept : fd_(fd) {}
    UniqueFd(UniqueFd &&other) noexcept : fd_(other.Release()) {}
    UniqueFd(const UniqueFd &) = delete;
    UniqueFd &operator=(const UniqueFd &) = delete;
    UniqueFd &operator=(UniqueFd &&) = delete;
    ~UniqueFd() {
        if (IsOpen()) {
            close(fd_);
        }
    }

    bool IsOpen() const noexcept { return fd_ >= 0; }
    int Get() const noexcept { return fd_; }
    // Hands the descriptor over to the caller, who closes it.
    int Release() noexcept { return std::exchange(fd_, -1); }

private:
    int fd_; // negative: nothing open
};

#endif
