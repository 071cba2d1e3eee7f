// One file of a volume as it is now: inode, size and blocks. Folders below the mount point are
// never reached through links, which are their users', nor are other file systems.
//
// Files are best asked for folder by folder: the folder asked for last stays open.
//
// Thread rule: a FileLooker has one owner.
#pragma once

#include "base/scoped_fd.h"
#include "bitmap/bit_runs.h"

#include "vesk/storage_core.h"

#include <sys/types.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace vesk {
struct FileStat {
    uint64_t inode;
    uint64_t bytes;
    mode_t mode;
    dev_t device;
    int64_t birth; // nanoseconds since 1970; 0: the file system does not know
};

// Of an entry of an open folder, not of a link's target; asks no file system that answers when it
// likes. 0 or an errno; EXDEV for the mount point of a file system that refuses to be asked.
int FileStatAt(int folder, const char *name, FileStat *status);

struct FileLook {
    int error =
        0; // an errno, ENOENT for a path that leads nowhere: the path could not be looked at
    FileStat status{};
    bool hasExtents = false; // they could be read; of a regular file only
    FileMappingTable table;
    std::vector<BitRun> blocks; // FileBlocksOf the table
};

// Whether a look ended so since no file of the volume is at the path: nothing, or a link or another
// file system on the way.
bool FileIsNowhere(int error);

class FileLooker {
public:
    explicit FileLooker(const std::string &mountPath);

    // 0, or the errno with which the mount point cannot be opened.
    int Error() const { return error_; }
    int Root() const { return root_.Get(); }
    dev_t Device() const { return device_; }

    // Of the file at this path below the mount point. 0 or an errno, ENOENT where nothing is, EXDEV
    // where another file system is.
    int Stat(const std::string &relativePath, FileStat *status);

    // Looks at the file at this path below the mount point, or at one whose status is known. The
    // result is the looker's, until the next call.
    const FileLook &Look(const std::string &relativePath, const FileStat *status = nullptr);

private:
    int OpenFolder(const std::string &folder);
    void AskExtents(const std::string &relativePath);

    std::string mountPath_;
    ScopedFd root_;
    int error_ = 0;
    dev_t device_ = 0;
    std::unique_ptr<FileSystemDevice> extents_; // null: the platform has none for this volume
    std::string folderName_;
    ScopedFd folder_;
    FileLook look_;
};
} // namespace vesk
