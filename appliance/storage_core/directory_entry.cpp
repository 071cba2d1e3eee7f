#include "storage_core/directory_entry.h"

#include "base/deleter.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <limits>
#include <memory>

namespace vesk {
namespace {
// Symbolic links, devices and directories have no extents to give, and opening a device can do
// things. Filesystems that do not tell the type here are checked after opening.
bool MayBeRegularFile(const dirent &entry) {
    return entry.d_type == DT_REG || entry.d_type == DT_UNKNOWN;
}
} // namespace

void InodeSearchOffer(InodeSearch &search, uint64_t inode, const char *name) {
    if (search.isExact) {
        return;
    }
    if (inode == search.wanted) {
        search.isExact = true;
    } else if (search.wanted > std::numeric_limits<uint32_t>::max() ||
               static_cast<uint32_t>(inode) != search.wanted) {
        return;
    } else if (!search.name.empty()) {
        // A second name of the same file (a hard link) leaves no doubt.
        search.isAmbiguous = search.isAmbiguous || search.candidate != inode;
        return;
    }
    search.candidate = inode;
    search.name = name;
}

bool InodeSearchFound(const InodeSearch &search) {
    return !search.name.empty() && (search.isExact || !search.isAmbiguous);
}

ScopedFd DirectoryOpenFile(const std::string &directory, uint64_t inode) {
    ScopedFd opened(open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!opened.IsOpen()) {
        return ScopedFd();
    }
    const std::unique_ptr<DIR, Deleter<closedir>> stream(fdopendir(opened.Get()));
    if (stream == nullptr) {
        return ScopedFd();
    }
    opened.Release(); // the stream closes it from here on

    InodeSearch search;
    search.wanted = inode;
    while (const dirent *entry = readdir(stream.get())) {
        if (MayBeRegularFile(*entry)) {
            InodeSearchOffer(search, entry->d_ino, entry->d_name);
        }
        if (search.isExact) {
            break;
        }
    }
    if (!InodeSearchFound(search)) {
        return ScopedFd();
    }

    // Non-blocking: the entry may have become a FIFO meanwhile. What was opened is checked for the
    // same reason.
    ScopedFd file(openat(dirfd(stream.get()), search.name.c_str(),
                         O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    struct stat status = {};
    if (!file.IsOpen() || fstat(file.Get(), &status) != 0 || !S_ISREG(status.st_mode) ||
        status.st_ino != search.candidate) {
        return ScopedFd();
    }
    return file;
}
} // namespace vesk
