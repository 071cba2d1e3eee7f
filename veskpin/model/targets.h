// What the PATHs of a command line mean: each a file or a folder of a volume, or why not.
//
// Thread rule: no state.
#pragma once

#include "model/file_look.h"
#include "model/world.h"

#include <optional>
#include <string>
#include <vector>

namespace vesk {
struct Target {
    std::string path;                    // absolute; the folders on the way resolved
    const WorldVolume *volume = nullptr; // the mounted volume with a cache that it lies on
    std::string relativePath;            // below that; empty: the mount point itself
    bool isWithoutCache = false;         // it lies on a volume, which has no cache
    int error = 0;                       // an errno: it cannot be looked at
    std::optional<FileStat> status;      // of a thing that is there
};

// A path that leads nowhere keeps the volume that its text names, for records may name it still.
Target TargetResolve(const World &world, const std::string &path);
} // namespace vesk
