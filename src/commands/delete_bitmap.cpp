#include "commands/commands.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "files/path.h"
#include "space/space.h"

#include <unistd.h>

namespace vesk {
int DeleteBitmap(const char *mountPath) {
    const MallocText bitmapPath(BitmapGetPathByReferencePath(mountPath));
    if (!bitmapPath) {
        LogError("Can't get bitmap path");
        return -1;
    }
    if (!PathExists(bitmapPath.get(), LastLink::Itself)) {
        LogVerbose("bitmap (%s) doesn't exist", bitmapPath.get());
        return 0;
    }
    if (unlink(bitmapPath.get()) < 0) {
        LogError("Can't delete bitmap (%s)", bitmapPath.get());
        return -1;
    }
    return 0;
}
} // namespace vesk
