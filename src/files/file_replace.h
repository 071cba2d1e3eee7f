// Replaces a file's content so that a crash at any moment leaves the old or the new content whole:
// a temporary file in the same folder is written, synced and renamed over the target. The target's
// owner and mode are kept, and a symbolic link is followed to its target and stays a link.
//
// Where there can be no other file (the folder does not allow it, or has no room for one more), or
// the path is not a regular file, the file itself is written, a regular one only after its room is
// known to be there: it is grown with blanks first, which change no document. A crash, or storage
// that fails or writes each change to a new place and has none, can then leave old and new content
// mixed.
//
// Thread rule: no state but a counter of names; two callers that replace the same file at once each
// leave a whole file, the later rename wins.
#pragma once

#include <string>

namespace vesk {
enum class FileReplaceResult {
    Done,
    CannotOpen, // the file cannot be opened for writing, created or made durable; nothing changed,
                // but where it was written in place and the storage failed
    NotWritten, // no room for the content, and nothing changed; or no regular file, and not all of
                // it was taken
};

// Never blocks on a FIFO: a path that cannot be opened for writing at once is CannotOpen.
FileReplaceResult FileReplaceContent(const char *path, const std::string &content);
} // namespace vesk
