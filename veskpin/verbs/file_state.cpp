#include "verbs/file_state.h"

#include <sys/stat.h>

#include <cerrno>

namespace vesk {
namespace {
bool IsGone(int error) {
    return error == ENOENT || error == ENOTDIR || error == ENAMETOOLONG;
}
} // namespace

const char *FileStateText(FileState state) {
    static const char *const kTexts[kFileStates] = {
        "pinned",  "marked",     "partial", "unmarked",  "replaced", "renamed",
        "missing", "unreadable", "pinning", "unpinning", "unpinned"};
    return kTexts[static_cast<size_t>(state)];
}

FileFigures FileFiguresOf(const FileLook &look, const Volume &volume) {
    FileFigures figures;
    if (look.error != 0) {
        return figures;
    }
    figures.bytes = look.status.bytes;
    if (!look.hasExtents) {
        return figures;
    }
    figures.extents = look.table.entries.size();
    uint64_t blocks = 0;
    uint64_t marked = 0;
    uint64_t resident = 0;
    for (const BitRun &run : look.blocks) {
        blocks += run.count;
        marked += volume.marked ? BlockSetCountIn(*volume.marked, run) : 0;
        resident += volume.resident ? BlockSetCountIn(*volume.resident, run) : 0;
    }
    figures.blocks = blocks;
    figures.marked = volume.marked ? std::optional(marked) : std::nullopt;
    figures.resident = volume.resident ? std::optional(resident) : std::nullopt;
    return figures;
}

std::optional<FileState> FileStateOf(const KnownFile *known, const FileLook &look,
                                     const FileFigures &figures, const Volume &volume) {
    if (known != nullptr && known->stored != kRequestUnknown) {
        return known->stored == kRequestPinFiles ? FileState::Pinning : FileState::Unpinning;
    }
    if (known == nullptr || !known->inode) {
        return FileState::Unpinned;
    }
    if (look.error != 0) {
        return IsGone(look.error) ? FileState::Missing : FileState::Unreadable;
    }
    if (static_cast<uint32_t>(look.status.inode) != *known->inode) {
        return FileState::Replaced;
    }
    if (!figures.blocks) {
        return FileState::Unreadable;
    }
    if (*figures.blocks > 0 && !figures.marked) {
        return std::nullopt;
    }
    if (*figures.blocks > 0 && *figures.marked < *figures.blocks) {
        return *figures.marked == 0 ? FileState::Unmarked : FileState::Partial;
    }
    // A driver that cannot pin holds no bitmap.
    if (volume.supportsPin == false) {
        return FileState::Marked;
    }
    if (!volume.driverHasBitmap) {
        return std::nullopt;
    }
    return *volume.driverHasBitmap ? FileState::Pinned : FileState::Marked;
}
} // namespace vesk
