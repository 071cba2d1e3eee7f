// The choice of the storage spaces among the mounts.
//
// Thread rule: no state; the functions are independent of each other.
#pragma once

#include "storage_core/mount_table.h"

#include <functional>
#include <string>
#include <vector>

namespace vesk {
// One storage space. Both texts fit their fields of VESKSpaceInfo with the NUL.
struct Space {
    std::string devicePath;    // block device path
    std::string referencePath; // mount path
};

// Gives the block device path of a mount, or an empty text; see BlockDeviceOfMount.
using SpaceDeviceLookup = std::function<std::string(const MountEntry &)>;

// The spaces in table order: every filesystem on a block device, each by its first mount that shows
// the whole of it (btrfs: a whole subvolume), is not hidden by another mount and has paths that
// fit.
std::vector<Space> SpaceListSelect(const std::vector<MountEntry> &mounts,
                                   const SpaceDeviceLookup &deviceOf);
} // namespace vesk
