#include "cachedev/background.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fcntl.h>
#include <unistd.h>
#include <utility>

namespace vesk {
namespace {
// Waits for the byte that BackgroundReady writes; the end of the pipe means the daemon is gone.
bool AwaitReady(int fd) {
    char byte = 0;
    ssize_t got = -1;
    do {
        got = read(fd, &byte, 1);
    } while (got < 0 && errno == EINTR);
    return got == 1;
}
} // namespace

bool BackgroundStart(Background &background) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0) {
        fprintf(stderr, "veskcachedev: cannot make a pipe: %s\n", strerror(errno));
        return false;
    }
    const ScopedFd readEnd(ends[0]);
    ScopedFd writeEnd(ends[1]);
    fflush(nullptr); // or both processes would write what is still buffered
    const pid_t child = fork();
    if (child < 0) {
        fprintf(stderr, "veskcachedev: cannot go to the background: %s\n", strerror(errno));
        return false;
    }
    if (child > 0) {
        writeEnd = ScopedFd(); // or the end of the daemon would go unseen
        _exit(AwaitReady(readEnd.Get()) ? 0 : 1);
    }
    background.ready = std::move(writeEnd);
    return true;
}

void BackgroundReady(Background &background) {
    if (!background.ready.IsOpen()) {
        return;
    }
    setsid();
    if (chdir("/") != 0) {
        fprintf(stderr, "veskcachedev: cannot leave the working folder: %s\n", strerror(errno));
    }
    const int null = open("/dev/null", O_RDWR | O_CLOEXEC);
    for (int fd = 0; null >= 0 && fd <= 2; ++fd) {
        dup2(null, fd);
    }
    if (null > 2) {
        close(null);
    }
    // Writes to a parent that was killed meanwhile may fail: the daemon serves all the same.
    const char byte = 1;
    const ssize_t written = write(background.ready.Get(), &byte, 1);
    static_cast<void>(written);
    background.ready = ScopedFd();
}
} // namespace vesk
