// The pin bitmap of a space: sized from the space's cache device, filled from the space's bitmap
// file. Thread rule: no state; a bitmap belongs to one thread at a time.
#pragma once

#include "base/log.h"
#include "base/malloc_text.h"
#include "bitmap/pin_bitmap.h"

#include <cstdint>
#include <memory>

namespace vesk {
// The bitmap size (bytes) that the cache device at `cachePath` needs. 0, or -1 after an error
// message.
int BitmapGetNeededSizeByte(const char *cachePath, uint64_t *sizeBytes);

// Builds the space's bitmap; all zero where there is no bitmap file yet. A file shorter than the
// bitmap (the volume has grown) fills its start and sets `*sizeChanged`; a longer one is a failure.
// So is a look-up that fails otherwise than by "nothing there", since the file holds the volume's
// pins, and what bitmap/bitmap_file.h refuses to open: a symbolic link in the file's place is
// there, wherever it points. 0, or -1 after an error message. `*bitmap` must be null before the
// call; whatever it holds after it, on failure too, the caller releases with BitmapFree. Nothing is
// written.
int BitmapAllocateAndInitialize(const char *spaceUUID, PinBitmap **bitmap, bool *sizeChanged);

// Holds a bitmap until its scope ends.
using BitmapHolder = std::unique_ptr<PinBitmap, Deleter<BitmapFree>>;

// A volume's bitmap and what it is looked up by; null what has not been found.
struct VolumeBitmap {
    MallocText uuid; // the space's
    MallocText cachePath;
    MallocText bitmapPath;
    BitmapHolder bitmap; // also what a failed load has left
    bool sizeChanged = false;
};

// The load alone, by `uuid`, and all the look-ups with it. 0, or -1 after an error message at the
// caller's place.
int VolumeBitmapLoad(VolumeBitmap *volume, const LogPlace &place);
int VolumeBitmapOpen(const char *mountPath, VolumeBitmap *volume, const LogPlace &place);

// Writes the bitmap's file, unless its path is null, and hands the bitmap to the driver. 0, or -1
// after an error message at the caller's place.
int BitmapWriteAndSend(PinBitmap *bitmap, const char *bitmapPath, const char *cachePath,
                       const LogPlace &place);
} // namespace vesk
