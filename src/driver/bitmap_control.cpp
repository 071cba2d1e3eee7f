#include "driver/bitmap_control.h"

#include "base/log.h"
#include "driver/device.h"

namespace vesk {
static_assert(sizeof(void *) != 4 || sizeof(PinBitmap) == kPinBitmapDescriptorBytes,
              "the record is the descriptor that the driver of the 32-bit target reads");

int BitmapSendToDriver(PinBitmap *bitmap, const char *cachePath) {
    LogTraceScope();
    if (bitmap == nullptr || cachePath == nullptr) {
        LogError("Incorrect parameter");
        return -1;
    }
    return DoIoctlOrSay("Ioctl error", cachePath, kPinIoctlSetBitmap, bitmap,
                        kPinBitmapDescriptorBytes, LogHere());
}

int BitmapIsSet(const char *cachePath, int *isSet) {
    if (DoIoctlOrSay("Ioctl error", cachePath, kPinIoctlQueryBitmapSet, isSet, sizeof(*isSet),
                     LogHere()) < 0) {
        return -1;
    }
    LogVerbose("Bitmap is set = %d", *isSet);
    return 0;
}

int isAllBlocksUnpin(const char *cachePath, int *allUnpinned) {
    LogTraceScope();
    LogVerbose("Cache path = %s", cachePath);
    if (DoIoctlOrSay("Ioctl error", cachePath, kPinIoctlQueryAllUnpinned, allUnpinned,
                     sizeof(*allUnpinned), LogHere()) < 0) {
        return -1;
    }
    LogVerbose("Is all block unpin = %d", *allUnpinned);
    return 0;
}
} // namespace vesk
