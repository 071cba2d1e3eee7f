#include "storage_core/block_device.h"
#include "vesk/storage_core.h"

#include <cstring>
#include <exception>

namespace vesk {
extern "C" char *VESKSpaceUUIDGet(const VESKSpaceInfo *space) {
    if (space == nullptr) {
        return nullptr;
    }
    try {
        const std::string path(space->devicePath,
                               strnlen(space->devicePath, sizeof(space->devicePath)));
        const std::string uuid = BlockDeviceProbe(path, "UUID");
        return uuid.empty() ? nullptr : strdup(uuid.c_str());
    } catch (const std::exception &) {
        return nullptr;
    }
}
} // namespace vesk
