#include "commands/send_bitmap.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "bitmap/bitmap_file.h"
#include "bitmap/space_bitmap.h"
#include "driver/bitmap_control.h"
#include "files/path.h"
#include "space/space.h"
#include "space/space_bitmap_path.h"
#include "space/space_cache.h"

int SendBitmap(const char *mountPath) {
    if (!SpaceHasCacheAndSupportPin(mountPath)) {
        LogError("Volume (%s) doesn't support pin", mountPath);
        return -1;
    }
    const MallocText uuid(SpaceGetUUID(mountPath));
    if (!uuid) {
        LogError("Can't get space uuid from reference path (%s)", mountPath);
        return -1;
    }
    const MallocText cachePath(SpaceGetCachePath(uuid.get()));
    if (!cachePath) {
        LogError("Can't get cache path");
        return -1;
    }
    int isSet = 0;
    if (BitmapIsSet(cachePath.get(), &isSet) < 0) {
        LogError("Can't get cache's bitmap status");
        return -1;
    }
    if (isSet != 0) {
        LogNotice("Bitmap is already set");
        return 0;
    }
    const MallocText bitmapPath(SpaceGetBitmapPath(uuid.get()));
    if (!bitmapPath) {
        LogError("Can't get bitmap path");
        return -1;
    }
    if (!PathExists(bitmapPath.get())) {
        LogNotice("Bitmap file (%s) doesn't exist. No need to update to driver", bitmapPath.get());
        return 0;
    }
    PinBitmap *loaded = nullptr;
    bool sizeChanged = false;
    const int loadResult = BitmapAllocateAndInitialize(uuid.get(), &loaded, &sizeChanged);
    const BitmapHolder bitmap(loaded);
    if (loadResult < 0) {
        LogError("Allocate bitmap failed");
        return -1;
    }
    if (sizeChanged && BitmapWriteToFile(bitmap.get(), bitmapPath.get()) < 0) {
        LogError("Write bitmap failed");
        return -1;
    }
    if (BitmapSendToDriver(bitmap.get(), cachePath.get()) < 0) {
        LogError("Can't send bitmap to driver");
        return -1;
    }
    return 0;
}
