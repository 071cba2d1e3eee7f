// The extents of an open file, asked of the kernel by FIEMAP.
//
// Thread rule: no state; the functions are independent of each other.
#pragma once

#include "vesk/storage_core.h"

#include <linux/fiemap.h>

#include <vector>

namespace vesk {
// Turns one extent into sectors. False: the extent has no place of whole sectors on the device (not
// allocated yet, kept in the inode, packed or compressed) and `entry` is left alone.
bool FileExtentConvert(const fiemap_extent &extent, FileMappingEntry &entry);

// Appends the extents of an open regular file to `entries`, in file order. Its data is written out
// first: else what has no place yet would be missing, and what a copy on write is about to move
// would be told at its old place. False: the kernel did not answer; `entries` then holds what came
// before.
bool FileExtentsRead(int fd, std::vector<FileMappingEntry> &entries);
} // namespace vesk
