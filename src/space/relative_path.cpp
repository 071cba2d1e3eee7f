#include "space/relative_path.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "space/space.h"

#include <cstdio>
#include <cstring>

namespace vesk {
namespace {
const char kWhiteSpace[] = " \t\n\v\f\r";
const size_t kRelativePathMax = 511;
const size_t kTopDirMax = 1023;

// The part of `filePath` behind `mountPath` and "/", or null when it lies elsewhere.
const char *SkipMountPath(const char *mountPath, const char *filePath) {
    const size_t length = strlen(mountPath);
    if (strncmp(filePath, mountPath, length) != 0 || filePath[length] != '/') {
        return nullptr;
    }
    return filePath + length + 1;
}

// The first word of `text`, or null when there is none or it is too long to be recorded whole.
char *CopyFirstWord(const char *text) {
    const char *start = text + strspn(text, kWhiteSpace);
    const size_t length = strcspn(start, kWhiteSpace);
    if (length == 0 || length > kRelativePathMax) {
        return nullptr;
    }
    return strndup(start, length);
}
} // namespace

char *FileGetRelativePathByMountPath(const char *mountPath, const char *filePath) {
    const char *rest = SkipMountPath(mountPath, filePath);
    char *relativePath = rest == nullptr ? nullptr : CopyFirstWord(rest);
    if (relativePath == nullptr) {
        LogError("Failed to Get relative path (Volume path=%s File path=%s", mountPath, filePath);
        return nullptr;
    }
    LogVerbose("Get relative path = %s (addr=%p)", relativePath, static_cast<void *>(relativePath));
    return relativePath;
}

char *FileGetRelativePath(const char *uuid, const char *filePath) {
    const MallocText referencePath(SpaceGetReferencePath(uuid));
    if (!referencePath) {
        LogError("Can't get space's reference path. UUID = %s", uuid);
        return nullptr;
    }
    return FileGetRelativePathByMountPath(referencePath.get(), filePath);
}

int FileGetTopDir(const char *path, char *out, size_t outSize) {
    if (path == nullptr || out == nullptr || outSize == 0) {
        LogError("Incorrect parameter");
        return -1;
    }
    const size_t length = path[0] == '/' ? strcspn(path + 1, "/") : 0;
    if (length == 0 || length > kTopDirMax) {
        LogError("Get top directory of file (%s) error\n", path);
        return -1;
    }
    snprintf(out, outSize, "/%.*s", static_cast<int>(length), path + 1);
    return 0;
}
} // namespace vesk
