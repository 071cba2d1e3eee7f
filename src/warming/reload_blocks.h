// Warming after a mount: every block whose bit is set in the volume's pin bitmap is read through
// the cache device; neighbouring blocks in one go. Thread rule: called on the worker's thread,
// without the service lock. Gives way to a pending volume before and after each read, and after
// each 4096 bytes of equal bits at the latest.
#pragma once

#include "bitmap/pin_bitmap.h"
#include "warming/work_result.h"

namespace vesk {
// Done, Failed after an error message, or Interrupted.
WorkResult ReloadPinBlocksToCache(const PinBitmap *bitmap, const char *cacheDevicePath,
                                  const char *mountPath);
} // namespace vesk
