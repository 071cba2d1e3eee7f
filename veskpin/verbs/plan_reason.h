// Why a file is left out of a request. Thread rule: no state.
#pragma once

#include "model/file_look.h"

#include <optional>
#include <string>

namespace vesk {
enum class SkipReason {
    NotFound,
    Name, // holds ";", "#" or white space, which separate and end paths in a request
    TooLong,
    NotUtf8,
    NotRegular,
    BitmapFile, // the volume's own
    OtherFileSystem,
    NoVolume, // lies on no volume with a cache
    NoBlocks, // nothing of it has a place on the device
    NoPermission,
    Unreadable,
    SameInode, // another path of the same file is there already
    NoRoom,
};

const char *SkipReasonText(SkipReason reason); // as in the answers: "not-found"

// What stands in the way of a path that was looked at; nothing: it can be pinned. `relativePath`
// is below the volume.
std::optional<SkipReason> SkipReasonOf(const std::string &mountPath,
                                       const std::string &relativePath, const FileLook &look);

// Of a path that could not be looked at, with this errno.
SkipReason SkipReasonOfError(int error);
} // namespace vesk
