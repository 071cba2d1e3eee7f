#include "verbs/neighbours.h"

#include "bitmap/pin_bitmap.h"

#include <algorithm>

namespace vesk {
namespace {
bool HasAny(const BlockSet &set, const std::vector<BitRun> &runs) {
    return std::any_of(runs.begin(), runs.end(),
                       [&](const BitRun &run) { return BlockSetCountIn(set, run) > 0; });
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
        for (const BitRun &run : looker.Look(file.relativePath).blocks) {
            BlockSetAdd(&letGo.blocks, run);
        }
    }
}

void Neighbours::Send(const std::string &configPath, ChangeRun &run) const {
    if (volumes_.empty()) {
        return;
    }
    const World world = WorldLook(configPath);
    for (const auto &[mountPath, letGo] : volumes_) {
        const WorldVolume *volume = WorldVolumeFind(world, mountPath);
        if (volume == nullptr) {
            continue; // its records are gone
        }
        FileLooker looker(mountPath);
        for (const KnownFile &file : volume->known.files) {
            // One that is being let go by another request stays let go.
            if (!file.inode || file.stored == kRequestUnpinFiles ||
                letGo.inodes.count(*file.inode) > 0) {
                continue;
            }
            const FileLook &look = looker.Look(file.relativePath);
            if (look.error == 0 && static_cast<uint32_t>(look.status.inode) == *file.inode &&
                HasAny(letGo.blocks, look.blocks)) {
                const auto figures = FileFiguresOf(look, volume->volume);
                run.Add(mountPath, file.relativePath, look,
                        FileStateOf(&file, look, figures, volume->volume));
            }
        }
    }
}
} // namespace vesk
