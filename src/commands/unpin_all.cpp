#include "commands/commands.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "driver/device.h"
#include "driver/pin_interface.h"
#include "request/tool_parameters.h"
#include "space/space_cache.h"

namespace vesk {
int UnpinAllBlocksByCachePath(const char *cachePath) {
    if (cachePath == nullptr) {
        LogError("Incorrect parameter");
        return -1;
    }
    return DoIoctlOrSay("Ioctl for unpin all cache blocks failed", cachePath, kPinIoctlUnpinAll,
                        nullptr, 0, LogHere());
}

int UnpinAllBlocksByMouhtPath(const char *mountPath) {
    const MallocText cachePath(SpaceGetCachePathByMountPath(mountPath));
    if (!cachePath) {
        LogError("Can't get the cache path of volume (%s)", mountPath);
        return -1;
    }
    return UnpinAllBlocksByCachePath(cachePath.get());
}

int UnpinAllBlocks(const ToolParameters *parameters) {
    const bool byVolume = parameters->mountPath != nullptr;
    const char *kind = byVolume ? "volume" : "cache";
    const char *path = byVolume ? parameters->mountPath : parameters->cachePath;
    if (path == nullptr) {
        LogError("One of --mount-path or --cache-path could be set");
        return -1;
    }
    LogNotice("Start to unpin all blocks of %s (%s)", kind, path);
    if ((byVolume ? UnpinAllBlocksByMouhtPath(path) : UnpinAllBlocksByCachePath(path)) < 0) {
        LogError("Can't unpin all block of %s (%s)", kind, path);
        return -1;
    }
    LogNotice("Unpin all blocks of %s (%s) finish", kind, path);
    return 0;
}
} // namespace vesk
