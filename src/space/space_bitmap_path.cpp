#include "space/space_bitmap_path.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "space/space.h"

#include <cstdio>
#include <cstring>

char *SpaceGetBitmapPath(const char *uuid) {
    const MallocText referencePath(SpaceGetReferencePath(uuid));
    if (!referencePath) {
        LogError("Can't get reference path");
        return nullptr;
    }
    char *bitmapPath = BitmapGetPathByReferencePath(referencePath.get());
    if (bitmapPath == nullptr) {
        LogError("Can't get bitmap path");
    }
    return bitmapPath;
}

char *BitmapGetPathByReferencePath(const char *referencePath) {
    char path[512];
    const int length =
        snprintf(path, sizeof(path), "%s/%s", referencePath, "veskcachepinfile.bitmap");
    return length < 0 ? nullptr : strdup(path);
}
