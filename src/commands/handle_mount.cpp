#include "commands/commands.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "config/pinned_files.h"
#include "files/path.h"
#include "space/space.h"
#include "space/space_cache.h"

#include <unistd.h>

namespace vesk {
int HandleSpaceMount(const char *configPath, const char *mountPath) {
    if (SpaceHasCacheAndSupportPin(mountPath) == 1) {
        return 0;
    }
    LogVerbose("Space (%s) doesn't support pin", mountPath);
    if (ConfigRemovePinFileVolume(configPath, mountPath) != 0) {
        LogError("Can't remove pin files in volume (%s)", mountPath);
        return -1;
    }
    const MallocText bitmapPath(BitmapGetPathByReferencePath(mountPath));
    if (!bitmapPath) {
        LogError("Can't get volume (%s)'s bitmap path", mountPath);
        return -1;
    }
    if (!PathExists(bitmapPath.get(), LastLink::Itself) ||
        !PathIsFile(bitmapPath.get(), LastLink::Itself)) {
        return 0;
    }
    if (unlink(bitmapPath.get()) < 0) {
        LogError("Can't delete bitmap file (%s)", bitmapPath.get());
        return -1;
    }
    return 0;
}
} // namespace vesk
