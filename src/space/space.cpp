#include "space/space.h"

#include "base/deleter.h"

#include "vesk/storage_core.h"

#include <cstdio>
#include <cstring>
#include <memory>

namespace vesk {
namespace {
using SpaceInfoList = std::unique_ptr<VESKSpaceInfo, Deleter<VESKSpaceInfoFree>>;

// Shows the spaces to `visit` until it answers something else than NoSpace, which is the result.
// The list is the caller's, who logs the answer before it is freed.
template <typename Visit>
SpaceCause Walk(const Visit &visit, SpaceInfoList *spaces, SpaceCause *asked,
                const LogPlace &place) {
    VESKSpaceInfo *list = nullptr;
    const int result = VESKSpaceInfoEnum(1, &list);
    spaces->reset(list); // the library may set a list even when it fails
    if (result < 0) {
        LogErrorAt(place, "Can't enum spaces");
    }
    SpaceCause cause = result < 0 ? SpaceCause::CannotEnumerate : SpaceCause::NoSpace;
    for (; list != nullptr && cause == SpaceCause::NoSpace; list = list->next) {
        cause = visit(*list);
    }
    SpaceTell(asked, cause);
    return cause;
}
} // namespace

char *SpaceGetReferencePath(const char *uuid, SpaceCause *cause) {
    const LogPlace place = LogHere();
    char *referencePath = nullptr;
    const auto visit = [uuid, &place, &referencePath](const VESKSpaceInfo &space) {
        const MallocText spaceUuid(VESKSpaceUUIDGet(&space));
        if (!spaceUuid) {
            LogErrorAt(place, "Get space uuid failed");
        }
        if (!spaceUuid || strcmp(spaceUuid.get(), uuid) != 0) {
            return SpaceCause::NoSpace;
        }
        referencePath = strdup(space.referencePath);
        return SpaceCause::Found;
    };
    SpaceInfoList spaces;
    if (Walk(visit, &spaces, cause, place) != SpaceCause::CannotEnumerate) {
        LogVerbose("Get reference path = %s", referencePath);
    }
    return referencePath;
}

char *SpaceGetDevicePath(const char *referencePath, SpaceCause *cause) {
    const LogPlace place = LogHere();
    char *devicePath = nullptr;
    const auto visit = [referencePath, &place, &devicePath](const VESKSpaceInfo &space) {
        if (space.referencePath[0] == '\0') {
            LogErrorAt(place, "Reference path should not be null");
            return SpaceCause::NoReferencePath;
        }
        if (strcmp(space.referencePath, referencePath) != 0) {
            return SpaceCause::NoSpace;
        }
        devicePath = strdup(space.devicePath);
        return SpaceCause::Found;
    };
    SpaceInfoList spaces;
    const SpaceCause result = Walk(visit, &spaces, cause, place);
    if (result == SpaceCause::Found || result == SpaceCause::NoSpace) {
        LogVerbose("Get device path = %s", devicePath);
    }
    return devicePath;
}

char *SpaceGetUUID(const char *referencePath, SpaceCause *cause) {
    char *uuid = nullptr;
    const auto visit = [referencePath, &uuid](const VESKSpaceInfo &space) {
        if (strcmp(space.referencePath, referencePath) != 0) {
            return SpaceCause::NoSpace;
        }
        uuid = VESKSpaceUUIDGet(&space);
        return uuid != nullptr ? SpaceCause::Found : SpaceCause::NoUuid;
    };
    SpaceInfoList spaces;
    if (Walk(visit, &spaces, cause, LogHere()) != SpaceCause::CannotEnumerate) {
        LogVerbose("Get UUID = %s", uuid);
    }
    return uuid;
}

std::vector<SpaceEntry> SpaceList(SpaceCause *cause) {
    VESKSpaceInfo *list = nullptr;
    const int result = VESKSpaceInfoEnum(1, &list);
    const SpaceInfoList owner(list);
    if (result < 0) {
        LogError("Can't enum spaces");
    }
    SpaceTell(cause, result < 0 ? SpaceCause::CannotEnumerate : SpaceCause::Found);
    std::vector<SpaceEntry> spaces;
    for (; list != nullptr; list = list->next) {
        const MallocText uuid(VESKSpaceUUIDGet(list));
        spaces.push_back({list->referencePath, list->devicePath, uuid ? uuid.get() : ""});
    }
    return spaces;
}

char *SpaceGetBitmapPath(const char *uuid) {
    MallocText referencePath;
    MallocText bitmapPath;
    if (SpaceTake(SpaceGetReferencePath(uuid), &referencePath, "Can't get reference path",
                  LogHere())) {
        SpaceTake(BitmapGetPathByReferencePath(referencePath.get()), &bitmapPath,
                  "Can't get bitmap path", LogHere());
    }
    return bitmapPath.release();
}

char *BitmapGetPathByReferencePath(const char *referencePath) {
    char path[512];
    const int length =
        snprintf(path, sizeof(path), "%s/%s", referencePath, "veskcachepinfile.bitmap");
    return length < 0 ? nullptr : strdup(path);
}

bool SpaceTake(char *text, MallocText *owner, const char *failure, const LogPlace &place) {
    owner->reset(text);
    if (text == nullptr) {
        LogErrorAt(place, "%s", failure);
    }
    return text != nullptr;
}
} // namespace vesk
