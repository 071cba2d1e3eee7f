#include "bitmap/space_bitmap.h"

#include "bitmap/bitmap_file.h"
#include "driver/bitmap_control.h"
#include "driver/device.h"
#include "files/path.h"
#include "space/space.h"
#include "space/space_cache.h"

#include <cstdlib>

namespace vesk {
namespace {
// A record whose bytes were allocated is released here, and the caller's pointer says so.
void ReleaseBitmap(PinBitmap **bitmap) {
    BitmapFree(*bitmap);
    *bitmap = nullptr;
}
} // namespace

int BitmapGetNeededSizeByte(const char *cachePath, uint64_t *sizeBytes) {
    uint64_t deviceBytes = 0;
    if (DeviceGetSizeByte(cachePath, &deviceBytes) < 0) {
        LogError("Can't get block device path");
        return -1;
    }
    LogVerbose("Disk size = %llu byte", LogU64(deviceBytes));
    *sizeBytes = deviceBytes >> kBitmapSizeShift;
    return 0;
}

int BitmapAllocateAndInitialize(const char *spaceUUID, PinBitmap **bitmap, bool *sizeChanged) {
    *sizeChanged = false;
    MallocText bitmapPath;
    MallocText cachePath;
    if (!SpaceTake(SpaceGetBitmapPath(spaceUUID), &bitmapPath, "Can't get bitmap path",
                   LogHere()) ||
        !SpaceTake(SpaceGetCachePath(spaceUUID), &cachePath, "Can't get cache path", LogHere())) {
        return -1;
    }
    auto *record = static_cast<PinBitmap *>(calloc(1, sizeof(PinBitmap)));
    if (record == nullptr) {
        LogError("Allocate bitmap data failed");
        return -1;
    }
    *bitmap = record;
    uint64_t memoryBytes = 0;
    if (BitmapGetNeededSizeByte(cachePath.get(), &memoryBytes) < 0) {
        LogError("Can't get needed bitmap sizeof");
        return -1;
    }
    record->data = static_cast<unsigned char *>(calloc(static_cast<size_t>(memoryBytes), 1));
    if (record->data == nullptr) {
        LogError("Can't allocate bitmap memory");
        return -1;
    }
    record->size = static_cast<uint32_t>(memoryBytes);
    LogVerbose("Allocate %zu bytes bitmap", static_cast<size_t>(memoryBytes));

    // A file that cannot be looked up is not taken for a missing one: it holds the volume's pins.
    if (PathIsMissing(bitmapPath.get(), LastLink::Itself)) {
        LogVerbose("Bitmap files (%s) doesn't exist", bitmapPath.get());
        return 0;
    }
    uint64_t fileBytes = 0;
    if (FileGetSizeByte(bitmapPath.get(), &fileBytes, LastLink::Itself) < 0) {
        LogError("Get the size of file (%s) error", bitmapPath.get());
        ReleaseBitmap(bitmap);
        return -1;
    }
    LogVerbose("Bitmap memory size = %llu, file size = %llu", LogU64(memoryBytes),
               LogU64(fileBytes));
    if (memoryBytes > fileBytes) {
        LogNotice("Bitmap size changed. Could be due to volume expansion");
        *sizeChanged = true;
    } else if (memoryBytes < fileBytes) {
        LogError("Incorrect bitmap size (%llu), file size (%llu)", LogU64(memoryBytes),
                 LogU64(fileBytes));
        ReleaseBitmap(bitmap);
        return -1;
    }
    if (BitmapInitByFile(bitmapPath.get(), record) < 0) {
        LogError("Read bitmap file to bitmap memory error");
        ReleaseBitmap(bitmap);
        return -1;
    }
    return 0;
}

int VolumeBitmapLoad(VolumeBitmap *volume, const LogPlace &place) {
    // Handed over however the load ends.
    struct Loaded {
        BitmapHolder &holder;
        PinBitmap *bitmap = nullptr;
        ~Loaded() { holder.reset(bitmap); }
    };
    int result = -1;
    {
        Loaded loaded{volume->bitmap};
        result =
            BitmapAllocateAndInitialize(volume->uuid.get(), &loaded.bitmap, &volume->sizeChanged);
    }
    if (result < 0) {
        LogErrorAt(place, "Allocate bitmap failed");
    }
    return result;
}

int VolumeBitmapOpen(const char *mountPath, VolumeBitmap *volume, const LogPlace &place) {
    const bool found =
        SpaceTake(SpaceGetUUID(mountPath), &volume->uuid, "Can't get space uuid", place) &&
        SpaceTake(SpaceGetCachePath(volume->uuid.get()), &volume->cachePath, "Can't get cache path",
                  place) &&
        SpaceTake(SpaceGetBitmapPath(volume->uuid.get()), &volume->bitmapPath,
                  "Can't get bitmap path", place);
    return found ? VolumeBitmapLoad(volume, place) : -1;
}

int BitmapWriteAndSend(PinBitmap *bitmap, const char *bitmapPath, const char *cachePath,
                       const LogPlace &place) {
    if (bitmapPath != nullptr && BitmapWriteToFile(bitmap, bitmapPath) < 0) {
        LogErrorAt(place, "Write bitmap failed");
        return -1;
    }
    if (BitmapSendToDriver(bitmap, cachePath) < 0) {
        LogErrorAt(place, "Can't send bitmap to driver");
        return -1;
    }
    return 0;
}
} // namespace vesk
