#include "cachedev/cachedev_fuse.h"

#include "cachedev/pin_requests.h"
#include "cachedev/state_json.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <new>
#include <sys/stat.h>
#include <unistd.h>

namespace {

// Not in every libfuse header: the caller has 4-byte pointers.
constexpr unsigned kIoctlFrom32Bit = 1U << 3;

// An open file; its address is the file handle.
struct OpenFile {
    bool isDevice;
    std::string stateText; // of the state file, as it was at open
};

ServedDevice &Served() {
    return *static_cast<ServedDevice *>(fuse_get_context()->private_data);
}

OpenFile *FileOf(const struct fuse_file_info *info) {
    // The handle is the address that Open stored there.
    // NOLINTNEXTLINE(performance-no-int-to-ptr)
    return reinterpret_cast<OpenFile *>(static_cast<uintptr_t>(info->fh));
}

// Runs the body of a callback; what it throws becomes an error number.
template <typename Body> int Guarded(Body body) {
    try {
        return body();
    } catch (const std::bad_alloc &) {
        return -ENOMEM;
    } catch (...) {
        return -EIO;
    }
}

std::string StateText(ServedDevice &served) {
    return StateJsonText(CacheDeviceSnapshot(served.device), getpid());
}

void *Init(struct fuse_conn_info *connection, struct fuse_config *config) {
    // Without this flag the kernel asks for a truncation apart from the open, which is refused;
    // with it, it would take the device for empty from then on, whatever the answer.
    connection->want &= ~static_cast<unsigned>(FUSE_CAP_ATOMIC_O_TRUNC);
    config->nullpath_ok = 1;    // an open file is known by its handle
    config->attr_timeout = 0;   // the state file changes its length
    config->entry_timeout = 60; // seconds; the names never change
    ServedDevice &served = Served();
    if (served.onReady) {
        Guarded([&served] {
            served.onReady();
            return 0;
        });
    }
    return &served;
}

void FillStatus(const ServedDevice &served, mode_t mode, uint64_t bytes, struct stat &status) {
    status = {};
    status.st_mode = mode;
    status.st_nlink = S_ISDIR(mode) ? 2 : 1;
    status.st_uid = geteuid();
    status.st_gid = getegid();
    status.st_size = static_cast<off_t>(bytes);
    status.st_blocks = static_cast<blkcnt_t>((bytes + kSectorBytes - 1) / kSectorBytes);
    status.st_blksize = static_cast<blksize_t>(kBlockBytes);
    status.st_atime = status.st_mtime = status.st_ctime = served.startTime;
}

int GetAttributes(const char *path, struct stat *status, struct fuse_file_info *info) {
    return Guarded([=] {
        ServedDevice &served = Served();
        const OpenFile *file = info != nullptr ? FileOf(info) : nullptr;
        if (file != nullptr ? file->isDevice : path != nullptr && served.devicePath == path)
            FillStatus(served, S_IFREG | 0600, served.device.images.deviceBytes, *status);
        else if (file != nullptr)
            FillStatus(served, S_IFREG | 0444, file->stateText.size(), *status);
        else if (path != nullptr && served.statePath == path)
            FillStatus(served, S_IFREG | 0444, StateText(served).size(), *status);
        else if (path == nullptr || strcmp(path, "/") == 0)
            FillStatus(served, S_IFDIR | 0755, 0, *status);
        else
            return -ENOENT;
        return 0;
    });
}

int ReadFolder(const char *, void *buffer, fuse_fill_dir_t fill, off_t, struct fuse_file_info *,
               enum fuse_readdir_flags) {
    return Guarded([=] {
        const ServedDevice &served = Served();
        const char *const names[] = {".", "..", served.devicePath.c_str() + 1,
                                     served.statePath.c_str() + 1};
        for (const char *name : names)
            fill(buffer, name, nullptr, 0, static_cast<fuse_fill_dir_flags>(0));
        return 0;
    });
}

int Open(const char *path, struct fuse_file_info *info) {
    return Guarded([=] {
        ServedDevice &served = Served();
        const bool isDevice = served.devicePath == path;
        if (!isDevice && served.statePath != path)
            return -ENOENT;
        if (!isDevice && (info->flags & O_ACCMODE) != O_RDONLY)
            return -EACCES;
        auto file = std::make_unique<OpenFile>(OpenFile{isDevice, {}});
        if (!isDevice)
            file->stateText = StateText(served);
        info->direct_io = 1; // every read of the device reaches the cache
        info->noflush = 1;   // nothing happens at close
        info->fh = reinterpret_cast<uintptr_t>(file.release());
        return 0;
    });
}

int Release(const char *, struct fuse_file_info *info) {
    delete FileOf(info);
    return 0;
}

int Read(const char *, char *buffer, size_t size, off_t offset, struct fuse_file_info *info) {
    return Guarded([=] {
        const OpenFile &file = *FileOf(info);
        const auto start = static_cast<uint64_t>(offset);
        if (file.isDevice)
            return static_cast<int>(CacheDeviceRead(Served().device, start, buffer, size));
        if (start >= file.stateText.size())
            return 0;
        return static_cast<int>(file.stateText.copy(buffer, size, static_cast<size_t>(start)));
    });
}

int Write(const char *, const char *buffer, size_t size, off_t offset,
          struct fuse_file_info *info) {
    return Guarded([=] {
        if (!FileOf(info)->isDevice)
            return -EBADF;
        return static_cast<int>(
            CacheDeviceWrite(Served().device, static_cast<uint64_t>(offset), buffer, size));
    });
}

int Sync(const char *, int, struct fuse_file_info *info) {
    return FileOf(info)->isDevice ? CacheImagesSyncBacking(Served().device.images) : 0;
}

// Like a block device the file keeps its size.
int Truncate(const char *path, off_t size, struct fuse_file_info *info) {
    const ServedDevice &served = Served();
    const bool isDevice =
        info != nullptr ? FileOf(info)->isDevice : path != nullptr && served.devicePath == path;
    if (!isDevice)
        return -EACCES;
    return static_cast<uint64_t>(size) == served.device.images.deviceBytes ? 0 : -EINVAL;
}

int Ioctl(const char *, unsigned number, void *argument, struct fuse_file_info *info,
          unsigned flags, void *data) {
    return Guarded([=] {
        const OpenFile *file = (flags & FUSE_IOCTL_DIR) != 0 ? nullptr : FileOf(info);
        if (file == nullptr || !file->isDevice)
            return -ENOTTY;
        const bool is32bit =
            sizeof(void *) == 4 || (flags & (FUSE_IOCTL_COMPAT | kIoctlFrom32Bit)) != 0;
        PinRequest request = {};
        request.number = number;
        request.argument = reinterpret_cast<uintptr_t>(argument);
        request.caller = {fuse_get_context()->pid, is32bit};
        request.data = data;
        return PinRequestHandle(Served().device, request);
    });
}

} // namespace

struct fuse_operations CachedevFuseOperations() {
    struct fuse_operations operations = {};
    operations.init = Init;
    operations.getattr = GetAttributes;
    operations.readdir = ReadFolder;
    operations.open = Open;
    operations.release = Release;
    operations.read = Read;
    operations.write = Write;
    operations.fsync = Sync;
    operations.truncate = Truncate;
    operations.ioctl = Ioctl;
    return operations;
}
