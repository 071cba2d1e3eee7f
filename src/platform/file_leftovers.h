// Removes what processes that died while they replaced a file (platform/file_replace.h) left in its
// folder, so that years of crashes do not fill it.
//
// Thread rule: no state.
#ifndef PLATFORM_FILE_LEFTOVERS_H
#define PLATFORM_FILE_LEFTOVERS_H

// Removes the temporary files beside `path` whose process is gone and that nobody has written to
// for a minute; what cannot be removed stays. Never logs.
void FileRemoveLeftovers(const char *path);

#endif
