#include "model/file_look.h"

#include "bitmap/file_blocks.h"
#include "files/folder_open.h"
#include "model/look_errors.h"
#include "space/file_extents.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>

#include <cerrno>

namespace vesk {
namespace {
const unsigned kWanted = STATX_TYPE | STATX_INO | STATX_SIZE | STATX_BTIME;
const int64_t kNanoseconds = 1000000000; // in a second
} // namespace

int FileStatAt(int folder, const char *name, FileStat *status) {
    struct statx answer {};
    const int flags = AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT | AT_STATX_DONT_SYNC |
                      (*name == '\0' ? AT_EMPTY_PATH : 0);
    if (statx(folder, name, flags, kWanted, &answer) != 0) {
        const int error = errno;
        // A user's own mount refuses even root. Whether it is one needs no question to it.
        const bool isMount = error == EACCES && statx(folder, name, flags, 0, &answer) == 0 &&
                             (answer.stx_attributes & STATX_ATTR_MOUNT_ROOT) != 0;
        return isMount ? EXDEV : error;
    }
    const bool hasBirth = (answer.stx_mask & STATX_BTIME) != 0;
    *status = {answer.stx_ino, answer.stx_size, answer.stx_mode,
               makedev(answer.stx_dev_major, answer.stx_dev_minor),
               hasBirth ? answer.stx_btime.tv_sec * kNanoseconds + answer.stx_btime.tv_nsec : 0};
    return 0;
}

bool FileIsNowhere(int error) {
    return error == ENOENT || error == ENOTDIR || error == ENAMETOOLONG || error == ELOOP ||
           error == EXDEV;
}

FileLooker::FileLooker(const std::string &mountPath)
    : mountPath_(mountPath), root_(open(mountPath.c_str(), kOpenForReading | O_DIRECTORY)) {
    FileStat status{};
    error_ = root_.IsOpen() ? FileStatAt(root_.Get(), "", &status) : errno;
    if (error_ == 0) {
        device_ = status.device;
        extents_.reset(CreateFileSystemDeviceByFilePath(mountPath));
        LookLogTake("");
    }
}

int FileLooker::OpenFolder(const std::string &folder) {
    if (!folder_.IsOpen() || folder != folderName_) {
        errno = 0;
        folder_ = FolderOpenBeneath(root_.Get(), folder);
        folderName_ = folder;
    }
    if (folder_.IsOpen()) {
        return 0;
    }
    return errno != 0 ? errno : ENOENT;
}

void FileLooker::AskExtents(const std::string &relativePath) {
    look_.hasExtents = extents_ != nullptr && S_ISREG(look_.status.mode) &&
                       FileExtentsAsk(*extents_, mountPath_ + "/" + relativePath,
                                      look_.status.inode, &look_.table) == 0;
    if (look_.hasExtents) {
        look_.blocks = FileBlocksOf(look_.table);
    }
}

int FileLooker::Stat(const std::string &relativePath, FileStat *status) {
    if (error_ != 0) {
        return error_;
    }
    const size_t slash = relativePath.rfind('/');
    const std::string folder = slash == std::string::npos ? "" : relativePath.substr(0, slash);
    int error = OpenFolder(folder);
    if (error == 0) {
        const size_t name = slash == std::string::npos ? 0 : slash + 1;
        error = FileStatAt(folder_.Get(), relativePath.c_str() + name, status);
    }
    return error == 0 && status->device != device_ ? EXDEV : error;
}

const FileLook &FileLooker::Look(const std::string &relativePath, const FileStat *status) {
    look_.error = error_;
    if (status != nullptr) {
        look_.status = *status;
    } else {
        look_.error = Stat(relativePath, &look_.status);
    }
    look_.hasExtents = false;
    look_.table.entries.clear();
    look_.blocks.clear();
    if (look_.error == 0) {
        AskExtents(relativePath);
    }
    return look_;
}
} // namespace vesk
