// A volume with what belongs to it: space, cache, driver, bitmap. Everything is looked at once;
// what cannot be had is absent, and where it should be there an error says why.
//
// Thread rule: no state.
#pragma once

#include "model/block_set.h"
#include "model/look_errors.h"
#include "space/space.h"

#include <cstdint>
#include <optional>
#include <string>

namespace vesk {
struct Volume {
    std::string mountPath;
    bool isMounted = false;
    bool hasCache = false; // also where the list of caches cannot be read: then it is not known
    std::optional<std::string> uuid;
    std::optional<std::string> cacheDevice;
    std::optional<std::string> ssd;
    std::optional<uint64_t> deviceBytes;       // of the cache device
    std::optional<uint64_t> ssdBlocks;         // that fit on the SSD
    std::optional<bool> supportsPin;           // cache and driver can pin
    std::optional<bool> driverHasBitmap;       // the driver was given one
    std::optional<bool> allUnpinned;           // no block is pinned in the driver
    std::optional<uint64_t> bitmapBytes;       // of the bitmap file; absent without one
    std::optional<uint64_t> bitmapBytesNeeded; // for all blocks of the cache device
    std::optional<uint64_t> blocksHeld;        // pinned in the driver
    std::optional<bool> held;                  // by a veskpin that changes something
    std::optional<BlockSet> marked;            // the bitmap, as long as it should be
    std::optional<BlockSet> resident;          // what lies on the SSD
};

// The mounted volume of this space.
Volume VolumeLook(const SpaceEntry &space, LookErrors *errors);

// The absolute path of what lies below a volume; the mount path itself for an empty one.
std::string VolumePath(const std::string &mountPath, const std::string &relativePath);

// A note that a changing veskpin leaves while it holds the volume (one file a volume).
std::string VolumeHoldNote(const std::string &uuid);
} // namespace vesk
