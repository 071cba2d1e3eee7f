#include "commands/unpin_all.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "driver/device_ioctl.h"
#include "driver/pin_interface.h"
#include "request/tool_parameters.h"
#include "space/space_cache.h"

int UnpinAllBlocksByCachePath(const char *cachePath) {
    if (cachePath == nullptr) {
        LogError("Incorrect parameter");
        return -1;
    }
    if (DoIoctl(cachePath, pinIoctlUnpinAll, nullptr, 0) < 0) {
        LogError("Ioctl for unpin all cache blocks failed");
        return -1;
    }
    return 0;
}

int UnpinAllBlocksByMouhtPath(const char *mountPath) {
    const MallocText cachePath(SpaceGetCachePathByMountPath(mountPath));
    if (!cachePath) {
        LogError("Can't get the cache path of volume (%s)", mountPath);
        return -1;
    }
    return UnpinAllBlocksByCachePath(cachePath.get()) == 0 ? 0 : -1;
}

int UnpinAllBlocks(const ToolParameters *parameters) {
    const char *mountPath = parameters->mountPath;
    const char *cachePath = parameters->cachePath;
    if (mountPath != nullptr) {
        LogNotice("Start to unpin all blocks of volume (%s)", mountPath);
        if (UnpinAllBlocksByMouhtPath(mountPath) < 0) {
            LogError("Can't unpin all block of volume (%s)", mountPath);
            return -1;
        }
        LogNotice("Unpin all blocks of volume (%s) finish", mountPath);
        return 0;
    }
    if (cachePath != nullptr) {
        LogNotice("Start to unpin all blocks of cache (%s)", cachePath);
        if (UnpinAllBlocksByCachePath(cachePath) < 0) {
            LogError("Can't unpin all block of cache (%s)", cachePath);
            return -1;
        }
        LogNotice("Unpin all blocks of cache (%s) finish", cachePath);
        return 0;
    }
    LogError("One of --mount-path or --cache-path could be set");
    return -1;
}
