#include "commands/commands.h"

#include "base/log.h"
#include "bitmap/space_bitmap.h"

namespace vesk {
namespace {
const int kOpUnset = 0;
const int kOpSet = 1;
} // namespace

int ModifyBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors, int op) {
    VolumeBitmap volume;
    if (VolumeBitmapOpen(mountPath, &volume, LogHere()) < 0) {
        return -1;
    }
    if (op != kOpSet && op != kOpUnset) {
        LogError("Unknown bitmap op = %d", op);
        return -1;
    }
    if (BitmapOperation(volume.bitmap.get(), startSector, numSectors, op) != 0) {
        LogError(op == kOpSet ? "Can't get bitmap to file" : "Can't unset bitmap to file");
        return -1;
    }
    return BitmapWriteAndSend(volume.bitmap.get(), volume.bitmapPath.get(), volume.cachePath.get(),
                              LogHere());
}

int SetBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors) {
    if (ModifyBitmap(mountPath, startSector, numSectors, kOpSet) != 0) {
        LogError("Set bitmap failed");
        return -1;
    }
    return 0;
}

int UnsetBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors) {
    if (ModifyBitmap(mountPath, startSector, numSectors, kOpUnset) != 0) {
        LogError("Set bitmap failed");
        return -1;
    }
    return 0;
}
} // namespace vesk
