// Loaded before the C library: writes down what the program does to its files.
//
// Each operation on a file below /run/faults or on the volume's bitmap file goes to descriptor 9
// once it is done, as a line of words; a write's bytes follow its line:
//
//     create PATH, write PATH OFFSET BYTES, truncate PATH, sync PATH, rename OLD NEW, unlink PATH
//
// "sync" of a folder makes its names durable. Two more lines tell what others know: "driver" when a
// bitmap was handed over, "receive" when the service asks for its next message. Operations are
// written down in the order in which they were done.
#include "tests/faults/real_call.h"

#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <fcntl.h>
#include <mutex>
#include <string>
#include <sys/msg.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

using namespace vesk;

namespace {
const int kReportFd = 9;
const unsigned long kSetBitmapRequest = 0xFECF;

// Held over an operation and its line.
std::mutex &Order() {
    static std::mutex mutex;
    return mutex;
}

void Report(const std::string &line) {
    syscall(SYS_write, kReportFd, line.data(), line.size());
}

std::string PathOf(int fd) {
    char path[4096];
    const std::string link = "/proc/self/fd/" + std::to_string(fd);
    const ssize_t length = readlink(link.c_str(), path, sizeof(path));
    return {path, length > 0 ? static_cast<size_t>(length) : 0};
}

std::string PathIn(int folder, const char *name) {
    return *name == '/' || folder == AT_FDCWD ? name : PathOf(folder) + "/" + name;
}

bool IsWatched(const std::string &path) {
    return path.rfind("/run/faults", 0) == 0 || path == "/volume1/veskcachepinfile.bitmap";
}

// What an open changes: a name, a length.
void ReportOpen(int fd, bool existed, int flags) {
    const std::string path = PathOf(fd);
    if (fd < 0 || !IsWatched(path)) {
        return;
    }
    if (!existed) {
        Report("create " + path + "\n");
    } else if ((flags & O_TRUNC) != 0) {
        Report("truncate " + path + "\n");
    }
}
} // namespace

extern "C" {

int open64(const char *path, int flags, ...) {
    static const auto real = REAL(open64);
    va_list arguments;
    va_start(arguments, flags);
    const mode_t mode = ModeOf(flags, arguments);
    va_end(arguments);
    const std::lock_guard<std::mutex> lock(Order());
    const bool existed = access(path, F_OK) == 0;
    const int fd = real(path, flags, mode);
    ReportOpen(fd, existed, flags);
    return fd;
}
int openat64(int folder, const char *path, int flags, ...) {
    static const auto real = REAL(openat64);
    va_list arguments;
    va_start(arguments, flags);
    const mode_t mode = ModeOf(flags, arguments);
    va_end(arguments);
    const std::lock_guard<std::mutex> lock(Order());
    const bool existed = faccessat(folder, path, F_OK, 0) == 0;
    const int fd = real(folder, path, flags, mode);
    ReportOpen(fd, existed, flags);
    return fd;
}
ssize_t write(int fd, const void *buffer, size_t size) {
    static const auto real = REAL(write);
    const std::string path = PathOf(fd);
    if (!IsWatched(path) || fd <= STDERR_FILENO) {
        return real(fd, buffer, size);
    }
    const std::lock_guard<std::mutex> lock(Order());
    const off_t offset = lseek(fd, 0, SEEK_CUR);
    const ssize_t written = real(fd, buffer, size);
    if (written > 0) {
        Report("write " + path + " " + std::to_string(offset) + " " + std::to_string(written) +
               "\n" + std::string(static_cast<const char *>(buffer), static_cast<size_t>(written)));
    }
    return written;
}
int fsync(int fd) {
    static const auto real = REAL(fsync);
    const std::lock_guard<std::mutex> lock(Order());
    const int result = real(fd);
    if (result == 0 && IsWatched(PathOf(fd))) {
        Report("sync " + PathOf(fd) + "\n");
    }
    return result;
}
int renameat(int oldFolder, const char *oldName, int newFolder, const char *newName) noexcept {
    static const auto real = REAL(renameat);
    const std::lock_guard<std::mutex> lock(Order());
    const int result = real(oldFolder, oldName, newFolder, newName);
    if (result == 0 && IsWatched(PathIn(newFolder, newName))) {
        Report("rename " + PathIn(oldFolder, oldName) + " " + PathIn(newFolder, newName) + "\n");
    }
    return result;
}
int unlinkat(int folder, const char *name, int flags) noexcept {
    static const auto real = REAL(unlinkat);
    const std::lock_guard<std::mutex> lock(Order());
    const int result = real(folder, name, flags);
    if (result == 0 && IsWatched(PathIn(folder, name))) {
        Report("unlink " + PathIn(folder, name) + "\n");
    }
    return result;
}
int ioctl(int fd, unsigned long request, ...) noexcept {
    static const auto real = REAL(ioctl);
    va_list arguments;
    va_start(arguments, request);
    void *argument = va_arg(arguments, void *);
    va_end(arguments);
    const std::lock_guard<std::mutex> lock(Order());
    const int result = real(fd, request, argument);
    if (result == 0 && request == kSetBitmapRequest) {
        Report("driver\n");
    }
    return result;
}
ssize_t msgrcv(int queue, void *message, size_t size, long type, int flags) {
    static const auto real = REAL(msgrcv);
    {
        const std::lock_guard<std::mutex> lock(Order());
        Report("receive\n");
    }
    return real(queue, message, size, type, flags);
}

} // extern "C"
