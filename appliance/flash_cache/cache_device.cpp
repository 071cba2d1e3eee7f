#include "flash_cache/cache_device.h"

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdint>

namespace {

// The driver writes whether all blocks are unpinned into a 32-bit int. A driver without the pin
// interface does not know the request.
constexpr unsigned long kQueryAllUnpinned = 0x8004FED2;

struct OpenDevice {
    explicit OpenDevice(const std::string &path)
        : fd(open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC)) {}
    OpenDevice(const OpenDevice &) = delete;
    OpenDevice &operator=(const OpenDevice &) = delete;
    ~OpenDevice() {
        if (fd >= 0) {
            close(fd);
        }
    }
    const int fd; // negative: not open
};

} // namespace

CacheDeviceState CacheDeviceAsk(const std::string &devicePath) {
    CacheDeviceState state;
    const OpenDevice device(devicePath);
    struct stat status = {};
    if (device.fd < 0 || fstat(device.fd, &status) != 0 ||
        !(S_ISBLK(status.st_mode) || S_ISREG(status.st_mode))) {
        return state;
    }
    state.isUp = true;
    int32_t allUnpinned = 0;
    state.supportsPin = ioctl(device.fd, kQueryAllUnpinned, &allUnpinned) >= 0;
    return state;
}
