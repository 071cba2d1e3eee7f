#include "verbs/neighbours.h"

#include "bitmap/pin_bitmap.h"

#include <algorithm>
#include <cerrno>
#include <set>
#include <utility>

namespace vesk {
namespace {
bool HasAny(const BlockSet &set, const std::vector<BitRun> &runs) {
    return std::any_of(runs.begin(), runs.end(),
                       [&](const BitRun &run) { return BlockSetCountIn(set, run) > 0; });
}

// Whether the file that is there is recorded, or will be by a request that comes before.
bool IsToStay(const KnownFile &file, const FileLook &look) {
    const auto inode = static_cast<uint32_t>(look.status.inode);
    return file.inode == inode ||
           (file.stored == kRequestPinFiles && file.storedInode.value_or(inode) == inode);
}

bool IsPinned(const KnownFile &file, const FileLook &look, const Volume &volume) {
    return FileStateOf(&file, look, FileFiguresOf(look, volume), volume) == FileState::Pinned;
}

bool IsGone(int error) {
    return error == ENOENT || error == ENOTDIR;
}
} // namespace

void Neighbours::Note(const RequestBatch &batch, const World &world) {
    const WorldVolume *volume = WorldVolumeFind(world, batch.mountPath);
    LetGo &letGo = volumes_[batch.mountPath];
    if (letGo.blocks.empty()) {
        letGo.blocks = BlockSetOf((volume->volume.deviceBytes.value_or(0) >> kBitmapByteShift) + 1);
    }
    FileLooker looker(batch.mountPath);
    for (const BatchFile &file : batch.files) {
        letGo.inodes.insert(file.inode);
        letGo.paths.push_back(file.relativePath);
        const FileLook &look = looker.Look(file.relativePath);
        if (!look.hasExtents || !volume->volume.deviceBytes) {
            LookUnknownAdd(&errors_, VolumePath(batch.mountPath, file.relativePath),
                           "which files share its blocks cannot be told");
        }
        for (const BitRun &run : look.blocks) {
            BlockSetAdd(&letGo.blocks, run);
        }
    }
}

void Neighbours::Send(const std::string &configPath, ChangeRun &run) {
    if (volumes_.empty()) {
        return;
    }
    World world = WorldLook(configPath);
    for (const auto &[mountPath, letGo] : volumes_) {
        if (const WorldVolume *volume = WorldVolumeFind(world, mountPath)) {
            WorldVolumeUse(world, *volume);
            SendOf(*volume, letGo, run);
        }
    }
    LookErrorsAdd(&errors_, world.errors);
}

// Leaves only blocks that were not known of. False: there are none.
bool Neighbours::FindGrown() {
    uint64_t grown = 0;
    for (auto &[mountPath, letGo] : volumes_) {
        FileLooker looker(mountPath);
        BlockSet blocks = BlockSetOf(uint64_t{letGo.blocks.size()} * 8);
        for (const std::string &path : letGo.paths) {
            for (const BitRun &run : looker.Look(path).blocks) {
                for (uint64_t at = run.first; at < run.first + run.count; ++at) {
                    const bool isKnown = BlockSetCountIn(letGo.blocks, {at, 1}) > 0;
                    grown += isKnown ? 0 : BlockSetAdd(&blocks, {at, 1});
                }
            }
        }
        letGo.blocks = std::move(blocks);
    }
    return grown > 0;
}

void Neighbours::SendOfGrown(const std::string &configPath, ChangeRun &run) {
    isAllDone_ = true;
    if (FindGrown()) {
        Send(configPath, run);
    }
}

void Neighbours::SendOf(const WorldVolume &world, const LetGo &letGo, ChangeRun &run) {
    const Volume &volume = world.volume;
    std::vector<BatchFile> neighbours;
    std::set<uint32_t> inodes; // of those: a path may be known more than once
    FileLooker looker(volume.mountPath);
    for (const KnownFile &file : world.known.files) {
        // One that is being let go by another request stays let go.
        if (file.stored == kRequestUnpinFiles ||
            (file.inode && letGo.inodes.count(*file.inode) > 0)) {
            continue;
        }
        const FileLook &look = looker.Look(file.relativePath);
        const bool isItself = look.error == 0 && IsToStay(file, look) &&
                              letGo.inodes.count(static_cast<uint32_t>(look.status.inode)) == 0;
        if ((look.error != 0 && !IsGone(look.error)) || (isItself && !look.hasExtents)) {
            LookUnknownAdd(&errors_, VolumePath(volume.mountPath, file.relativePath),
                           "whether it has lost blocks cannot be told");
        } else if (isItself && HasAny(letGo.blocks, look.blocks) &&
                   !(isAllDone_ && IsPinned(file, look, volume)) &&
                   inodes.insert(static_cast<uint32_t>(look.status.inode)).second) {
            neighbours.push_back(BatchFileOf(file.relativePath, look));
        }
    }
    for (const BatchFile &file : neighbours) {
        if (!run.Add(volume.mountPath, file)) {
            unsent_.push_back(VolumePath(volume.mountPath, file.relativePath));
        }
    }
    count_ += neighbours.size();
}
} // namespace vesk
