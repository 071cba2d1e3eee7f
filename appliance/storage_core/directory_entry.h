// Finding a directory's file by its inode number.
//
// Thread rule: callable from any thread. The files of the folder that was asked for last are
// remembered, under a lock, so that asking for all files of a folder reads it once.
#pragma once

#include "base/scoped_fd.h"

#include <sys/types.h>

#include <cstdint>
#include <string>

namespace vesk {
// A search through the entries of one directory. The number looked for may be only the low 32 bits
// of the file's: the entry with exactly this number is the result, else the one file whose low 32
// bits equal it. Two files that share these bits are no result, either could be meant.
struct InodeSearch {
    uint64_t wanted = 0;      // number looked for, in full or its low 32 bits
    bool isExact = false;     // the candidate has just the wanted number: the search may end
    bool isAmbiguous = false; // further files have the candidate's low 32 bits
    uint64_t candidate = 0;   // number of the file found so far
    std::string name;         // entry of that file; empty: none found yet
};

// Takes one entry into account.
void InodeSearchOffer(InodeSearch &search, uint64_t inode, const char *name);

// Whether the search found one file; `candidate` and `name` are then its number and its entry.
bool InodeSearchFound(const InodeSearch &search);

// Which folder an open one is. It stays that as long as it is open.
struct FolderIdentity {
    dev_t device = 0;
    ino_t inode = 0; // 0: cannot be told
};
FolderIdentity FolderIdentityOf(int folder);

// Opens the regular file with this inode number (or these low 32 bits of it) in an open directory,
// for reading, without following a symbolic link; it is on the directory's filesystem. Not open: no
// such file, or a failure.
ScopedFd DirectoryOpenFile(int directory, const FolderIdentity &identity, uint64_t inode);
} // namespace vesk
