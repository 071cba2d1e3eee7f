// The pin bitmap of a space: sized from the space's cache device, filled from the space's bitmap
// file.
//
// Thread rule: no state; a bitmap belongs to one thread at a time.
#ifndef BITMAP_SPACE_BITMAP_H
#define BITMAP_SPACE_BITMAP_H

#include "bitmap/pin_bitmap.h"

#include <cstdint>
#include <memory>

// The bitmap size (bytes) that the cache device at `cachePath` needs. 0, or -1 after an error
// message.
int BitmapGetNeededSizeByte(const char *cachePath, uint64_t *sizeBytes);

// Builds the space's bitmap; all zero where there is no bitmap file yet. A file shorter than the
// bitmap (the volume has grown) fills its start and sets `*sizeChanged`; a longer one is a failure.
// 0, or -1 after an error message. `*bitmap` must be null before the call; whatever it holds after
// it, on failure too, the caller releases with BitmapFree. Nothing is written.
int BitmapAllocateAndInitialize(const char *spaceUUID, PinBitmap **bitmap, bool *sizeChanged);

// Holds a bitmap for the length of a one-shot command.
struct BitmapDeleter {
    void operator()(PinBitmap *bitmap) const { BitmapFree(bitmap); }
};
using BitmapHolder = std::unique_ptr<PinBitmap, BitmapDeleter>;

#endif
