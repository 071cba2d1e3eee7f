#include "driver/bitmap_control.h"

#include "base/log.h"
#include "driver/device_ioctl.h"

static_assert(sizeof(void *) != 4 || sizeof(PinBitmap) == pinBitmapDescriptorBytes,
              "the record is the descriptor that the driver of the 32-bit target reads");

int BitmapSendToDriver(PinBitmap *bitmap, const char *cachePath) {
    LogTraceScope();
    if (bitmap == nullptr || cachePath == nullptr) {
        LogError("Incorrect parameter");
        return -1;
    }
    if (DoIoctl(cachePath, pinIoctlSetBitmap, bitmap, pinBitmapDescriptorBytes) < 0) {
        LogError("Ioctl error");
        return -1;
    }
    return 0;
}

int BitmapIsSet(const char *cachePath, int *isSet) {
    if (DoIoctl(cachePath, pinIoctlQueryBitmapSet, isSet, sizeof(*isSet)) < 0) {
        LogError("Ioctl error");
        return -1;
    }
    LogVerbose("Bitmap is set = %d", *isSet);
    return 0;
}

int isAllBlocksUnpin(const char *cachePath, int *allUnpinned) {
    LogTraceScope();
    LogVerbose("Cache path = %s", cachePath);
    if (DoIoctl(cachePath, pinIoctlQueryAllUnpinned, allUnpinned, sizeof(*allUnpinned)) != 0) {
        LogError("Ioctl error");
        return -1;
    }
    LogVerbose("Is all block unpin = %d", *allUnpinned);
    return 0;
}
