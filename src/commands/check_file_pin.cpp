#include "commands/commands.h"

#include "base/log.h"
#include "config/config_document.h"
#include "files/path.h"
#include "space/relative_path.h"

#include <string>

namespace vesk {
PinCheck CheckFileIsPin(const char *configPath, const char *filePath) {
    if (!PathExists(configPath)) {
        LogError("Can't find config file (%s)", configPath);
        return PinCheck::Error;
    }
    char mountPath[1024] = {};
    if (FileGetTopDir(filePath, mountPath, sizeof(mountPath)) < 0) {
        LogError("Can't get top directory of file (%s)", filePath);
        return PinCheck::Error;
    }
    LogVerbose("Mount path = %s", mountPath);
    Json::Value root;
    if (ConfigReadDocument(configPath, &root, ConfigHasVolumesShape) < 0) {
        LogError("Can't read data from config file (%s)", configPath);
        return PinCheck::Error;
    }
    const Json::Value &volumes = static_cast<const Json::Value &>(root)["volumes"];
    if (!volumes.isMember(mountPath) || volumes[mountPath].isNull()) {
        return PinCheck::NotPinned;
    }
    uint32_t inode = 0;
    if (FileGetInodeNumber(filePath, &inode) < 0) {
        LogError("Can't get inode number of file (%s)", filePath);
        return PinCheck::Error;
    }
    return volumes[mountPath]["files"].isMember(std::to_string(inode)) ? PinCheck::Pinned
                                                                       : PinCheck::NotPinned;
}
} // namespace vesk
