// Questions about paths, answered by a stat. Thread rule: no state; callable from any thread.
#pragma once

#include <cstdint>

namespace vesk {
// What a path that ends in a symbolic link is about: the link's target or the link itself.
enum class LastLink { Followed, Itself };

// The file's size in `*sizeBytes` (bytes). 0, or -1 after an error message.
int FileGetSizeByte(const char *path, uint64_t *sizeBytes, LastLink link = LastLink::Followed);

// The low 32 bits of the file's inode number, by which pinned files are known. 0, or -1 after an
// error message.
int FileGetInodeNumber(const char *path, uint32_t *inode);

// 1 when the path names something, else 0. Never logs.
int PathExists(const char *path, LastLink link = LastLink::Followed);

// 1 when nothing is there, which is less than PathExists's 0: a look-up that fails for another
// reason (an I/O error, a lack of memory) is no answer. Never logs.
int PathIsMissing(const char *path, LastLink link = LastLink::Followed);

// 1 or 0; a path that does not exist is an error message and 0. These test one mode bit each and
// not the whole file type: a socket counts as a file, a block device as a directory. A link itself
// is neither.
int PathIsFile(const char *path, LastLink link = LastLink::Followed);
int PathIsDir(const char *path);
} // namespace vesk
