#include "vesk/storage_core.h"

#include "base/malloc_text.h"
#include "files/folder_open.h"
#include "storage_core/block_device.h"
#include "storage_core/directory_entry.h"
#include "storage_core/file_extents.h"
#include "storage_core/mount_table.h"

#include <sys/stat.h>
#include <sys/sysmacros.h>

#include <cstdlib>
#include <exception>

// The interface's classes, whose members are defined here, are in no namespace.
using namespace vesk;

namespace {
class FiemapDevice final : public FileSystemDevice {
public:
    explicit FiemapDevice(dev_t number) : number_(number) {}
    int GetMappingByInode(const std::string &directory, uint64_t inode,
                          FileMappingTable &table) override;

private:
    const dev_t number_; // device number; files of this filesystem carry it
    // The folder of the last question. Whoever asks for many files asks folder by folder, and an
    // object for one request has one question.
    std::string directory_;
    ScopedFd folder_;
    FolderIdentity identity_;
};

int FiemapDevice::GetMappingByInode(const std::string &directory, uint64_t inode,
                                    FileMappingTable &table) {
    table.entries.clear();
    try {
        if (!folder_.IsOpen() || directory != directory_) {
            folder_ = FolderOpenOnDevice(directory, number_);
            identity_ = FolderIdentityOf(folder_.Get());
            directory_ = directory;
        }
        const ScopedFd file =
            folder_.IsOpen() ? DirectoryOpenFile(folder_.Get(), identity_, inode) : ScopedFd();
        std::vector<FileMappingEntry> entries;
        if (!file.IsOpen() || !FileExtentsRead(file.Get(), entries)) {
            return -1;
        }
        table.entries.swap(entries);
        return 0;
    } catch (const std::exception &) {
        return -1;
    }
}

// The block device of the filesystem that holds a file, or an empty text. `device` is the number
// that the file carries.
std::string DeviceOfFile(const std::vector<MountEntry> &mounts, const std::string &filePath,
                         dev_t device) {
    if (const MountEntry *mount = MountFindByDevice(mounts, device)) {
        return BlockDeviceOfMount(*mount);
    }
    if (major(device) != 0) {
        return BlockDeviceByNumber(device); // a mount that this namespace does not show
    }
    // btrfs gives every subvolume a number that no mount carries, so that only the path tells.
    const MallocText path(realpath(filePath.c_str(), nullptr));
    const MountEntry *mount = path == nullptr ? nullptr : MountFindByPath(mounts, path.get());
    return mount == nullptr ? std::string() : BlockDeviceOfMount(*mount);
}

// What to know of the filesystem on a device: from the mount table, or, where it is not mounted,
// from its superblock. The latter may be a user's invention, but no file is found on such a device.
MountEntry MountOfDevice(const std::string &devicePath, dev_t number) {
    std::vector<MountEntry> mounts;
    if (MountTableRead(kMountTablePath, mounts)) {
        if (const MountEntry *mount = MountFindByDevice(mounts, number)) {
            return *mount;
        }
    }
    MountEntry unmounted;
    unmounted.device = number;
    unmounted.type = BlockDeviceProbe(devicePath, "TYPE", "");
    return unmounted;
}
} // namespace

FileMappingTable::~FileMappingTable() = default;

FileSystemDevice::~FileSystemDevice() = default;

int FileSystemDevice::Reserved() {
    return 0;
}

int FileSystemDevice::GetDevicePath(const std::string &filePath, std::string &devicePath,
                                    bool /*reserved*/) {
    try {
        struct stat status = {};
        std::vector<MountEntry> mounts;
        if (stat(filePath.c_str(), &status) != 0 || !MountTableRead(kMountTablePath, mounts)) {
            return -1;
        }
        std::string found = DeviceOfFile(mounts, filePath, status.st_dev);
        if (found.empty()) {
            return 1;
        }
        devicePath.swap(found);
        return 0;
    } catch (const std::exception &) {
        return -1;
    }
}

FileSystemDevice *FileSystemDeviceCreater::Create(const std::string &devicePath) {
    try {
        const dev_t number = BlockDeviceNumber(devicePath);
        if (number == 0 || BlockDeviceHasOffset(number) ||
            !FileSystemIsMappable(MountOfDevice(devicePath, number))) {
            return nullptr;
        }
        return new FiemapDevice(number);
    } catch (const std::exception &) {
        return nullptr;
    }
}
