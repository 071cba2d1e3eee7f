// Handing the pin bitmap to the cache driver and asking for the driver's pin state. Thread rule: no
// state; every request opens the device anew.
#pragma once

#include "driver/pin_interface.h"

namespace vesk {
// Hands over the whole bitmap. 0, or -1 after an error message (also for null arguments).
int BitmapSendToDriver(PinBitmap *bitmap, const char *cachePath);

// Whether a bitmap has been set on this cache: `*isSet` non-zero. 0, or -1 after an error message.
int BitmapIsSet(const char *cachePath, int *isSet);

// Whether no block of the cache is pinned: `*allUnpinned` non-zero. 0, or -1 after an error
// message.
int isAllBlocksUnpin(const char *cachePath, int *allUnpinned);
} // namespace vesk
