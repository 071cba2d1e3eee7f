#include "commands/commands.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "bitmap/space_bitmap.h"
#include "space/space_cache.h"

namespace vesk {
int GetBitmapSizeByte(const char *mountPath, uint64_t *size) {
    const MallocText cachePath(SpaceGetCachePathByMountPath(mountPath));
    if (!cachePath) {
        LogError("Get cache path from mount path (%s) failed", mountPath);
        return -1;
    }
    if (BitmapGetNeededSizeByte(cachePath.get(), size) < 0) {
        LogError("Get bitmap size for cache (%s) failed", cachePath.get());
        return -1;
    }
    return 0;
}
} // namespace vesk
