#include "bitmap/space_bitmap.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "bitmap/bitmap_file.h"
#include "driver/device.h"
#include "files/path.h"
#include "space/space_bitmap_path.h"
#include "space/space_cache.h"

#include <cstdlib>

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
    *sizeBytes = deviceBytes >> bitmapSizeShift;
    return 0;
}

int BitmapAllocateAndInitialize(const char *spaceUUID, PinBitmap **bitmap, bool *sizeChanged) {
    *sizeChanged = false;
    const MallocText bitmapPath(SpaceGetBitmapPath(spaceUUID));
    if (!bitmapPath) {
        LogError("Can't get bitmap path");
        return -1;
    }
    const MallocText cachePath(SpaceGetCachePath(spaceUUID));
    if (!cachePath) {
        LogError("Can't get cache path");
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
    if (PathIsMissing(bitmapPath.get())) {
        LogVerbose("Bitmap files (%s) doesn't exist", bitmapPath.get());
        return 0;
    }
    uint64_t fileBytes = 0;
    if (FileGetSizeByte(bitmapPath.get(), &fileBytes) < 0) {
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
