#include "warming/read_range.h"

#include "base/log.h"
#include "bitmap/pin_bitmap.h"

#include <algorithm>
#include <cstdlib>
#include <unistd.h>

namespace vesk {
WarmBuffer WarmBufferAllocate() {
    return WarmBuffer(static_cast<char *>(aligned_alloc(kWarmBufferAlignment, kWarmBufferBytes)));
}

int ReadFdToNull(int fd, uint64_t offset, uint64_t count, char *buffer, size_t bufferSize) {
    LogVerbose("offset byte = %llu num bytes = %llu", LogU64(offset), LogU64(count));
    auto remaining = static_cast<uint32_t>(count); // ranges are counted in 32 bits
    while (remaining != 0) {
        const auto position = static_cast<long long>(offset);
        if (lseek(fd, static_cast<off_t>(position), SEEK_SET) < 0) {
            LogError("Can't seek to %lld", position);
            return -1;
        }
        const size_t bytes = std::min<size_t>(remaining, bufferSize);
        const ssize_t result = read(fd, buffer, bytes);
        // 0 is the end of the device: nothing more will come.
        if (result <= 0) {
            LogError("Read block error (seek = %lld num bytes = %zu", position, bytes);
            return -1;
        }
        remaining -= static_cast<uint32_t>(result);
        offset += static_cast<uint64_t>(result);
    }
    return 0;
}

int ReadFdToNullByRange(int fd, const BitRun &range, char *buffer, size_t bufferSize) {
    const uint64_t bytes = range.count << kBitmapByteShift;
    LogVerbose("Range's bitStart=%llu numBits=%llu (size = %llu bytes)", LogU64(range.first),
               LogU64(range.count), LogU64(bytes));
    return ReadFdToNull(fd, range.first << kBitmapByteShift, static_cast<uint32_t>(bytes), buffer,
                        bufferSize);
}
} // namespace vesk
