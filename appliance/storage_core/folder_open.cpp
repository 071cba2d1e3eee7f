#include "storage_core/folder_open.h"

#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <utility>
#include <vector>

namespace vesk {
namespace {
constexpr int kOpenAsPlace = O_PATH | O_DIRECTORY | O_CLOEXEC;

bool IsOnDevice(int folder, dev_t device) {
    struct stat status = {};
    return fstat(folder, &status) == 0 && status.st_dev == device;
}

// Above a mount point is another filesystem, above the root itself. A link from elsewhere into the
// middle of the volume leads to neither.
bool IsMountPoint(int folder) {
    struct stat here = {};
    struct stat above = {};
    return fstat(folder, &here) == 0 && fstatat(folder, "..", &above, 0) == 0 &&
           (here.st_dev != above.st_dev || here.st_ino == above.st_ino);
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
        if (IsOnDevice(folder.Get(), device)) {
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
    how.resolve = RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS;
    const long fd =
        syscall(SYS_openat2, folder, path.empty() ? "." : path.c_str(), &how, sizeof(how));
    // An old kernel does not know the call, a filter from before it may forbid it, and a ".." that
    // something was renamed beside is not judged.
    if (fd < 0 && (errno == ENOSYS || errno == EPERM || errno == EAGAIN)) {
        return FolderOpenStepwise(folder, path);
    }
    return ScopedFd(static_cast<int>(fd));
}

ScopedFd FolderOpenStepwise(int folder, const std::string &path) {
    std::vector<ScopedFd> steps; // from the top down; ".." goes back the way that was come
    size_t start = path.find_first_not_of('/');
    while (start != std::string::npos) {
        const size_t end = path.find('/', start);
        const std::string name = path.substr(start, end == std::string::npos ? end : end - start);
        start = end == std::string::npos ? end : path.find_first_not_of('/', end);
        if (name == "..") {
            if (steps.empty()) {
                return ScopedFd();
            }
            steps.pop_back();
        } else if (name != ".") {
            const int here = steps.empty() ? folder : steps.back().Get();
            steps.emplace_back(openat(here, name.c_str(), kOpenAsPlace | O_NOFOLLOW));
            if (!steps.back().IsOpen()) {
                return ScopedFd();
            }
        }
    }
    const int last = steps.empty() ? folder : steps.back().Get();
    return ScopedFd(openat(last, ".", kOpenForReading | O_DIRECTORY));
}
} // namespace vesk
