// Questions about paths, answered by a stat that follows symbolic links. Thread rule: no state;
// callable from any thread.
#pragma once

#include <cstdint>

namespace vesk {
// The file's size in `*sizeBytes` (bytes). 0, or -1 after an error message.
int FileGetSizeByte(const char *path, uint64_t *sizeBytes);

// The low 32 bits of the file's inode number, by which pinned files are known. 0, or -1 after an
// error message.
int FileGetInodeNumber(const char *path, uint32_t *inode);

// 1 when the path names something, else 0. Never logs.
int PathExists(const char *path);

// 1 when nothing is there, which is less than PathExists's 0: a look-up that fails for another
// reason (an I/O error, a lack of memory) is no answer. Never logs.
int PathIsMissing(const char *path);

// 1 or 0; a path that does not exist is an error message and 0. These test one mode bit each and
// not the whole file type: a socket counts as a file, a block device as a directory.
int PathIsFile(const char *path);
int PathIsDir(const char *path);
} // namespace vesk
