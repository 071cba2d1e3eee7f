#include "commands/commands.h"

#include "base/log.h"
#include "bitmap/space_bitmap.h"
#include "driver/bitmap_control.h"
#include "files/path.h"
#include "space/space.h"
#include "space/space_cache.h"

namespace vesk {
int SendBitmap(const char *mountPath) {
    if (!SpaceHasCacheAndSupportPin(mountPath)) {
        LogError("Volume (%s) doesn't support pin", mountPath);
        return -1;
    }
    VolumeBitmap volume;
    volume.uuid.reset(SpaceGetUUID(mountPath));
    if (!volume.uuid) {
        LogError("Can't get space uuid from reference path (%s)", mountPath);
        return -1;
    }
    const char *uuid = volume.uuid.get();
    if (!SpaceTake(SpaceGetCachePath(uuid), &volume.cachePath, "Can't get cache path", LogHere())) {
        return -1;
    }
    const char *cachePath = volume.cachePath.get();
    int isSet = 0;
    if (BitmapIsSet(cachePath, &isSet) < 0) {
        LogError("Can't get cache's bitmap status");
        return -1;
    }
    if (isSet != 0) {
        LogNotice("Bitmap is already set");
        return 0;
    }
    if (!SpaceTake(SpaceGetBitmapPath(uuid), &volume.bitmapPath, "Can't get bitmap path",
                   LogHere())) {
        return -1;
    }
    const char *bitmapPath = volume.bitmapPath.get();
    if (!PathExists(bitmapPath, LastLink::Itself)) {
        LogNotice("Bitmap file (%s) doesn't exist. No need to update to driver", bitmapPath);
        return 0;
    }
    if (VolumeBitmapLoad(&volume, LogHere()) < 0) {
        return -1;
    }
    return BitmapWriteAndSend(volume.bitmap.get(), volume.sizeChanged ? bitmapPath : nullptr,
                              cachePath, LogHere());
}
} // namespace vesk
