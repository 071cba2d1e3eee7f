// Applying one file to a pin bitmap: pinning marks the blocks of all its extents, unpinning clears
// them and collects the ranges that the cache driver may release.
//
// Work is block by block without a reference count: a block that two files share is cleared with
// either of them.
//
// Thread rule: no state; a bitmap belongs to one thread at a time.
#pragma once

#include "bitmap/pin_bitmap.h"
#include "driver/pin_interface.h"

#include "vesk/storage_core.h"

#include <cstdint>
#include <string>
#include <vector>

namespace vesk {
// Marks the file's blocks and hands its extents over in `*tableOut`. 0, or -1 with the bitmap
// untouched.
int BitmapAddFile(PinBitmap *bitmap, const char *mountPath, const std::string &filePath,
                  uint32_t inode, FileMappingTable *tableOut);

// Clears the file's blocks and appends one range for each extent, in extent order. 0, or -1 after
// an error message with nothing cleared or appended. `cachePath` is not used.
int UnsetBitmapAndAppendUnpinInfos(const char *cachePath, PinBitmap *bitmap, const char *mountPath,
                                   const std::string &filePath, uint32_t inode,
                                   std::vector<UnpinInfo> *infos);
} // namespace vesk
