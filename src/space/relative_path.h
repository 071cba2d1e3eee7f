// A file's path relative to its volume (the form in which pinned files are recorded) and a file's
// top directory (the volume it lies on).
//
// User text is compared and copied here, never handed to a scan or print format.
//
// Thread rule: no state; callable from any thread.
#pragma once

#include <cstddef>

namespace vesk {
// What stands in `filePath` behind `mountPath` and "/": leading white space is skipped, then the
// text up to the next white space is taken; so "/volume1/dir a/f" gives "dir". A mount path that
// ends in
// "/" never matches an ordinary path. The result (malloc'd for the caller) has 1 to 511 characters;
// null after an error message when the file lies elsewhere, nothing is left or it is longer.
char *FileGetRelativePathByMountPath(const char *mountPath, const char *filePath);

// The same for the space with this UUID. Null after an error message.
char *FileGetRelativePath(const char *uuid, const char *filePath);

// Writes "/" and the first component of `path` into `out`, cut to `outSize` bytes with the NUL.
// 0, or -1 after an error message when `path` does not begin with "/" and a component of at most
// 1023 characters, or an argument is null or 0.
int FileGetTopDir(const char *path, char *out, size_t outSize);
} // namespace vesk
