#include "cli/required_parameters.h"

#include "base/log.h"
#include "files/path.h"

#include <cstring>

namespace vesk {
int CheckParameter(const RequiredParameters *required, const ToolParameters *parameters) {
    if (required->cachePath != 0) {
        if (parameters->cachePath == nullptr) {
            LogError("Error: Cache path is not set");
            return -1;
        }
        if (!PathExists(parameters->cachePath)) {
            LogError("Error: Cache path (%s) doesn't exist", parameters->cachePath);
            return -1;
        }
    }
    if (required->spaceUuid != 0 && parameters->spaceUuid == nullptr) {
        LogError("Space UUID must be set");
        return -1;
    }
    if (required->configPath != 0 && parameters->configPath == nullptr) {
        LogError("Config path must be set");
        return -1;
    }
    if (required->mountPath != 0 && parameters->mountPath == nullptr) {
        LogError("Mount path must be set");
        return -1;
    }
    if (required->files != 0 && CheckFilesExist(parameters->files) != 0) {
        LogError("Check file paths error");
        return -1;
    }
    if (required->startSector != 0 && parameters->startSector == kSectorNotSet) {
        LogError("Start sector is not set");
        return -1;
    }
    if (required->numSectors != 0 && parameters->numSectors == kSectorNotSet) {
        LogError("Num of sectors is not set");
        return -1;
    }
    return 0;
}

int CheckFilesExist(const char *paths) {
    if (paths == nullptr) {
        LogError("The file paths should not be NULL");
        return -1;
    }
    const size_t copiedMax = 512;
    char copy[copiedMax + 1] = {};
    memcpy(copy, paths, strnlen(paths, copiedMax));

    bool seen = false;
    char *rest = nullptr;
    for (const char *path = strtok_r(copy, ";", &rest); path != nullptr;
         path = strtok_r(nullptr, ";", &rest)) {
        if (!PathExists(path)) {
            LogError("File (path %s) doesn't exist", path);
            return -1;
        }
        seen = true;
    }
    if (!seen) {
        LogError("No availiable files in the file paths (%s)", paths);
        return -1;
    }
    return 0;
}
} // namespace vesk
