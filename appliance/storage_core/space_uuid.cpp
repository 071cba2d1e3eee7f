#include "storage_core/block_device.h"
#include "storage_core/mount_table.h"
#include "vesk/storage_core.h"

#include <cstring>
#include <exception>
#include <string>
#include <vector>

namespace vesk {
namespace {
// The type as which the filesystem on this device is mounted, or an empty text.
std::string MountTypeOfDevice(const std::string &devicePath) {
    std::vector<MountEntry> mounts;
    const dev_t number = BlockDeviceNumber(devicePath);
    if (number == 0 || !MountTableRead(kMountTablePath, mounts)) {
        return {};
    }
    if (const MountEntry *mount = MountFindByDevice(mounts, number)) {
        return mount->type;
    }
    for (const MountEntry &mount : mounts) { // btrfs mounts have numbers of their own
        const std::string path = BlockDeviceOfMount(mount);
        if (!path.empty() && BlockDeviceNumber(path) == number) {
            return mount.type;
        }
    }
    return {};
}
} // namespace

extern "C" char *VESKSpaceUUIDGet(const VESKSpaceInfo *space) {
    if (space == nullptr) {
        return nullptr;
    }
    try {
        const std::string path(space->devicePath,
                               strnlen(space->devicePath, sizeof(space->devicePath)));
        // A space is mounted. What is not mounted any more has no UUID: without the type of the
        // mount its users could choose one.
        const std::string type = MountTypeOfDevice(path);
        const std::string uuid =
            type.empty() ? std::string() : BlockDeviceProbe(path, "UUID", type);
        return uuid.empty() ? nullptr : strdup(uuid.c_str());
    } catch (const std::exception &) {
        return nullptr;
    }
}
} // namespace vesk
