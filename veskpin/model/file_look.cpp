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
int FileStatAt(int folder, const char *name, FileStat *status) {
    struct statx answer {};
    const int flags = AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT | AT_STATX_DONT_SYNC |
                      (*name == '\0' ? AT_EMPTY_PATH : 0);
    if (statx(folder, name, flags, STATX_TYPE | STATX_INO | STATX_SIZE, &answer) != 0) {
        return errno;
    }
    *status = {answer.stx_ino, answer.stx_size, answer.stx_mode,
               makedev(answer.stx_dev_major, answer.stx_dev_minor)};
    return 0;
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
    look_.table.entries.clear();
    look_.blocks.clear();
    look_.hasExtents = extents_ != nullptr && S_ISREG(look_.status.mode) &&
                       FileExtentsAsk(*extents_, mountPath_ + "/" + relativePath,
                                      static_cast<uint32_t>(look_.status.inode),
                                      &look_.table) == 0;
    if (look_.hasExtents) {
        look_.blocks = FileBlocksOf(look_.table);
    }
}

const FileLook &FileLooker::Look(const std::string &relativePath, const FileStat *status) {
    look_.error = error_;
    if (error_ == 0 && status == nullptr) {
        const size_t slash = relativePath.rfind('/');
        const std::string folder = slash == std::string::npos ? "" : relativePath.substr(0, slash);
        look_.error = OpenFolder(folder);
        if (look_.error == 0) {
            const char *name = relativePath.c_str() + (slash == std::string::npos ? 0 : slash + 1);
            look_.error = FileStatAt(folder_.Get(), name, &look_.status);
        }
        if (look_.error == 0 && look_.status.device != device_) {
            look_.error = EXDEV;
        }
    } else if (status != nullptr) {
        look_.status = *status;
    }
    look_.hasExtents = false;
    if (look_.error == 0) {
        AskExtents(relativePath);
    }
    return look_;
}
} // namespace vesk
