#include "commands/commands.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "driver/unpin_ranges.h"
#include "space/space_cache.h"

namespace vesk {
int UnpinRange(const char *mountPath, uint64_t startSector, uint64_t numSectors) {
    LogTraceScope();
    const MallocText cachePath(SpaceGetCachePathByMountPath(mountPath));
    if (!cachePath) {
        LogError("Can't get cache path of volume (%s)", mountPath);
        return -1;
    }
    UnpinList list{};
    list.ranges[0] = {startSector, numSectors};
    return SendUnpinList(cachePath.get(), &list, LogHere());
}
} // namespace vesk
