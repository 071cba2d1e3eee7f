// Warming after a mount: every block whose bit is set in the volume's pin bitmap is read through
// the cache device; neighbouring blocks in one go.
//
// Thread rule: called on the worker's thread, without the service lock. Gives way after each bit
// when the volume is pending (a stretch of clear bytes, or of set ones, of up to 4 KiB counts as
// one).
#ifndef WARMING_RELOAD_BLOCKS_H
#define WARMING_RELOAD_BLOCKS_H

#include "bitmap/pin_bitmap.h"
#include "warming/work_result.h"

// Done, Failed after an error message, or Interrupted.
WorkResult ReloadPinBlocksToCache(const PinBitmap *bitmap, const char *cacheDevicePath,
                                  const char *mountPath);

#endif
