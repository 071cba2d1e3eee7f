#include "warming/reload_blocks.h"

#include "base/log.h"
#include "base/scoped_fd.h"
#include "state/service_state.h"
#include "warming/read_range.h"

#include <algorithm>
#include <cstring>
#include <fcntl.h>

namespace {

const size_t stretchBytes = 4096;

// How many bytes from `data` on are `value`, looking at no more than `size` and stopping a long
// stretch after 4 KiB, so that the caller looks up now and then.
size_t CountBytes(const unsigned char *data, size_t size, unsigned char value) {
    const size_t stretch = std::min(size, stretchBytes);
    // Equal to their neighbours, all of them: the C library compares faster than any loop here.
    if (stretch > 0 && data[0] == value && memcmp(data, data + 1, stretch - 1) == 0) {
        return stretch;
    }
    return static_cast<size_t>(
        std::find_if(data, data + stretch, [value](unsigned char byte) { return byte != value; }) -
        data);
}

} // namespace

WorkResult ReloadPinBlocksToCache(const PinBitmap *bitmap, const char *cacheDevicePath,
                                  const char *mountPath) {
    const WarmBuffer buffer = WarmBufferAllocate();
    if (!buffer) {
        LogError("Can't allocate memory\n");
        return WorkResult::Failed;
    }
    const ScopedFd device(open(cacheDevicePath, O_RDONLY | O_DIRECT | O_CLOEXEC));
    if (!device.IsOpen()) {
        LogError("Can't open file (%s)", cacheDevicePath);
        return WorkResult::Failed;
    }
    LogVerbose("Start to read blocks");

    const uint64_t bits = static_cast<uint64_t>(bitmap->size) * 8;
    bool seen = false;
    BlockRange run{0, 0};
    uint64_t bit = 0;
    while (bit < bits) {
        const unsigned char *byte = bitmap->data + (bit >> 3);
        const size_t left = static_cast<size_t>((bits - bit) >> 3);
        const bool atByte = (bit & 7) == 0;
        if (((*byte >> (bit & 7)) & 1) != 0) {
            seen = true;
            if (run.numBits == 0) {
                run.startBit = bit;
            }
            const size_t setBytes = atByte ? CountBytes(byte, left, 0xFF) : 0;
            const size_t taken = setBytes > 0 ? setBytes * 8 : 1;
            run.numBits += taken;
            bit += taken;
        } else {
            if (run.numBits > 0 &&
                ReadFdToNullByRange(device.Get(), run, buffer.get(), warmBufferBytes) < 0) {
                LogError("Read range to cache failed");
                return WorkResult::Failed;
            }
            run.numBits = 0;
            const size_t clearBytes = atByte ? CountBytes(byte, left, 0) : 0;
            bit += clearBytes > 0 ? clearBytes * 8 : 1;
        }
        if (ServiceIsPendingSpace(mountPath)) {
            LogVerbose("Interrupted due to space is pending");
            return WorkResult::Interrupted;
        }
    }
    if (run.numBits > 0 &&
        ReadFdToNullByRange(device.Get(), run, buffer.get(), warmBufferBytes) < 0) {
        LogError("Read range to cache failed");
        return WorkResult::Failed;
    }
    if (!seen) {
        LogVerbose("No pin blocks, no need to reload");
    }
    return WorkResult::Done;
}
