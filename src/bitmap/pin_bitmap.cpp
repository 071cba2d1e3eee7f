#include "bitmap/pin_bitmap.h"

#include "base/log.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <endian.h>

namespace vesk {
namespace {
void ApplyMask(unsigned char *byte, unsigned mask, bool set) {
    *byte = static_cast<unsigned char>(set ? *byte | mask : *byte & ~mask);
}

// The same for bits of one 64-bit word. Most extents of a file end here: without a branch that
// depends on where they lie, they cost what the memory costs.
void ApplyWord(unsigned char *word, unsigned first, unsigned last, bool set) {
    const uint64_t mask = htole64(UINT64_MAX << first & UINT64_MAX >> (63 - last));
    uint64_t value = 0;
    memcpy(&value, word, sizeof(value));
    value = set ? value | mask : value & ~mask;
    memcpy(word, &value, sizeof(value));
}

// Bits first to last inclusive; both inside the bitmap of `size` bytes. Whole bytes in between are
// filled, so a range over a 16 TiB device costs a memory fill.
void ApplyBits(unsigned char *data, size_t size, uint64_t first, uint64_t last, bool set) {
    const size_t wordBytes = static_cast<size_t>(first >> 6) * sizeof(uint64_t);
    if (first >> 6 == last >> 6 && wordBytes + sizeof(uint64_t) <= size) {
        ApplyWord(data + wordBytes, first & 63, last & 63, set);
        return;
    }
    const size_t firstByte = static_cast<size_t>(first >> 3);
    const size_t lastByte = static_cast<size_t>(last >> 3);
    const unsigned firstMask = 0xFFU << (first & 7) & 0xFFU;
    const unsigned lastMask = 0xFFU >> (7 - (last & 7));
    if (firstByte == lastByte) {
        ApplyMask(data + firstByte, firstMask & lastMask, set);
        return;
    }
    ApplyMask(data + firstByte, firstMask, set);
    memset(data + firstByte + 1, set ? 0xFF : 0, lastByte - firstByte - 1);
    ApplyMask(data + lastByte, lastMask, set);
}
} // namespace

void BitmapFree(PinBitmap *bitmap) {
    if (bitmap == nullptr) {
        LogError("Bitmap is already NULL");
        return;
    }
    if (bitmap->data == nullptr) {
        LogError("Warning: data is NULL for free");
    } else {
        free(bitmap->data);
        bitmap->data = nullptr;
    }
    bitmap->size = 0;
    free(bitmap);
}

BitRun BitmapBlocksOf(uint64_t startSector, uint64_t numSectors) {
    const uint64_t first = startSector >> kBitmapSectorShift;
    const uint64_t last = (startSector + numSectors - 1) >> kBitmapSectorShift;
    return {first, first > last ? 0 : last - first + 1};
}

int BitmapOperation(PinBitmap *bitmap, uint64_t startSector, uint64_t numSectors, int op) {
    LogDebug("Disk start sector=%llu num sectors=%llu\n", LogU64(startSector), LogU64(numSectors));
    const uint64_t bits = static_cast<uint64_t>(bitmap->size) * 8;
    const BitRun blocks = BitmapBlocksOf(startSector, numSectors);
    if (blocks.count == 0 || blocks.first >= bits) {
        return 0;
    }
    const uint64_t last = std::min(blocks.first + blocks.count, bits) - 1;
    ApplyBits(bitmap->data, bitmap->size, blocks.first, last, op == 1);
    return 0;
}

int BitmapSetRange(PinBitmap *bitmap, uint64_t startSector, uint64_t numSectors) {
    return BitmapOperation(bitmap, startSector, numSectors, 1);
}

int BitmapUnsetRange(PinBitmap *bitmap, uint64_t startSector, uint64_t numSectors) {
    return BitmapOperation(bitmap, startSector, numSectors, 0);
}
} // namespace vesk
