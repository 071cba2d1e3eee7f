#include "verbs/volume_lister.h"

#include "bitmap/pin_bitmap.h"
#include "model/path_walk.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace vesk {
VolumeLister::VolumeLister(const WorldVolume &volume, std::optional<ProgressForm> search,
                           World &world, const Visit &visit)
    : world_(volume), errors_(world.errors), visit_(visit),
      isConfigKnown_(world.isConfigKnown && world.areSentKnown), looker_(volume.volume.mountPath) {
    if (search) {
        renamed_ = RenamedFind(volume, *search, &errors_);
    }
    absent_.error = ENODEV;
    WorldVolumeUse(world, volume);
    if (!volume.volume.isMounted) {
        LookUnknownAdd(&errors_, volume.volume.mountPath, "is not mounted");
    } else if (!volume.volume.hasCache) {
        LookUnknownAdd(&errors_, volume.volume.mountPath, "has no cache");
    } else if (looker_.Error() != 0) {
        LookUnknownAdd(&errors_, volume.volume.mountPath, strerror(looker_.Error()));
    }
}

void VolumeLister::ListKnown(std::pair<size_t, size_t> range, ListSum *sum) {
    for (size_t i = range.first; i < range.second;) {
        size_t end = i + 1;
        const auto &files = world_.known.files;
        while (end < range.second && files[end].relativePath == files[i].relativePath) {
            ++end;
        }
        ListPath(files[i].relativePath, nullptr, {i, end}, sum);
        i = end;
    }
}

void VolumeLister::ListAsked(const std::string &relativePath) {
    ListPath(relativePath, nullptr, KnownFilesAt(world_.known, relativePath), nullptr);
}

void VolumeLister::ListUnknown(const std::string &folder, ListSum *sum) {
    PathWalk(looker_, folder, [&](const WalkEntry &entry) {
        const std::string &path = entry.relativePath;
        if (entry.kind == WalkKind::Unreadable && entry.error == ENAMETOOLONG) {
            // No file that deep can be pinned.
            LookErrorAdd(&errors_, PathOf(path), strerror(entry.error));
        } else if (entry.kind == WalkKind::Unreadable) {
            LookUnknownAdd(&errors_, PathOf(path), strerror(entry.error));
        } else if (entry.kind == WalkKind::File) {
            const auto range = KnownFilesAt(world_.known, path);
            if (range.first == range.second) {
                ListPath(path, &entry.status, range, sum);
            }
        }
        return true;
    });
}

ListSum VolumeLister::SumOf(const std::string &path) const {
    ListSum sum;
    sum.folder.path = path;
    sum.blocks = BlockSetOf((world_.volume.deviceBytes.value_or(0) >> kBitmapByteShift) + 1);
    return sum;
}

ListedFolder VolumeLister::Total(ListSum sum) const {
    const Volume &volume = world_.volume;
    if (volume.deviceBytes) {
        sum.folder.blocks = BlockSetCount(sum.blocks);
    }
    if (volume.deviceBytes && volume.marked) {
        sum.folder.marked = BlockSetCountBoth(sum.blocks, *volume.marked);
    }
    if (volume.deviceBytes && volume.resident) {
        sum.folder.resident = BlockSetCountBoth(sum.blocks, *volume.resident);
    }
    return sum.folder;
}

std::string VolumeLister::PathOf(const std::string &relativePath) const {
    return VolumePath(world_.volume.mountPath, relativePath);
}

// What the configuration has of the file: the entry of this path with the inode that is there,
// else any of this path, else, for a path that it does not have, the entry of this inode: a
// hard link is judged by its own.
const KnownFile *VolumeLister::KnownOf(std::pair<size_t, size_t> range, const FileLook &look) {
    for (size_t i = range.first; i < range.second; ++i) {
        const KnownFile &known = world_.known.files[i];
        if (known.inode && look.error == 0 &&
            *known.inode == static_cast<uint32_t>(look.status.inode)) {
            return &known;
        }
    }
    if (range.first < range.second) {
        return &world_.known.files[range.first];
    }
    ofInode_ = look.error == 0 ? KnownFileByInode(world_.known, look.status.inode) : std::nullopt;
    return ofInode_ ? &*ofInode_ : nullptr;
}

void VolumeLister::ListPath(const std::string &relativePath, const FileStat *status,
                            std::pair<size_t, size_t> range, ListSum *sum) {
    const Volume &volume = world_.volume;
    const FileLook &look = volume.isMounted ? looker_.Look(relativePath, status) : absent_;
    const KnownFile *known = KnownOf(range, look);
    const FileFigures figures = FileFiguresOf(look, volume);
    const auto state = StateOf(known, look, figures);
    const std::string path = PathOf(relativePath);
    if (state == FileState::Missing || state == FileState::Replaced) {
        const auto now = renamed_.find(*known->inode);
        if (now != renamed_.end()) {
            ListRenamed(path, *known->inode, now->second);
            return;
        }
    }
    std::optional<uint64_t> inode;
    if (known != nullptr && known->inode) {
        inode = *known->inode;
    } else if (look.error == 0) {
        inode = look.status.inode;
    }
    NoteWhatIsHidden(path, look);
    visit_({volume.mountPath, path, inode, state, nullptr, figures});
    if (sum != nullptr && look.error == 0 && S_ISREG(look.status.mode)) {
        ++sum->folder.files;
        sum->folder.filesPinned += state == FileState::Pinned ? 1U : 0U;
        for (const BitRun &run : look.blocks) {
            BlockSetAdd(&sum->blocks, run);
        }
    }
}

// A file that the records do not have is unpinned only where they are whole.
std::optional<FileState> VolumeLister::StateOf(const KnownFile *known, const FileLook &look,
                                               const FileFigures &figures) {
    const bool isSure = known != nullptr || (world_.known.isWhole && world_.volume.isMounted);
    if (isConfigKnown_ && isSure) {
        return FileStateOf(known, look, figures, world_.volume);
    }
    errors_.isUnknown = true;
    return std::nullopt;
}

// With the figures of the file where it is now.
void VolumeLister::ListRenamed(const std::string &path, uint32_t inode,
                               const std::string &relativePath) {
    const std::string pathNow = PathOf(relativePath);
    const FileFigures figures = FileFiguresOf(looker_.Look(relativePath), world_.volume);
    visit_({world_.volume.mountPath, path, inode, FileState::Renamed, &pathNow, figures});
}

// Root may look at everything; for others a "cannot be read" may be a lack of rights.
void VolumeLister::NoteWhatIsHidden(const std::string &path, const FileLook &look) {
    const bool isHidden = look.error == EACCES || look.error == EPERM;
    const bool isMapped = look.error != 0 || look.hasExtents || !S_ISREG(look.status.mode);
    if (isHidden || (!isMapped && geteuid() != 0)) {
        LookUnknownAdd(&errors_, path, strerror(isHidden ? look.error : EACCES));
    } else if (!isMapped) {
        LookErrorAdd(&errors_, path, "its blocks cannot be looked at");
    } else if (look.error != 0 && look.error != ENOENT && look.error != ENOTDIR &&
               look.error != ENODEV) {
        LookErrorAdd(&errors_, path, strerror(look.error));
    }
}
} // namespace vesk
