#include "model/world.h"
#include "text/escape.h"
#include "verbs/answer.h"
#include "verbs/verbs.h"

#include <unistd.h>

#include <algorithm>

namespace vesk {
namespace {
// The recorded paths of the volume, each once.
template <typename Visit> void ForEachPath(const WorldVolume &world, const Visit &visit) {
    const std::string *last = nullptr;
    for (const KnownFile &file : world.known.files) {
        if (file.inode && (last == nullptr || *last != file.relativePath)) {
            visit(VolumePath(world.volume.mountPath, file.relativePath));
            last = &file.relativePath;
        }
    }
}

void ExportJson(const std::vector<const WorldVolume *> &volumes, const LookErrors &errors,
                TextSink &out) {
    JsonWriter json(out);
    AnswerBegin(json, "export");
    json.BeginArray("files");
    for (const WorldVolume *volume : volumes) {
        ForEachPath(*volume, [&](const std::string &path) {
            json.BeginObject();
            json.Path("volume", volume->volume.mountPath);
            json.Path("path", path);
            json.EndObject();
        });
    }
    json.EndArray();
    AnswerEnd(json, out, errors);
}

// What is recorded can be told whatever has become of mounts and caches.
void KeepConfigErrors(World *world) {
    auto &list = world->errors.list;
    list.erase(
        std::remove_if(list.begin(), list.end(),
                       [&](const LookError &error) { return error.path != world->configPath; }),
        list.end());
    world->errors.isUnknown = !world->isConfigKnown;
    for (WorldVolume &volume : world->volumes) {
        volume.errors = {};
        volume.errors.isUnknown = !volume.known.isRecordedKnown;
        volume.volume.isMounted = true;
        volume.volume.hasCache = true;
    }
}
} // namespace

ExitStatus ExportCommand(const Settings &settings, TextSink &out) {
    World world = WorldLook(settings.configPath);
    KeepConfigErrors(&world);
    const auto volumes = WorldVolumesWanted(world, settings.volumes);
    bool isWhole = true;
    const bool isTerminal = isatty(STDOUT_FILENO) == 1;
    if (settings.json) {
        ExportJson(volumes, world.errors, out);
        return ExitStatusOf(world.errors.isUnknown, isWhole);
    }
    for (const WorldVolume *volume : volumes) {
        ForEachPath(*volume, [&](const std::string &path) {
            if (settings.nulSeparated) {
                out.Put(path);
                out.Put({"\0", 1});
            } else if (path.find('\n') == std::string::npos) {
                out.Put((isTerminal ? TextEscaped(path) : path) + "\n");
            } else {
                LookErrorAdd(&world.errors, path, "its name holds a line feed: use -0");
                isWhole = false;
            }
        });
    }
    AnswerErrors(world.errors);
    return ExitStatusOf(world.errors.isUnknown, isWhole);
}
} // namespace vesk
