#include "warming/reload_blocks.h"

#include "base/log.h"
#include "base/scoped_fd.h"
#include "bitmap/bit_runs.h"
#include "state/service_state.h"
#include "warming/read_range.h"

#include <fcntl.h>

namespace vesk {
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

    BitScan scan{bitmap->data, bitmap->size};
    bool seen = false;
    bool more = true;
    while (more) {
        BitRun run{0, 0};
        more = BitScanStep(scan, run);
        seen = seen || run.count > 0;
        if (run.count > 0 &&
            ReadFdToNullByRange(device.Get(), run, buffer.get(), kWarmBufferBytes) < 0) {
            LogError("Read range to cache failed");
            return WorkResult::Failed;
        }
        // Every step and every read ends with a look; the bitmap's end alone is none.
        if ((more || run.count > 0) && ServiceIsPendingSpace(mountPath)) {
            LogVerbose("Interrupted due to space is pending");
            return WorkResult::Interrupted;
        }
    }
    if (!seen) {
        LogVerbose("No pin blocks, no need to reload");
    }
    return WorkResult::Done;
}
} // namespace vesk
