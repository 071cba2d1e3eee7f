#include "storage_core/directory_entry.h"

#include "base/deleter.h"
#include "files/folder_open.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <limits>
#include <memory>
#include <mutex>
#include <vector>

namespace vesk {
namespace {
// Symbolic links, devices and directories have no extents to give, and opening a device can do
// things. Filesystems that do not tell the type here are checked after opening.
bool MayBeRegularFile(const dirent &entry) {
    return entry.d_type == DT_REG || entry.d_type == DT_UNKNOWN;
}

// The files of a folder as they were at one moment. Requests ask for one file of a folder after the
// other, and reading a large folder takes long.
class FolderScan {
public:
    bool IsOf(const FolderIdentity &folder) const {
        return isRead_ && folder.device == status_.st_dev && folder.inode == status_.st_ino;
    }
    // Whether these are the folder's files still.
    bool IsAsItWas(const struct stat &folder) const {
        return IsOf({folder.st_dev, folder.st_ino}) && IsEqual(folder.st_mtim, status_.st_mtim) &&
               IsEqual(folder.st_ctim, status_.st_ctim);
    }
    // Whether a change since the scan would show in the folder's times: one in the same tick of the
    // file system's clock does not.
    bool IsSettled() const { return readAt_ - status_.st_ctim.tv_sec > kTickSeconds; }
    // `folder` is its status from before.
    void Read(int fd, const struct stat &folder) {
        entries_.clear();
        names_.clear();
        isRead_ = false; // of no folder, until all is read
        readAt_ = time(nullptr);
        ScopedFd again(openat(fd, ".", kOpenForReading | O_DIRECTORY));
        const std::unique_ptr<DIR, Deleter<closedir>> stream(fdopendir(again.Get()));
        if (stream == nullptr) {
            return;
        }
        again.Release(); // the stream closes it from here on
        errno = 0;
        while (const dirent *entry = readdir(stream.get())) {
            if (MayBeRegularFile(*entry)) {
                entries_.push_back({entry->d_ino, names_.size()});
                names_.append(entry->d_name).push_back('\0');
            }
        }
        if (errno == 0) {
            std::stable_sort(entries_.begin(), entries_.end(), IsBefore);
            status_ = folder;
            isRead_ = true;
        }
    }
    bool Search(InodeSearch &search) const {
        const auto [first, last] =
            std::equal_range(entries_.begin(), entries_.end(), Entry{search.wanted, 0}, IsBefore);
        std::for_each(first, last, [&](const Entry &entry) {
            InodeSearchOffer(search, entry.inode, names_.c_str() + entry.name);
        });
        return InodeSearchFound(search);
    }

private:
    struct Entry {
        uint64_t inode;
        size_t name; // where it begins in `names_` (bytes)
    };
    // By the low 32 bits, which is what is known of a wanted file.
    static bool IsBefore(const Entry &a, const Entry &b) {
        return static_cast<uint32_t>(a.inode) < static_cast<uint32_t>(b.inode);
    }
    static bool IsEqual(const timespec &a, const timespec &b) {
        return a.tv_sec == b.tv_sec && a.tv_nsec == b.tv_nsec;
    }
    static constexpr time_t kTickSeconds = 2;
    bool isRead_ = false;
    time_t readAt_ = 0;
    struct stat status_ = {};
    std::vector<Entry> entries_;
    std::string names_; // each with its NUL
};

std::mutex scanLock; // guards LastScan
FolderScan &LastScan() {
    static auto *scan = new FolderScan; // never destroyed: other threads may ask at the end
    return *scan;
}

bool SearchRemembered(const FolderIdentity &folder, InodeSearch &search) {
    const std::lock_guard<std::mutex> guard(scanLock);
    return LastScan().IsOf(folder) && LastScan().Search(search);
}

struct Memory {
    bool isAsItWas = false; // the folder has the files that are remembered
    bool isCurrent = false; // reading it anew would show nothing else
};

Memory MemoryOf(int folder) {
    struct stat status = {};
    const bool isKnown = fstat(folder, &status) == 0;
    const std::lock_guard<std::mutex> guard(scanLock);
    const bool isAsItWas = isKnown && LastScan().IsAsItWas(status);
    return {isAsItWas, isAsItWas && LastScan().IsSettled()};
}

bool SearchAnew(int folder, InodeSearch &search) {
    struct stat status = {};
    if (fstat(folder, &status) != 0) {
        return false;
    }
    const std::lock_guard<std::mutex> guard(scanLock);
    LastScan().Read(folder, status);
    return LastScan().IsOf({status.st_dev, status.st_ino}) && LastScan().Search(search);
}

ScopedFd OpenFound(int folder, dev_t device, const InodeSearch &search) {
    // The entry may have become a FIFO or a terminal meanwhile: opening neither waits nor takes it
    // over, and what was opened is checked.
    ScopedFd file = FileOpenInFolder(folder, search.name);
    struct stat status = {};
    if (!file.IsOpen() || fstat(file.Get(), &status) != 0 || !S_ISREG(status.st_mode) ||
        status.st_ino != search.candidate || status.st_dev != device) {
        return ScopedFd();
    }
    return file;
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

FolderIdentity FolderIdentityOf(int folder) {
    struct stat status = {};
    return fstat(folder, &status) == 0 ? FolderIdentity{status.st_dev, status.st_ino}
                                       : FolderIdentity{};
}

ScopedFd DirectoryOpenFile(int directory, const FolderIdentity &identity, uint64_t inode) {
    // Who finds a file in what is remembered looks at it himself, so that this may be old: a folder
    // in which something changes all the time need not be read for each of its files. But that no
    // other file has the same low 32 bits is known of the folder as it was only.
    InodeSearch search;
    search.wanted = inode;
    const bool isFound = SearchRemembered(identity, search);
    if (isFound && search.isExact) {
        if (ScopedFd file = OpenFound(directory, identity.device, search); file.IsOpen()) {
            return file;
        }
    }
    const Memory memory = MemoryOf(directory);
    if (isFound && !search.isExact && memory.isAsItWas) {
        if (ScopedFd file = OpenFound(directory, identity.device, search); file.IsOpen()) {
            return file;
        }
    }
    if (memory.isCurrent) {
        return ScopedFd();
    }
    InodeSearch anew;
    anew.wanted = inode;
    return SearchAnew(directory, anew) ? OpenFound(directory, identity.device, anew) : ScopedFd();
}
} // namespace vesk
