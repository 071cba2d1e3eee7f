#include "cachedev/cachedev_fuse.h"

#include "cachedev/pin_requests.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <fcntl.h>
#include <new>
#include <sys/stat.h>
#include <unistd.h>
#include <vector>

namespace vesk {
namespace {
// Not in every libfuse header: the caller has 4-byte pointers.
constexpr unsigned kIoctlFrom32Bit = 1U << 3;

constexpr fuse_ino_t kRootInode = FUSE_ROOT_ID;
constexpr fuse_ino_t kDeviceInode = 2;
constexpr fuse_ino_t kFirstStateInode = 3; // that of the first state file; the others follow

constexpr double kNameTimeout = 60;     // seconds; the names never change
constexpr double kAttributeTimeout = 0; // seconds; a state file may change its length

ServedDevice &Served(fuse_req_t request) {
    return *static_cast<ServedDevice *>(fuse_req_userdata(request));
}

// The state file of an inode, or null.
StateFile *StateFileOf(ServedDevice &served, fuse_ino_t inode) {
    if (inode < kFirstStateInode || inode - kFirstStateInode >= served.stateFiles.size()) {
        return nullptr;
    }
    return &served.stateFiles[static_cast<size_t>(inode - kFirstStateInode)];
}

// The inode of a name, or 0.
fuse_ino_t InodeOf(const ServedDevice &served, const std::string &name) {
    if (served.deviceName == name) {
        return kDeviceInode;
    }
    for (size_t i = 0; i < served.stateFiles.size(); ++i) {
        if (served.stateFiles[i].name == name) {
            return kFirstStateInode + i;
        }
    }
    return 0;
}

// Runs the body of a callback: it replies and returns 0, or does not reply and returns an errno,
// which is then the reply. It may throw only before it replies.
template <typename Body> void Guarded(fuse_req_t request, Body body) {
    int error = EIO;
    try {
        error = body();
    } catch (const std::bad_alloc &) {
        error = ENOMEM;
    } catch (...) {
        error = EIO;
    }
    if (error != 0) {
        fuse_reply_err(request, error);
    }
}

// The attributes of an inode; `info` is that of an open file or null.
struct stat StatusOf(ServedDevice &served, fuse_ino_t inode, const struct fuse_file_info *info) {
    struct stat status = {};
    uint64_t bytes = 0;
    if (inode == kDeviceInode) {
        status.st_mode = S_IFREG | 0600;
        bytes = served.device.images.deviceBytes;
    } else if (StateFile *file = StateFileOf(served, inode)) {
        status.st_mode = S_IFREG | 0444;
        bytes = info != nullptr ? OpenStatesContent(file->openStates, info->fh)->size()
                                : OpenStatesBytes(file->openStates, served.device);
    } else {
        status.st_mode = S_IFDIR | 0755;
    }
    status.st_ino = inode;
    status.st_nlink = inode == kRootInode ? 2 : 1;
    status.st_uid = geteuid();
    status.st_gid = getegid();
    status.st_size = static_cast<off_t>(bytes);
    status.st_blocks = static_cast<blkcnt_t>((bytes + kSectorBytes - 1) / kSectorBytes);
    status.st_blksize = static_cast<blksize_t>(kBlockBytes);
    status.st_atime = status.st_mtime = status.st_ctime = served.startTime;
    return status;
}

void Init(void *userData, struct fuse_conn_info *connection) {
    // Without this flag the kernel asks for a truncation apart from the open, which is refused;
    // with it, it would take the device for empty from then on, whatever the answer.
    connection->want &= ~static_cast<unsigned>(FUSE_CAP_ATOMIC_O_TRUNC);
    const auto &served = *static_cast<ServedDevice *>(userData);
    if (served.onReady) {
        served.onReady();
    }
}

void LookUp(fuse_req_t request, fuse_ino_t, const char *name) {
    Guarded(request, [=] {
        ServedDevice &served = Served(request);
        struct fuse_entry_param entry = {};
        entry.ino = InodeOf(served, name);
        if (entry.ino == 0) {
            return ENOENT;
        }
        entry.attr = StatusOf(served, entry.ino, nullptr);
        entry.attr_timeout = kAttributeTimeout;
        entry.entry_timeout = kNameTimeout;
        fuse_reply_entry(request, &entry);
        return 0;
    });
}

void GetAttributes(fuse_req_t request, fuse_ino_t inode, struct fuse_file_info *info) {
    Guarded(request, [=] {
        const struct stat status = StatusOf(Served(request), inode, info);
        fuse_reply_attr(request, &status, kAttributeTimeout);
        return 0;
    });
}

// Like a block device the file keeps its size; nothing else can be set either.
void SetAttributes(fuse_req_t request, fuse_ino_t inode, struct stat *wanted, int which,
                   struct fuse_file_info *info) {
    Guarded(request, [=] {
        ServedDevice &served = Served(request);
        if ((which & FUSE_SET_ATTR_SIZE) == 0) {
            return EPERM;
        }
        if (inode != kDeviceInode ||
            static_cast<uint64_t>(wanted->st_size) != served.device.images.deviceBytes) {
            return EINVAL;
        }
        const struct stat status = StatusOf(served, inode, info);
        fuse_reply_attr(request, &status, kAttributeTimeout);
        return 0;
    });
}

void ReadFolder(fuse_req_t request, fuse_ino_t, size_t size, off_t offset,
                struct fuse_file_info *) {
    Guarded(request, [=] {
        const ServedDevice &served = Served(request);
        struct Entry {
            const char *name;
            fuse_ino_t inode;
            mode_t type;
        };
        std::vector<Entry> entries = {{".", kRootInode, S_IFDIR},
                                      {"..", kRootInode, S_IFDIR},
                                      {served.deviceName.c_str(), kDeviceInode, S_IFREG}};
        for (const StateFile &file : served.stateFiles) {
            entries.push_back({file.name.c_str(), InodeOf(served, file.name), S_IFREG});
        }
        std::vector<char> buffer(size);
        size_t used = 0;
        for (auto index = static_cast<size_t>(offset); index < entries.size(); ++index) {
            struct stat status = {};
            status.st_ino = entries[index].inode;
            status.st_mode = entries[index].type;
            // An entry's offset is that of the one behind it.
            const size_t needed =
                fuse_add_direntry(request, buffer.data() + used, size - used, entries[index].name,
                                  &status, static_cast<off_t>(index + 1));
            if (needed > size - used) {
                break;
            }
            used += needed;
        }
        fuse_reply_buf(request, buffer.data(), used);
        return 0;
    });
}

void Open(fuse_req_t request, fuse_ino_t inode, struct fuse_file_info *info) {
    Guarded(request, [=] {
        ServedDevice &served = Served(request);
        info->direct_io = 1; // every read of the device reaches the cache
        info->noflush = 1;   // nothing happens at close
        info->fh = 0;
        StateFile *file = StateFileOf(served, inode);
        if (file != nullptr) {
            if ((info->flags & O_ACCMODE) != O_RDONLY) {
                return EACCES;
            }
            info->fh = OpenStatesOpen(file->openStates, served.device);
        }
        // Whoever gave up waiting never closes the file that it did not get.
        if (fuse_reply_open(request, info) != 0 && file != nullptr) {
            OpenStatesClose(file->openStates, info->fh);
        }
        return 0;
    });
}

void Release(fuse_req_t request, fuse_ino_t inode, struct fuse_file_info *info) {
    if (StateFile *file = StateFileOf(Served(request), inode)) {
        OpenStatesClose(file->openStates, info->fh);
    }
    fuse_reply_err(request, 0);
}

void ReadState(fuse_req_t request, size_t size, off_t offset, const std::string &content) {
    const size_t start =
        static_cast<size_t>(std::min<uint64_t>(static_cast<uint64_t>(offset), content.size()));
    fuse_reply_buf(request, content.data() + start, std::min(size, content.size() - start));
}

void Read(fuse_req_t request, fuse_ino_t inode, size_t size, off_t offset,
          struct fuse_file_info *info) {
    Guarded(request, [=] {
        if (StateFile *file = StateFileOf(Served(request), inode)) {
            ReadState(request, size, offset, *OpenStatesContent(file->openStates, info->fh));
            return 0;
        }
        const auto reply = [request](const ImagePieces &pieces) {
            fuse_reply_iov(request, pieces.parts, pieces.count);
        };
        const int64_t result =
            CacheDeviceRead(Served(request).device, static_cast<uint64_t>(offset), size, reply);
        if (result == 0) {
            fuse_reply_buf(request, nullptr, 0);
        }
        return result < 0 ? static_cast<int>(-result) : 0;
    });
}

void Write(fuse_req_t request, fuse_ino_t inode, const char *buffer, size_t size, off_t offset,
           struct fuse_file_info *) {
    Guarded(request, [=] {
        if (inode != kDeviceInode) {
            return EBADF;
        }
        const int64_t result =
            CacheDeviceWrite(Served(request).device, static_cast<uint64_t>(offset), buffer, size);
        if (result < 0) {
            return static_cast<int>(-result);
        }
        fuse_reply_write(request, static_cast<size_t>(result));
        return 0;
    });
}

void Sync(fuse_req_t request, fuse_ino_t inode, int, struct fuse_file_info *) {
    const int result =
        inode == kDeviceInode ? CacheImagesSyncBacking(Served(request).device.images) : 0;
    fuse_reply_err(request, -result);
}

void Ioctl(fuse_req_t request, fuse_ino_t inode, unsigned number, void *argument,
           struct fuse_file_info *, unsigned flags, const void *, size_t, size_t answerBytes) {
    Guarded(request, [=] {
        if (inode != kDeviceInode) {
            return ENOTTY;
        }
        std::array<unsigned char, 8> answer = {};
        PinRequest pin = {};
        pin.number = number;
        pin.argument = reinterpret_cast<uintptr_t>(argument);
        pin.caller = {fuse_req_ctx(request)->pid,
                      (flags & (FUSE_IOCTL_COMPAT | kIoctlFrom32Bit)) != 0};
        pin.data = answer.data();
        const int result = PinRequestHandle(Served(request).device, pin);
        if (result != 0) {
            return -result;
        }
        fuse_reply_ioctl(request, 0, answer.data(), std::min(answerBytes, answer.size()));
        return 0;
    });
}
} // namespace

struct fuse_lowlevel_ops CachedevFuseOperations() {
    struct fuse_lowlevel_ops operations = {};
    operations.init = Init;
    operations.lookup = LookUp;
    operations.getattr = GetAttributes;
    operations.setattr = SetAttributes;
    operations.readdir = ReadFolder;
    operations.open = Open;
    operations.release = Release;
    operations.read = Read;
    operations.write = Write;
    operations.fsync = Sync;
    operations.ioctl = Ioctl;
    return operations;
}
} // namespace vesk
