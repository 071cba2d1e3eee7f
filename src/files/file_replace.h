// Replaces a file's content so that a crash at any moment leaves the old or the new content whole:
// a temporary file in the same folder is written, synced and renamed over the target. The target's
// owner and mode are kept, and a symbolic link is followed to its target and stays a link.
//
// Where the folder does not allow that, or the path is not a regular file, the file is written in
// place (opened with truncation), and a crash or a full disk can leave it cut.
//
// Thread rule: no state but a counter of names; two callers that replace the same file at once each
// leave a whole file, the later rename wins.
#pragma once

#include <string>

namespace vesk {
enum class FileReplaceResult {
    Done,
    CannotOpen, // the file cannot be opened for writing or created; nothing changed
    NotWritten, // it can be opened, but not all bytes were written
};

// Never blocks on a FIFO: a path that cannot be opened for writing at once is CannotOpen.
FileReplaceResult FileReplaceContent(const char *path, const std::string &content);
} // namespace vesk
