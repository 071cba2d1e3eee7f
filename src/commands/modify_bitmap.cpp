#include "commands/modify_bitmap.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "bitmap/bitmap_file.h"
#include "bitmap/space_bitmap.h"
#include "driver/bitmap_control.h"
#include "space/space.h"
#include "space/space_bitmap_path.h"
#include "space/space_cache.h"

namespace {

const int opUnset = 0;
const int opSet = 1;

} // namespace

int ModifyBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors, int op) {
    const MallocText uuid(SpaceGetUUID(mountPath));
    if (!uuid) {
        LogError("Can't get space uuid");
        return -1;
    }
    const MallocText cachePath(SpaceGetCachePath(uuid.get()));
    if (!cachePath) {
        LogError("Can't get cache path");
        return -1;
    }
    const MallocText bitmapPath(SpaceGetBitmapPath(uuid.get()));
    if (!bitmapPath) {
        LogError("Can't get bitmap path");
        return -1;
    }
    PinBitmap *loaded = nullptr;
    bool sizeChanged = false;
    const int loadResult = BitmapAllocateAndInitialize(uuid.get(), &loaded, &sizeChanged);
    const BitmapHolder bitmap(loaded);
    if (loadResult < 0) {
        LogError("Allocate bitmap failed");
        return -1;
    }
    switch (op) {
    case opSet:
        if (BitmapSetRange(bitmap.get(), startSector, numSectors) != 0) {
            LogError("Can't get bitmap to file");
            return -1;
        }
        break;
    case opUnset:
        if (BitmapUnsetRange(bitmap.get(), startSector, numSectors) != 0) {
            LogError("Can't unset bitmap to file");
            return -1;
        }
        break;
    default: LogError("Unknown bitmap op = %d", op); return -1;
    }
    if (BitmapWriteToFile(bitmap.get(), bitmapPath.get()) < 0) {
        LogError("Write bitmap failed");
        return -1;
    }
    if (BitmapSendToDriver(bitmap.get(), cachePath.get()) < 0) {
        LogError("Can't send bitmap to driver");
        return -1;
    }
    return 0;
}

int SetBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors) {
    if (ModifyBitmap(mountPath, startSector, numSectors, opSet) != 0) {
        LogError("Set bitmap failed");
        return -1;
    }
    return 0;
}

int UnsetBitmap(const char *mountPath, uint64_t startSector, uint64_t numSectors) {
    if (ModifyBitmap(mountPath, startSector, numSectors, opUnset) != 0) {
        LogError("Set bitmap failed");
        return -1;
    }
    return 0;
}
