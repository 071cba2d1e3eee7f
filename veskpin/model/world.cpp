#include "model/world.h"

#include "config/config_records.h"
#include "model/service_look.h"

#include <algorithm>
#include <set>

namespace vesk {
namespace {
ConfigRecords ReadRecords(World *world) {
    ConfigRecords records;
    world->isConfigKnown = ConfigReadRecords(world->configPath.c_str(), &records) == 0;
    const std::string logged = LookLogTake("cannot be read");
    if (!world->isConfigKnown) {
        LookUnknownAdd(&world->errors, world->configPath, logged);
    }
    for (const std::string &problem : records.problems) {
        LookErrorAdd(&world->errors, world->configPath, problem);
    }
    world->errors.isUnknown =
        world->errors.isUnknown || !records.areVolumesKnown || !records.areRequestsKnown;
    return records;
}

// What waits in the queue. Read before the document, in which stands what is taken from it
// meanwhile.
std::vector<RequestRecord> ReadSent(World *world) {
    std::vector<RequestRecord> sent;
    LookErrors errors; // that there is no queue is no error of the files'
    const Queue queue = QueueLook(&errors);
    const bool isFound = queue.cause == MsgQueueCause::Found;
    if (errors.isUnknown || (isFound && MsgQueueCopy(queue.state, &sent) < 0)) {
        world->areSentKnown = false;
        LookErrorAdd(&world->errors, kMessageKeyFile,
                     "the requests that wait in the queue cannot be seen");
    }
    return sent;
}

RecordedVolume *RecordsOf(ConfigRecords *records, const std::string &mountPath) {
    const auto found =
        std::find_if(records->volumes.begin(), records->volumes.end(),
                     [&](const RecordedVolume &volume) { return volume.mountPath == mountPath; });
    return found == records->volumes.end() ? nullptr : &*found;
}

// The mount paths that records and requests name.
std::set<std::string> PathsNamed(const ConfigRecords &records,
                                 const std::vector<RequestRecord> &sent) {
    std::set<std::string> paths;
    for (const RecordedVolume &volume : records.volumes) {
        paths.insert(volume.mountPath);
    }
    for (const StoredRequest &request : records.requests) {
        paths.insert(request.mountPath);
    }
    for (const RequestRecord &request : sent) {
        if (RequestHasFiles(request.type)) {
            paths.insert(request.mountPath);
        }
    }
    return paths;
}

void AddVolume(World *world, Volume volume, LookErrors errors, ConfigRecords *records,
               const std::vector<RequestRecord> &sent) {
    WorldVolume added;
    RecordedVolume *recorded = RecordsOf(records, volume.mountPath);
    added.known = KnownFilesOf(volume.mountPath, recorded, records->requests, sent);
    KnownFiles &known = added.known;
    known.isRecordedKnown = world->isConfigKnown && records->areVolumesKnown &&
                            (recorded == nullptr || recorded->areFilesKnown);
    known.isWhole = known.isRecordedKnown && records->areRequestsKnown && world->areSentKnown &&
                    known.problems.empty() && (recorded == nullptr || recorded->isWhole);
    for (const std::string &problem : known.problems) {
        LookErrorAdd(&errors, world->configPath, problem);
    }
    errors.isUnknown = errors.isUnknown || !known.isRecordedKnown;
    added.errors = std::move(errors);
    added.volume = std::move(volume);
    world->volumes.push_back(std::move(added));
}
} // namespace

World WorldLook(const std::string &configPath) {
    World world;
    world.configPath = configPath;
    LookLogTake("");
    const std::vector<RequestRecord> sent = ReadSent(&world);
    ConfigRecords records = ReadRecords(&world);
    if (world.isConfigKnown && records.areRequestsKnown) {
        world.storedRequests = records.requests.size();
    }
    std::set<std::string> named = PathsNamed(records, sent);
    SpaceCause cause = SpaceCause::Found;
    const std::vector<SpaceEntry> spaces = SpaceList(&cause);
    world.areVolumesKnown = cause == SpaceCause::Found;
    if (!world.areVolumesKnown) {
        LookUnknownAdd(&world.errors, "", LookLogTake("the volumes cannot be listed"));
    }
    for (const SpaceEntry &space : spaces) {
        if (space.referencePath.empty()) {
            continue; // mounted nowhere
        }
        LookErrors errors;
        Volume volume = VolumeLook(space, &errors);
        const bool isNamed = named.erase(volume.mountPath) != 0;
        // Whether it has one is not known without its UUID.
        errors.isUnknown = errors.isUnknown || (isNamed && !volume.uuid);
        if (!isNamed && !volume.hasCache) {
            world.withoutCache.push_back(volume.mountPath);
        } else {
            AddVolume(&world, std::move(volume), std::move(errors), &records, sent);
        }
    }
    for (const std::string &mountPath : named) {
        Volume volume;
        volume.mountPath = mountPath;
        LookErrors errors;
        LookErrorAdd(&errors, mountPath,
                     world.areVolumesKnown ? "is not mounted" : "cannot be found");
        AddVolume(&world, std::move(volume), std::move(errors), &records, sent);
    }
    std::sort(world.volumes.begin(), world.volumes.end(),
              [](const WorldVolume &a, const WorldVolume &b) {
                  return a.volume.mountPath < b.volume.mountPath;
              });
    return world;
}

const WorldVolume *WorldVolumeFind(const World &world, const std::string &mountPath) {
    const auto found =
        std::find_if(world.volumes.begin(), world.volumes.end(), [&](const WorldVolume &volume) {
            return volume.volume.mountPath == mountPath;
        });
    return found == world.volumes.end() ? nullptr : &*found;
}

void WorldVolumeUse(World &world, const WorldVolume &volume) {
    LookErrorsAdd(&world.errors, volume.errors);
}

std::vector<const WorldVolume *> WorldVolumesWanted(World &world,
                                                    const std::vector<std::string> &wanted) {
    std::vector<const WorldVolume *> volumes;
    if (wanted.empty()) {
        for (const WorldVolume &volume : world.volumes) {
            WorldVolumeUse(world, volume);
            volumes.push_back(&volume);
        }
        return volumes;
    }
    for (const std::string &given : wanted) {
        std::string mountPath = given;
        while (mountPath.size() > 1 && mountPath.back() == '/') {
            mountPath.pop_back();
        }
        if (const WorldVolume *volume = WorldVolumeFind(world, mountPath)) {
            WorldVolumeUse(world, *volume);
            if (!volume->volume.isMounted) {
                world.errors.isUnknown = true;
            } else if (!volume->volume.hasCache) {
                LookUnknownAdd(&world.errors, mountPath, "has no cache");
            }
            if (std::find(volumes.begin(), volumes.end(), volume) == volumes.end()) {
                volumes.push_back(volume);
            }
            continue;
        }
        const auto &others = world.withoutCache;
        const bool isMounted = std::find(others.begin(), others.end(), mountPath) != others.end();
        LookUnknownAdd(&world.errors, mountPath, isMounted ? "has no cache" : "is no volume");
    }
    return volumes;
}
} // namespace vesk
