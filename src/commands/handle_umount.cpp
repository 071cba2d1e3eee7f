#include "commands/commands.h"

#include "base/log.h"
#include "space/space_cache.h"

namespace vesk {
int HandleSpaceUmount(const char *mountPath) {
    if (!SpaceHasCacheAndSupportPin(mountPath)) {
        LogNotice("Space (%s) doesn't support pin", mountPath);
    }
    return 0;
}
} // namespace vesk
