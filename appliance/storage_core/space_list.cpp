#include "storage_core/space_list.h"

#include "base/deleter.h"
#include "storage_core/block_device.h"
#include "vesk/storage_core.h"

#include <sys/sysmacros.h>

#include <algorithm>
#include <exception>
#include <memory>

namespace vesk {
namespace {
// A mount of a directory inside the filesystem (a bind mount) is not the space's top directory. A
// btrfs subvolume is mounted by its path, too: it is whole when the mount shows just the subvolume.
bool ShowsWholeFilesystem(const MountEntry &mount) {
    return mount.root == "/" ||
           (mount.type == "btrfs" && mount.root == MountOptionValue(mount, "subvol"));
}

// The path of a hidden mount leads to another filesystem.
bool IsVisible(const MountEntry &mount, const std::vector<MountEntry> &mounts) {
    return MountFindByPath(mounts, mount.target) == &mount;
}

bool Fits(const Space &space) {
    return space.devicePath.size() < sizeof(VESKSpaceInfo::devicePath) &&
           space.referencePath.size() < sizeof(VESKSpaceInfo::referencePath);
}

using SpaceInfoList = std::unique_ptr<VESKSpaceInfo, Deleter<VESKSpaceInfoFree>>;

SpaceInfoList InfoListMake(const std::vector<Space> &spaces) {
    SpaceInfoList list;
    for (auto space = spaces.rbegin(); space != spaces.rend(); ++space) {
        SpaceInfoList info(new VESKSpaceInfo{});
        space->devicePath.copy(info->devicePath, sizeof(info->devicePath) - 1);
        space->referencePath.copy(info->referencePath, sizeof(info->referencePath) - 1);
        info->next = list.release();
        list = std::move(info);
    }
    return list;
}
} // namespace

std::vector<Space> SpaceListSelect(const std::vector<MountEntry> &mounts,
                                   const SpaceDeviceLookup &deviceOf) {
    std::vector<Space> spaces;
    std::vector<dev_t> devices; // number of each chosen filesystem, in the order of `spaces`
    for (const MountEntry &mount : mounts) {
        if (mount.type == "autofs" || !ShowsWholeFilesystem(mount) || !IsVisible(mount, mounts) ||
            std::find(devices.begin(), devices.end(), mount.device) != devices.end()) {
            continue;
        }
        Space space = {deviceOf(mount), mount.target};
        const bool isKnown = std::any_of(spaces.begin(), spaces.end(), [&](const Space &known) {
            return known.devicePath == space.devicePath;
        });
        if (space.devicePath.empty() || space.referencePath.empty() || isKnown || !Fits(space)) {
            continue;
        }
        devices.push_back(mount.device);
        spaces.push_back(std::move(space));
    }
    return spaces;
}

extern "C" int VESKSpaceInfoEnum(int /*scope*/, VESKSpaceInfo **list) {
    if (list == nullptr) {
        return -1;
    }
    *list = nullptr;
    try {
        std::vector<MountEntry> mounts;
        if (!MountTableRead(kMountTablePath, mounts)) {
            return -1;
        }
        *list = InfoListMake(SpaceListSelect(mounts, BlockDeviceOfMount)).release();
        return 0;
    } catch (const std::exception &) {
        return -1;
    }
}

extern "C" void VESKSpaceInfoFree(VESKSpaceInfo *list) {
    while (list != nullptr) {
        const std::unique_ptr<VESKSpaceInfo> first(list);
        list = first->next;
    }
}
} // namespace vesk
