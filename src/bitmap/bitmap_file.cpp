#include "bitmap/bitmap_file.h"

#include "base/log.h"
#include "base/scoped_fd.h"
#include "files/path.h"

#include <algorithm>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
const int64_t kChunkBytes = 4096;

// The file lies where a volume's users may write. A link planted in its place must not lead to
// another file, and neither a FIFO nor a device may hold the service up or take its writes.
const int kCautiously = O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;

bool IsSpecial(int fd) {
    struct stat status {};
    return fstat(fd, &status) < 0 || !(S_ISREG(status.st_mode) || S_ISDIR(status.st_mode));
}

bool IsShorterThan(int fd, uint64_t bytes) {
    struct stat status {};
    return fstat(fd, &status) < 0 || static_cast<uint64_t>(status.st_size) < bytes;
}
} // namespace

int BitmapInitByFile(const char *path, PinBitmap *bitmap) {
    if (path == nullptr || bitmap == nullptr || bitmap->data == nullptr) {
        LogError("Incorrect parameter");
        return -1;
    }
    uint64_t fileBytes = 0;
    if (FileGetSizeByte(path, &fileBytes, LastLink::Itself) < 0) {
        LogError("Get the size of file (%s) error", path);
        return -1;
    }
    const ScopedFd file(open(path, O_RDONLY | kCautiously));
    if (!file.IsOpen() || IsSpecial(file.Get())) {
        LogError("Can't open bitmap file (%s)\n", path);
        return -1;
    }
    LogVerbose("Start read to memory, size = %d", static_cast<int>(bitmap->size));
    // The file may have grown since its size was compared with the bitmap's.
    auto remaining = static_cast<int64_t>(std::min<uint64_t>(fileBytes, bitmap->size));
    int64_t offset = 0;
    // Bytes that are not there yet are asked for again, but not those of a file that was cut or
    // exchanged since its size was taken.
    bool failed = IsShorterThan(file.Get(), fileBytes);
    while (remaining >= 1 && !failed) {
        const int64_t bytes = std::min(remaining, kChunkBytes);
        LogDebug("Next read start = %d bytes=%d", static_cast<int>(offset),
                 static_cast<int>(bytes));
        const ssize_t result = read(file.Get(), bitmap->data + offset, static_cast<size_t>(bytes));
        failed = result == -1 || (result == 0 && IsShorterThan(file.Get(), fileBytes));
        offset += result;
        remaining -= result;
    }
    if (failed) {
        LogError("Read bitmap file (%s) error\n", path);
        return -1;
    }
    LogVerbose("Read to memory finish");
    return 0;
}

int BitmapWriteToFile(PinBitmap *bitmap, const char *path) {
    LogVerbose("Bytes to write = %d", static_cast<int>(bitmap->size));
    const ScopedFd file(open(path, O_RDWR | O_CREAT | kCautiously, 0644));
    if (!file.IsOpen() || IsSpecial(file.Get())) {
        LogError("Can't open bitmap file (%s) \n", path);
        return -1;
    }
    int64_t offset = 0;
    while (offset < bitmap->size) {
        const int64_t bytes = std::min<int64_t>(bitmap->size - offset, kChunkBytes);
        const ssize_t result = write(file.Get(), bitmap->data + offset, static_cast<size_t>(bytes));
        if (result == -1) {
            LogError("Write bitmap file (%s) error\n", path);
            return -1;
        }
        offset += result;
    }
    LogVerbose("Write to bitmap file (%s) size (%d) Finish", path, static_cast<int>(bitmap->size));
    return 0;
}
} // namespace vesk
