// Everything below a folder of a volume, in order of the names, folder by folder. Links are not
// followed and other file systems not entered.
//
// Thread rule: no state.
#pragma once

#include "model/file_look.h"

#include <functional>
#include <string>

namespace vesk {
enum class WalkKind {
    File,
    Other, // a link, FIFO, socket or device
    OtherFileSystem,
    Unreadable, // a folder or an entry, with its errno
};

struct WalkEntry {
    const std::string &relativePath;
    WalkKind kind;
    FileStat status; // of a file
    int error;       // of what is unreadable
};

// `folder` is relative to the looker's volume, empty for all of it. Memory: the names of one folder
// and of the folders that wait. It ends early when `visit` says false, or `goesOn`, which may be
// empty and is asked for folders, too.
void PathWalk(const FileLooker &looker, const std::string &folder,
              const std::function<bool(const WalkEntry &)> &visit,
              const std::function<bool()> &goesOn = {});
} // namespace vesk
