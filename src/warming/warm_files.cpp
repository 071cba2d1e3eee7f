#include "warming/warm_files.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "base/scoped_fd.h"
#include "space/space_cache.h"
#include "state/service_state.h"
#include "warming/read_range.h"

#include <fcntl.h>

namespace vesk {
namespace {
const uint32_t kFlagUninitialized = 1;
} // namespace

WorkResult ReadFilesToCache(const char *mountPath, const std::vector<FileToWarm> &files) {
    const WarmBuffer buffer = WarmBufferAllocate();
    if (!buffer) {
        LogError("Can't allocate memory\n");
        return WorkResult::Failed;
    }
    const MallocText cachePath(SpaceGetCachePathByMountPath(mountPath));
    if (!cachePath) {
        LogError("Cant' get cache path from volume (%s)", mountPath);
        return WorkResult::Failed;
    }
    const ScopedFd device(open(cachePath.get(), O_RDONLY | O_DIRECT | O_CLOEXEC));
    if (!device.IsOpen()) {
        LogError("Can't open file (%s)", cachePath.get());
        return WorkResult::Failed;
    }
    for (const FileToWarm &file : files) {
        if (ServiceIsPendingSpace(mountPath)) {
            LogVerbose("Space is pending, Interrupted");
            return WorkResult::Interrupted;
        }
        const WorkResult result = ReadMappingRangesToCache(mountPath, device.Get(), file.table,
                                                           buffer.get(), kWarmBufferBytes);
        if (result == WorkResult::Failed) {
            LogError("Can't read file (%.511s) to cache", file.path.c_str());
            return WorkResult::Failed;
        }
        if (result == WorkResult::Interrupted) {
            LogVerbose("Interrupted");
            return WorkResult::Interrupted;
        }
    }
    return WorkResult::Done;
}

WorkResult ReadMappingRangesToCache(const char *mountPath, int fd, const FileMappingTable &table,
                                    char *buffer, size_t bufferSize) {
    LogVerbose("Mapping entry size = %zu", table.entries.size());
    for (const FileMappingEntry &entry : table.entries) {
        const unsigned long long start = entry.deviceStartSector;
        const unsigned long long sectors = entry.numSectors;
        if (ServiceIsPendingSpace(mountPath)) {
            LogVerbose("Space is pending, Interrupted");
            return WorkResult::Interrupted;
        }
        if (entry.flag == kFlagUninitialized) {
            LogVerbose("Skip uninitialized range (disk start sector = %llu num sectors = %llu)",
                       start, sectors);
            continue;
        }
        LogVerbose("Read to null (disk start sector = %llu num sectors = %llu)", start, sectors);
        if (ReadFdToNull(fd, start << kSectorByteShift, sectors << kSectorByteShift, buffer,
                         bufferSize) < 0) {
            LogError("Read fd to null failed (disk start sector = %llu num sectors = %llu)", start,
                     sectors);
            return WorkResult::Failed;
        }
    }
    return WorkResult::Done;
}
} // namespace vesk
