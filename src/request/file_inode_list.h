// The file-inode list: how a queued request names its files.
//
// One entry a file, joined by ";": the path relative to the volume (no leading "/"), "#", the inode
// number in decimal; for instance share/a.txt#1234;share/b.bin#5678. At most 1023 characters.
// Relative paths therefore cannot hold ";", white space or "#". A path with "#" is stored, but an
// entry with a second "#" is none when it is read back, so that the number behind the first,
// another file's perhaps, is never taken for the inode: the request fails when it is carried out.
//
// Thread rule: no state.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace vesk {
struct FileInfo {
    char szRelativePath[512]; // NUL-terminated, relative to the volume's mount path
    unsigned long inodeNum;   // 32 bits of it are used
};

// Builds the list from absolute paths joined by ";" into `out` (`outSize` bytes with the NUL, at
// least 1). Empty pieces are skipped. 0, or -1 after an error message at the first path that does
// not lie below `mountPath` or cannot be asked for its inode, or when the list does not fit.
int AbsolutePathsToFileInodeList(const char *mountPath, const char *absolutePaths, char *out,
                                 size_t outSize);

// Replaces `pieces` by the non-empty pieces of the first 1024 bytes of `text`, split at any of the
// delimiter characters.
void SplitString(const char *text, const char *delimiters, std::vector<std::string> *pieces);

// Appends one record for each entry of the list. An entry is 1 to 511 characters of path, "#" and a
// decimal number that fits in 32 bits; what follows the number is ignored, unless it holds another
// "#". 0, or -1 after an error message at the first entry that is none; those before it stay
// appended.
int RequestDataGetFileInfos(const char *data, std::vector<FileInfo> *infos);
} // namespace vesk
