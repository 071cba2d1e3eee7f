#include "verbs/change_outcome.h"

#include "model/world.h"
#include "verbs/list.h"

#include <map>
#include <vector>

namespace vesk {
namespace {
struct Seen {
    std::optional<FileState> state;
    bool isThere = false; // there is a file or a record of it
};

std::optional<ChangeReason> ReasonOf(const RequestBatch &batch, const Seen &seen) {
    const bool isPin = batch.type == kRequestPinFiles;
    if (!seen.isThere || seen.state == FileState::Missing || seen.state == FileState::Replaced) {
        return isPin ? ChangeReason::Vanished : ChangeReason::NeedsRepair;
    }
    const bool isDone =
        isPin ? seen.state != FileState::Unpinned
              : seen.state == FileState::Unpinned || seen.state == FileState::Unpinning;
    if (isDone) {
        return std::nullopt;
    }
    return batch.mayBeLost ? ChangeReason::NotTaken : ChangeReason::Dropped;
}
} // namespace

void OutcomeTell(const std::string &configPath, const RequestBatch &batch,
                 std::optional<ChangeReason> reason, const ChangeTeller &tell) {
    World world = WorldLook(configPath);
    std::vector<std::string> paths;
    paths.reserve(batch.files.size());
    for (const BatchFile &file : batch.files) {
        paths.push_back(VolumePath(batch.mountPath, file.relativePath));
    }
    std::map<std::string, Seen> files;
    ListLook(world, paths, std::nullopt, [&](const ListedFile &file) {
        files[file.path] = {file.state, true};
    });
    for (const std::string &path : paths) {
        const Seen seen = files[path];
        tell({path, seen.state, reason ? reason : ReasonOf(batch, seen)});
    }
}
} // namespace vesk
