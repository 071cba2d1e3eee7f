#include "cli/file_list.h"

#include "base/log.h"
#include "files/path.h"

#include <cstring>

namespace vesk {

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
