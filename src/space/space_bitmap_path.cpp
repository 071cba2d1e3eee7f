#include "space/space_bitmap_path.h"

#include "space/space.h"

#include <cstdio>
#include <cstring>

namespace vesk {

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

} // namespace vesk
