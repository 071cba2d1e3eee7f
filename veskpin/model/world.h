// The world as the commands see it: volumes with their caches, records and requests. Read once.
//
// Thread rule: one thread.
#pragma once

#include "model/look_errors.h"
#include "model/recorded_files.h"
#include "model/volume_look.h"

#include <optional>
#include <string>
#include <vector>

namespace vesk {
struct WorldVolume {
    Volume volume;
    KnownFiles known;
};

struct World {
    std::string configPath;
    bool isConfigKnown = false;
    uint64_t storedRequests = 0;
    // Mounted volumes with a cache, and all with records or requests, in order of their paths.
    std::vector<WorldVolume> volumes;
    std::vector<std::string> withoutCache; // mount paths of the other spaces
    LookErrors errors;
};

World WorldLook(const std::string &configPath);

// The volume of this mount path, or null.
const WorldVolume *WorldVolumeFind(const World &world, const std::string &mountPath);

// The volumes asked for, all where none is. Of what is unknown or has no cache an error is added to
// the world's.
std::vector<const WorldVolume *> WorldVolumesWanted(World &world,
                                                    const std::vector<std::string> &wanted);
} // namespace vesk
