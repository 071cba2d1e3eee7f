// Records as the looks make them, made by hand.
#pragma once

#include "bitmap/file_blocks.h"
#include "model/file_look.h"
#include "model/world.h"

#include <sys/stat.h>

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace vesk {
// A volume on a device of 64 blocks with an SSD of 32, nothing marked.
inline WorldVolume MakeVolume(const std::string &mountPath = "/volume1") {
    WorldVolume world;
    Volume &volume = world.volume;
    volume.mountPath = mountPath;
    volume.isMounted = true;
    volume.hasCache = true;
    volume.uuid = "uuid-1";
    volume.cacheDevice = "/dev/mapper/cachedev_0";
    volume.ssd = "/dev/ssd1";
    volume.deviceBytes = 64 * 65536;
    volume.ssdBlocks = 32;
    volume.supportsPin = true;
    volume.driverHasBitmap = true;
    volume.allUnpinned = false;
    volume.bitmapBytes = 8;
    volume.bitmapBytesNeeded = 8;
    volume.held = false;
    volume.marked = BlockSetOf(64);
    return world;
}

// An extent's sectors on the device: the first and how many.
using Sectors = std::pair<uint64_t, uint64_t>;

// A regular file that was looked at.
inline FileLook MakeLook(uint64_t inode, const std::vector<Sectors> &extents, uint64_t bytes = 0) {
    FileLook look;
    look.status = {inode, bytes, S_IFREG | 0644, 1, 0};
    look.hasExtents = true;
    for (const auto &[start, count] : extents) {
        FileMappingEntry entry{};
        entry.deviceStartSector = start;
        entry.numSectors = count;
        look.table.entries.push_back(entry);
    }
    look.blocks = FileBlocksOf(look.table);
    return look;
}

inline FileLook FailedLook(int error) {
    FileLook look;
    look.error = error;
    return look;
}
} // namespace vesk
