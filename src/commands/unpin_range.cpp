#include "commands/unpin_range.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "driver/device_ioctl.h"
#include "driver/pin_interface.h"
#include "space/space_cache.h"

int UnpinRange(const char *mountPath, uint64_t startSector, uint64_t numSectors) {
    LogTraceScope();
    const MallocText cachePath(SpaceGetCachePathByMountPath(mountPath));
    if (!cachePath) {
        LogError("Can't get cache path of volume (%s)", mountPath);
        return -1;
    }
    UnpinList list{};
    list.ranges[0] = {startSector, numSectors};
    if (DoIoctl(cachePath.get(), pinIoctlUnpinRanges, &list, unpinListBytes) < 0) {
        LogError("Send unpin inctl to driver failed");
        return -1;
    }
    return 0;
}
