// The state of a file: what the records say of it held against what it is now. Pure.
#pragma once

#include "model/file_look.h"
#include "model/recorded_files.h"
#include "model/volume_look.h"

#include <cstdint>
#include <optional>

namespace vesk {
enum class FileState {
    Pinned,   // recorded, same inode, all blocks marked, the driver has a bitmap
    Marked,   // the same, but the driver has none
    Partial,  // recorded, same inode, some blocks are not marked
    Unmarked, // none is
    Replaced, // recorded, but the path has another inode
    Renamed,  // the recorded inode has another path
    Missing,  // recorded, and no such path
    Unreadable,
    Pinning, // in a stored request
    Unpinning,
    Unpinned, // asked for, and none of the above
};

const char *FileStateText(FileState state);
const size_t kFileStates = 11;

struct FileFigures {
    std::optional<uint64_t> bytes;
    std::optional<uint64_t> extents;
    std::optional<uint64_t> blocks;
    std::optional<uint64_t> marked;
    std::optional<uint64_t> resident;
};

// Those of a path that was looked at.
FileFigures FileFiguresOf(const FileLook &look, const Volume &volume);

// `known` is what the configuration has of the path, or of its inode where it has nothing of the
// path; null: nothing. Absent: it depends on bitmap or driver, which cannot be read.
std::optional<FileState> FileStateOf(const KnownFile *known, const FileLook &look,
                                     const FileFigures &figures, const Volume &volume);
} // namespace vesk
