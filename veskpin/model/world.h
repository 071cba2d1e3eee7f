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
    LookErrors errors; // what of it could not be looked at
};

struct World {
    std::string configPath;
    bool isConfigKnown = false;
    bool areVolumesKnown = true; // false: not all could be listed
    bool areSentKnown = true;    // false: requests in the queue cannot be seen
    std::optional<uint64_t> storedRequests;
    // Mounted volumes with a cache, and all with records or requests, in order of their paths.
    std::vector<WorldVolume> volumes;
    std::vector<std::string> withoutCache; // mount paths of the other spaces
    LookErrors errors;
};

World WorldLook(const std::string &configPath);

// The volume of this mount path, or null.
const WorldVolume *WorldVolumeFind(const World &world, const std::string &mountPath);

// The volume is part of the answer: what of it could not be looked at becomes an error of the
// world's.
void WorldVolumeUse(World &world, const WorldVolume &volume);

// The volumes asked for, all where none is, and they are used. Of what is unknown, not mounted or
// without a cache an error is added to the world's.
std::vector<const WorldVolume *> WorldVolumesWanted(World &world,
                                                    const std::vector<std::string> &wanted);
} // namespace vesk
