#include "warming/read_file.h"

#include "base/log.h"
#include "base/scoped_fd.h"
#include "state/service_state.h"
#include "warming/read_range.h"

#include <fcntl.h>
#include <unistd.h>

namespace vesk {
WorkResult FileReadToCache(const char *mountPath, const char *filePath, uint64_t lastSector) {
    const uint64_t bytesToRead = (lastSector + 1) << kSectorByteShift;
    LogVerbose("Read file (%s) to cache. last read sector = %llu bytes to read = %llu", filePath,
               LogU64(lastSector), LogU64(bytesToRead));
    const WarmBuffer buffer = WarmBufferAllocate();
    if (!buffer) {
        LogError("Can't allocate memory\n");
        return WorkResult::Failed;
    }
    LogVerbose("Read file (%s) start, Time=%s", filePath, GetTimeString());
    const ScopedFd file(open(filePath, O_RDONLY | O_DIRECT | O_CLOEXEC));
    if (!file.IsOpen()) {
        LogNotice("File (%s) doesn't exist (might due to be renamed), skip it", filePath);
        return WorkResult::Done;
    }
    uint64_t total = 0;
    for (;;) {
        const ssize_t result = read(file.Get(), buffer.get(), kWarmBufferBytes);
        if (result < 0) {
            LogError("Read error");
            return WorkResult::Failed;
        }
        if (result == 0) {
            break;
        }
        total += static_cast<uint64_t>(result);
        if (total >= bytesToRead) {
            LogVerbose("Total Read bytes (%llu) >= byte to read (%llu), break", LogU64(total),
                       LogU64(bytesToRead));
            break;
        }
        if (ServiceIsPendingSpace(mountPath)) {
            return WorkResult::Interrupted;
        }
    }
    LogVerbose("Read file (%s) finish, Time=%s Num read=%llu", filePath, GetTimeString(),
               LogU64(total));
    return WorkResult::Done;
}
} // namespace vesk
