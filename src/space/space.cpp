#include "space/space.h"

#include "base/log.h"
#include "base/malloc_text.h"

#include "vesk/storage_core.h"

#include <cstring>
#include <memory>

namespace {

struct SpaceListDeleter {
    void operator()(VESKSpaceInfo *list) const { VESKSpaceInfoFree(list); }
};
using SpaceList = std::unique_ptr<VESKSpaceInfo, SpaceListDeleter>;

// The library may set a list even when it fails; it is released either way.
int EnumSpaces(SpaceList *spaces) {
    VESKSpaceInfo *list = nullptr;
    const int result = VESKSpaceInfoEnum(1, &list);
    spaces->reset(list);
    return result < 0 ? -1 : 0;
}

} // namespace

char *SpaceGetReferencePath(const char *uuid) {
    SpaceList spaces;
    if (EnumSpaces(&spaces) < 0) {
        LogError("Can't enum spaces");
        return nullptr;
    }
    char *referencePath = nullptr;
    for (const VESKSpaceInfo *space = spaces.get(); space != nullptr; space = space->next) {
        const MallocText spaceUuid(VESKSpaceUUIDGet(space));
        if (!spaceUuid) {
            LogError("Get space uuid failed");
            continue;
        }
        if (strcmp(spaceUuid.get(), uuid) == 0) {
            referencePath = strdup(space->referencePath);
            break;
        }
    }
    LogVerbose("Get reference path = %s", referencePath);
    return referencePath;
}

char *SpaceGetDevicePath(const char *referencePath) {
    SpaceList spaces;
    if (EnumSpaces(&spaces) < 0) {
        LogError("Can't enum spaces");
        return nullptr;
    }
    char *devicePath = nullptr;
    for (const VESKSpaceInfo *space = spaces.get(); space != nullptr; space = space->next) {
        if (space->referencePath[0] == '\0') {
            LogError("Reference path should not be null");
            return nullptr;
        }
        if (strcmp(space->referencePath, referencePath) == 0) {
            devicePath = strdup(space->devicePath);
            break;
        }
    }
    LogVerbose("Get device path = %s", devicePath);
    return devicePath;
}

char *SpaceGetUUID(const char *referencePath) {
    SpaceList spaces;
    if (EnumSpaces(&spaces) < 0) {
        LogError("Can't enum spaces");
        return nullptr;
    }
    char *uuid = nullptr;
    for (const VESKSpaceInfo *space = spaces.get(); space != nullptr; space = space->next) {
        if (strcmp(space->referencePath, referencePath) == 0) {
            uuid = VESKSpaceUUIDGet(space);
            break;
        }
    }
    LogVerbose("Get UUID = %s", uuid);
    return uuid;
}
