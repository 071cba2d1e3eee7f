#include "storage_core/block_device.h"

#include "base/deleter.h"
#include "base/malloc_text.h"

#include <blkid/blkid.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <iterator>
#include <memory>

namespace vesk {
namespace {
// Filesystems that libblkid may call otherwise than the mount table. One driver mounts all of ext.
struct OtherNames {
    const char *mounted;
    const char *probed[3]; // null: no further one
};
constexpr OtherNames kOtherNames[] = {
    {"ext2", {"ext2", "ext3", "ext4"}},    {"ext3", {"ext2", "ext3", "ext4"}},
    {"ext4", {"ext2", "ext3", "ext4"}},    {"msdos", {"vfat", nullptr, nullptr}},
    {"ntfs3", {"ntfs", nullptr, nullptr}}, {"fuseblk", {"ntfs", "exfat", nullptr}},
};

bool ProbeOnlyMounted(blkid_probe probe, const std::string &mountType) {
    std::string driver = mountType.substr(0, mountType.find('.')); // "fuseblk.ntfs"
    char *names[4] = {&driver[0]}; // a list that ends with null, which libblkid does not change
    for (const OtherNames &other : kOtherNames) {
        if (driver == other.mounted) {
            std::transform(std::begin(other.probed), std::end(other.probed), names,
                           [](const char *name) { return const_cast<char *>(name); });
        }
    }
    return blkid_probe_filter_superblocks_type(probe, BLKID_FLTR_ONLYIN, names) == 0;
}

// Empty where there is no such file.
std::string FirstLineOf(const std::string &path) {
    std::ifstream stream(path);
    std::string line;
    std::getline(stream, line);
    return line;
}
} // namespace

std::string BlockDeviceOfMount(const MountEntry &mount) {
    // Any filesystem can be given a device path as its source ("mount -t tmpfs /dev/sda1 ..."),
    // but of those without a device number only btrfs means it. The others' must not even be looked
    // at: users name the sources of their FUSE mounts, and a look below one of these can last.
    const bool hasNumber = major(mount.device) != 0;
    if (!hasNumber && mount.type != "btrfs") {
        return {};
    }
    // A source such as "tank/data" or "none" must not be looked up in the current directory.
    const bool isPath = !mount.source.empty() && mount.source.front() == '/';
    const dev_t number = isPath ? BlockDeviceNumber(mount.source) : 0;
    if (!hasNumber) {
        return number != 0 ? mount.source : std::string();
    }
    return number == mount.device ? mount.source : BlockDeviceByNumber(mount.device);
}

std::string BlockDeviceByNumber(dev_t device) {
    const MallocText name(blkid_devno_to_devname(device));
    if (name == nullptr || BlockDeviceNumber(name.get()) != device) {
        return {};
    }
    return name.get();
}

dev_t BlockDeviceNumber(const std::string &devicePath) {
    struct stat status = {};
    if (stat(devicePath.c_str(), &status) != 0 || !S_ISBLK(status.st_mode)) {
        return 0;
    }
    return status.st_rdev;
}

bool BlockDeviceHasOffset(dev_t device, const std::string &folder) {
    const std::string path =
        folder + "/" + std::to_string(major(device)) + ":" + std::to_string(minor(device));
    if (access(path.c_str(), F_OK) != 0) {
        return true;
    }
    for (const char *mark : {"/partition", "/md", "/bcache"}) {
        if (access((path + mark).c_str(), F_OK) == 0) {
            return true;
        }
    }
    const std::string mapping = FirstLineOf(path + "/dm/uuid");
    for (const char *kind : {"LVM-", "CRYPT-", "part"}) {
        if (mapping.rfind(kind, 0) == 0) {
            return true;
        }
    }
    const std::string offset = FirstLineOf(path + "/loop/offset");
    const dev_t below = BlockDeviceNumber(FirstLineOf(path + "/loop/backing_file"));
    return (!offset.empty() && offset != "0") ||
           (below != 0 && below != device && BlockDeviceHasOffset(below, folder));
}

std::string BlockDeviceProbe(const std::string &devicePath, const char *name,
                             const std::string &mountType) {
    const std::unique_ptr<blkid_struct_probe, Deleter<blkid_free_probe>> probe(
        blkid_new_probe_from_filename(devicePath.c_str()));
    if (probe == nullptr || blkid_probe_enable_superblocks(probe.get(), 1) != 0 ||
        blkid_probe_set_superblocks_flags(probe.get(), BLKID_SUBLKS_UUID | BLKID_SUBLKS_TYPE) !=
            0 ||
        (!mountType.empty() && !ProbeOnlyMounted(probe.get(), mountType)) ||
        blkid_do_safeprobe(probe.get()) != 0) {
        return {};
    }
    const char *value = nullptr;
    if (blkid_probe_lookup_value(probe.get(), name, &value, nullptr) != 0 || value == nullptr) {
        return {};
    }
    return value;
}
} // namespace vesk
