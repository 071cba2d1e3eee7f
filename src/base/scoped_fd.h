// A file descriptor that is closed when its scope ends, also on an error path.
#ifndef BASE_SCOPED_FD_H
#define BASE_SCOPED_FD_H

#include <unistd.h>

class ScopedFd {
public:
    explicit ScopedFd(int fd) : fd_(fd) {}
    ~ScopedFd() {
        if (fd_ >= 0) {
            close(fd_);
        }
    }
    ScopedFd(const ScopedFd &) = delete;
    ScopedFd &operator=(const ScopedFd &) = delete;

    bool IsOpen() const { return fd_ >= 0; }
    int Get() const { return fd_; }

private:
    int fd_; // negative: nothing to close
};

#endif
