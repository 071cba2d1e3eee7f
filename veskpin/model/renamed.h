// Where renamed files are now: recorded files that have left their path, looked for by inode and
// birth time in one walk of the volume.
//
// The records alone cannot tell a renamed file from one that got a deleted one's inode number. The
// last copy of the records, kept in /var/lib/veskpin/last/UUID.json when they were known to be
// good, has the birth times: {"files": [{"path", "inode", "birth" (nanoseconds since 1970)}]}.
//
// Thread rule: no state.
#pragma once

#include "model/file_look.h"
#include "model/world.h"
#include "text/progress.h"

#include <cstdint>
#include <map>
#include <string>

namespace vesk {
using RenamedFiles = std::map<uint32_t, std::string>; // recorded inode, path on the volume now

// A file without birth time in the copy, or of another one, is not found. The walk, which may be
// long, shows how far it has come.
RenamedFiles RenamedFind(const WorldVolume &world, ProgressForm progress, LookErrors *errors);
} // namespace vesk
