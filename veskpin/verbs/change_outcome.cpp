#include "verbs/change_outcome.h"

#include "model/world.h"
#include "verbs/volume_lister.h"

#include <algorithm>
#include <cerrno>

namespace vesk {
namespace {
FileState WantedOf(const RequestBatch &batch) {
    return batch.type == kRequestPinFiles ? FileState::Pinned : FileState::Unpinned;
}

// Whether it is what was asked for, or is on the way to it.
bool IsDone(bool isPin, FileState state) {
    return isPin ? state == FileState::Pinned || state == FileState::Pinning
                 : state == FileState::Unpinned || state == FileState::Unpinning;
}

// Nothing, or another file, is at its path.
bool IsGone(FileLooker &looker, const BatchFile &file) {
    FileStat status{};
    const int error = looker.Stat(file.relativePath, &status);
    return FileIsNowhere(error) ||
           (error == 0 && static_cast<uint32_t>(status.inode) != file.inode);
}

// An older record of the path, which no request undoes, hides that the file is recorded, too: under
// another path, since it was renamed.
bool IsHidden(const KnownFiles &known, const BatchFile &file, FileState state) {
    const auto elsewhere = KnownFileByInode(known, file.inode);
    return state == FileState::Replaced && elsewhere && elsewhere->inode;
}

std::optional<ChangeReason> ReasonOf(const RequestBatch &batch, const BatchFile &file,
                                     const KnownFiles &known, FileLooker &looker, FileState state,
                                     const FileFigures &figures) {
    const bool isPin = batch.type == kRequestPinFiles;
    if (IsDone(isPin, state)) {
        return std::nullopt;
    }
    if (!isPin && (state == FileState::Missing || state == FileState::Replaced)) {
        return ChangeReason::NeedsRepair;
    }
    if (IsGone(looker, file)) {
        return isPin ? ChangeReason::Vanished : ChangeReason::NeedsRepair;
    }
    if (IsHidden(known, file, state)) {
        return ChangeReason::NeedsRepair;
    }
    // More than was sent for cannot be marked.
    const bool hasGrown = state == FileState::Partial && figures.blocks > file.blocks;
    if (batch.isSettled || (isPin && hasGrown)) {
        return std::nullopt;
    }
    return batch.mayBeLost ? ChangeReason::NotTaken : ChangeReason::Dropped;
}

void TellBatch(World &world, const RequestBatch &batch, std::optional<ChangeReason> reason,
               const ChangeTeller &tell) {
    const WorldVolume *volume = WorldVolumeFind(world, batch.mountPath);
    if (volume == nullptr) {
        // It has no records any more, and is not mounted or has no cache.
        LookUnknownAdd(&world.errors, batch.mountPath, "is not mounted, or has no cache");
        const auto &others = world.withoutCache;
        const bool isSure =
            world.areVolumesKnown && world.isConfigKnown &&
            std::find(others.begin(), others.end(), batch.mountPath) != others.end();
        for (const BatchFile &file : batch.files) {
            const auto dropped = batch.type == kRequestPinFiles
                                     ? std::optional(ChangeReason::Dropped)
                                     : std::nullopt;
            tell({VolumePath(batch.mountPath, file.relativePath),
                  isSure ? std::optional(FileState::Unpinned) : std::nullopt,
                  reason   ? reason
                  : isSure ? dropped
                           : std::nullopt});
        }
        return;
    }
    FileLooker looker(batch.mountPath);
    const BatchFile *current = nullptr;
    const VolumeLister::Visit visit = [&](const ListedFile &file) {
        const bool isSo = reason == ChangeReason::NotTaken && file.state == WantedOf(batch);
        const auto why = isSo                    ? std::nullopt
                         : reason || !file.state ? reason
                                                 : ReasonOf(batch, *current, volume->known, looker,
                                                            *file.state, file.figures);
        tell({file.path, file.state, why});
    };
    VolumeLister lister(*volume, std::nullopt, world, visit);
    for (const BatchFile &file : batch.files) {
        current = &file;
        lister.ListAsked(file.relativePath);
    }
}
} // namespace

void OutcomeTell(const std::string &configPath, const std::vector<RequestBatch> &batches,
                 std::optional<ChangeReason> reason, const ChangeTeller &tell, LookErrors *errors) {
    World world = WorldLook(configPath);
    for (const RequestBatch &batch : batches) {
        TellBatch(world, batch, reason, tell);
    }
    LookErrorsAdd(errors, world.errors);
}
} // namespace vesk
