#include "files/folder_open.h"

#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <cerrno>
#include <utility>
#include <vector>

namespace vesk {
namespace {
constexpr int kOpenAsPlace = O_PATH | O_DIRECTORY | O_CLOEXEC;

// Its device number, 0 on failure. Asks no file system that answers when it likes.
dev_t DeviceOf(int folder) {
    struct statx status = {};
    const bool isKnown = statx(folder, "", AT_EMPTY_PATH | AT_STATX_DONT_SYNC, 0, &status) == 0;
    return isKnown ? makedev(status.stx_dev_major, status.stx_dev_minor) : 0;
}

// Above a mount point is another filesystem, above the root itself. A link from elsewhere into the
// middle of the volume leads to neither.
bool IsMountPoint(int folder) {
    struct stat here = {};
    struct stat above = {};
    return fstat(folder, &here) == 0 && fstatat(folder, "..", &above, 0) == 0 &&
           (here.st_dev != above.st_dev || here.st_ino == above.st_ino);
}

// Leaves errno alone.
bool IsLink(int folder, const std::string &name) {
    const int error = errno;
    struct stat status = {};
    const bool isLink =
        fstatat(folder, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0 && S_ISLNK(status.st_mode);
    errno = error;
    return isLink;
}

// The mount point of the filesystem on the way to `path`; `rest` becomes what follows it.
ScopedFd OpenMountPoint(const std::string &path, dev_t device, std::string &rest) {
    if (path.empty() || path.front() != '/') {
        return ScopedFd();
    }
    for (size_t end = 1; end != std::string::npos;) {
        ScopedFd folder(open(path.substr(0, end).c_str(), kOpenAsPlace));
        if (!folder.IsOpen()) {
            return ScopedFd();
        }
        if (DeviceOf(folder.Get()) == device) {
            const size_t next = path.find_first_not_of('/', end);
            rest = next == std::string::npos ? std::string() : path.substr(next);
            return IsMountPoint(folder.Get()) ? std::move(folder) : ScopedFd();
        }
        const size_t next = path.find_first_not_of('/', end);
        if (next == std::string::npos) {
            break;
        }
        end = path.find('/', next);
        end = end == std::string::npos ? path.size() : end;
    }
    return ScopedFd();
}
} // namespace

ScopedFd FolderOpenOnDevice(const std::string &path, dev_t device) {
    std::string rest;
    const ScopedFd mountPoint = OpenMountPoint(path, device, rest);
    return mountPoint.IsOpen() ? FolderOpenBeneath(mountPoint.Get(), rest) : ScopedFd();
}

ScopedFd FolderOpenBeneath(int folder, const std::string &path) {
    open_how how = {};
    how.flags = static_cast<uint64_t>(kOpenForReading | O_DIRECTORY);
    how.resolve = RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS | RESOLVE_NO_XDEV;
    const long fd =
        syscall(SYS_openat2, folder, path.empty() ? "." : path.c_str(), &how, sizeof(how));
    // An old kernel does not know the call, a filter from before it may forbid it, a ".." that
    // something was renamed beside is not judged, and a mount on the way may be one of the volume.
    if (fd < 0 && (errno == ENOSYS || errno == EPERM || errno == EAGAIN || errno == EXDEV)) {
        return FolderOpenStepwise(folder, path);
    }
    return ScopedFd(static_cast<int>(fd));
}

ScopedFd FolderOpenStepwise(int folder, const std::string &path) {
    const dev_t device = DeviceOf(folder);
    std::vector<ScopedFd> steps; // from the top down; ".." goes back the way that was come
    size_t start = path.find_first_not_of('/');
    while (start != std::string::npos) {
        const size_t end = path.find('/', start);
        const std::string name = path.substr(start, end == std::string::npos ? end : end - start);
        start = end == std::string::npos ? end : path.find_first_not_of('/', end);
        if (name == "..") {
            if (steps.empty()) {
                errno = EXDEV;
                return ScopedFd();
            }
            steps.pop_back();
        } else if (name != ".") {
            const int here = steps.empty() ? folder : steps.back().Get();
            steps.emplace_back(openat(here, name.c_str(), kOpenAsPlace | O_NOFOLLOW));
            if (!steps.back().IsOpen()) {
                errno = errno == ENOTDIR && IsLink(here, name) ? ELOOP : errno;
                return ScopedFd();
            }
            // A user's FUSE mount is left before it is asked for anything.
            if (DeviceOf(steps.back().Get()) != device) {
                errno = EXDEV;
                return ScopedFd();
            }
        }
    }
    const int last = steps.empty() ? folder : steps.back().Get();
    return ScopedFd(openat(last, ".", kOpenForReading | O_DIRECTORY));
}

ScopedFd FileOpenInFolder(int folder, const std::string &name) {
    open_how how = {};
    // Unlike the C library's calls this one must be asked for files above 2 GiB on 32 bits.
    how.flags = static_cast<uint64_t>(kOpenForReading | O_NOFOLLOW | O_LARGEFILE);
    how.resolve = RESOLVE_NO_XDEV;
    const long fd = syscall(SYS_openat2, folder, name.c_str(), &how, sizeof(how));
    if (fd < 0 && (errno == ENOSYS || errno == EPERM)) {
        return ScopedFd(openat(folder, name.c_str(), kOpenForReading | O_NOFOLLOW));
    }
    return ScopedFd(static_cast<int>(fd));
}
} // namespace vesk
