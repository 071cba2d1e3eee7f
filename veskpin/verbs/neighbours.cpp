#include "verbs/neighbours.h"

#include "act/interrupt.h"
#include "bitmap/pin_bitmap.h"

#include <algorithm>
#include <optional>

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

void Add(BlockSet *set, const std::vector<BitRun> &runs) {
    for (const BitRun &run : runs) {
        BlockSetAdd(set, run);
    }
}

void Add(BlockSet *set, const std::optional<BlockSet> &more) {
    for (size_t i = 0; more && i < std::min(set->size(), more->size()); ++i) {
        (*set)[i] = static_cast<unsigned char>((*set)[i] | (*more)[i]);
    }
}
} // namespace

void Neighbours::Note(const RequestBatch &batch, const World &world) {
    const WorldVolume *volume = WorldVolumeFind(world, batch.mountPath);
    LetGo &letGo = volumes_[batch.mountPath];
    if (letGo.blocks.empty()) {
        letGo.blocks = BlockSetOf((volume->volume.deviceBytes.value_or(0) >> kBitmapByteShift) + 1);
        letGo.owed = BlockSet(letGo.blocks.size());
        Add(&letGo.owed, volume->volume.marked);
    }
    FileLooker looker(batch.mountPath);
    for (const BatchFile &file : batch.files) {
        letGo.inodes.insert(file.inode);
        const FileLook &look = looker.Look(file.relativePath);
        if (!look.hasExtents || !volume->volume.deviceBytes) {
            LookUnknownAdd(&errors_, VolumePath(batch.mountPath, file.relativePath),
                           "which files share its blocks cannot be told");
        }
        Add(&letGo.blocks, look.blocks);
    }
}

void Neighbours::NoteAgain(const RequestBatch &batch) {
    for (const BatchFile &file : batch.files) {
        volumes_[batch.mountPath].again.insert(file.inode);
    }
}

void Neighbours::Send(const std::string &configPath, ChangeRun &run) {
    if (volumes_.empty()) {
        return;
    }
    World world = WorldLook(configPath);
    for (auto &[mountPath, letGo] : volumes_) {
        if (const WorldVolume *volume = WorldVolumeFind(world, mountPath)) {
            WorldVolumeUse(world, *volume);
            if (isAllDone_) {
                FindLost(volume->volume, &letGo);
            } else {
                Add(&letGo.owed, volume->volume.marked); // by pins that were stored before
            }
            SendOf(*volume, &letGo, run);
        }
    }
    LookErrorsAdd(&errors_, world.errors);
}

// Leaves only blocks that should be marked and are not.
void Neighbours::FindLost(const Volume &volume, LetGo *letGo) {
    letGo->blocks = letGo->owed;
    for (size_t i = 0; i < letGo->blocks.size(); ++i) {
        const bool isKnown = volume.marked && i < volume.marked->size();
        const unsigned marked = isKnown ? (*volume.marked)[i] : 0xFF;
        letGo->blocks[i] = static_cast<unsigned char>(letGo->blocks[i] & ~marked);
    }
}

void Neighbours::SendOfLost(const std::string &configPath, ChangeRun &run) {
    isAllDone_ = true;
    Send(configPath, run);
}

void Neighbours::SendOf(const WorldVolume &world, LetGo *letGo, ChangeRun &run) {
    const Volume &volume = world.volume;
    std::vector<BatchFile> neighbours;
    std::unordered_set<uint32_t> inodes = letGo->again; // a path may be known more than once
    FileLooker looker(volume.mountPath);
    for (const KnownFile &file : world.known.files) {
        if (!InterruptPause(0)) {
            LookUnknownAdd(&errors_, volume.mountPath,
                           "not every file that may have lost a block was looked at");
            break;
        }
        // One that is being let go by another request stays let go.
        if (file.stored == kRequestUnpinFiles ||
            (file.inode && letGo->inodes.count(*file.inode) > 0)) {
            continue;
        }
        const FileLook &look = looker.Look(file.relativePath);
        if (file.stored == kRequestPinFiles) {
            Add(&letGo->owed, look.blocks);
        }
        const bool isItself = look.error == 0 && IsToStay(file, look) &&
                              letGo->inodes.count(static_cast<uint32_t>(look.status.inode)) == 0;
        if ((look.error != 0 && !FileIsNowhere(look.error)) || (isItself && !look.hasExtents)) {
            LookUnknownAdd(&errors_, VolumePath(volume.mountPath, file.relativePath),
                           "whether it has lost blocks cannot be told");
        } else if (isItself && HasAny(letGo->blocks, look.blocks) &&
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
