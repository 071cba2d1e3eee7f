#include "flash_cache/cache_device.h"

#include "base/scoped_fd.h"

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/stat.h>

#include <cstdint>

namespace vesk {
namespace {
// The driver writes whether all blocks are unpinned into a 32-bit int. A driver without the pin
// interface does not know the request.
constexpr unsigned long kQueryAllUnpinned = 0x8004FED2;
} // namespace

CacheDeviceState CacheDeviceAsk(const std::string &devicePath) {
    CacheDeviceState state;
    const ScopedFd device(open(devicePath.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC));
    struct stat status = {};
    if (!device.IsOpen() || fstat(device.Get(), &status) != 0 ||
        !(S_ISBLK(status.st_mode) || S_ISREG(status.st_mode))) {
        return state;
    }
    state.isUp = true;
    int32_t allUnpinned = 0;
    state.supportsPin = ioctl(device.Get(), kQueryAllUnpinned, &allUnpinned) >= 0;
    return state;
}
} // namespace vesk
