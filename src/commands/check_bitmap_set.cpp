#include "commands/commands.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "driver/bitmap_control.h"
#include "space/space_cache.h"

namespace vesk {
int CheckBitmapSet(const char *mountPath) {
    int result = 0;
    MallocText cachePath;
    if (!SpaceHasCacheAndSupportPin(mountPath)) {
        LogVerbose("Volume (%s) doesn't support pin", mountPath);
    } else if (cachePath.reset(SpaceGetCachePathByMountPath(mountPath)); !cachePath) {
        LogError("Can't get cache path");
    } else {
        int state = 0;
        if (BitmapIsSet(cachePath.get(), &state) < 0) {
            LogError("Can't get cache's bitmap status");
        } else {
            result = state;
        }
    }
    LogVerbose("Bitmap set state = %d", result);
    return result;
}
} // namespace vesk
