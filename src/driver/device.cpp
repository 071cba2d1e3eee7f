#include "driver/device.h"

#include "base/scoped_fd.h"

#include <fcntl.h>
#include <linux/fs.h>
#include <sys/ioctl.h>

namespace vesk {
// The request number carries the size of size_t, not of the 64-bit count that the kernel writes.
static_assert(sizeof(void *) != 4 || BLKGETSIZE64 == 0x80041272, "request of the 32-bit target");

int DeviceGetSizeByte(const char *path, uint64_t *sizeBytes) {
    const ScopedFd device(open(path, O_RDONLY | O_CLOEXEC));
    if (!device.IsOpen()) {
        LogError("Can't open device (%s)", path);
        return -1;
    }
    if (ioctl(device.Get(), BLKGETSIZE64, sizeBytes) < 0) {
        LogError("Can't get size of device (%s)", path);
        return -1;
    }
    return 0;
}

int DoIoctl(const char *devicePath, unsigned request, void *data, int size) {
    LogTraceScope();
    const ScopedFd device(open(devicePath, O_RDWR | O_CLOEXEC));
    if (!device.IsOpen()) {
        LogError("Open device path (%s) error\n", devicePath);
        return -1;
    }
    const int result =
        data != nullptr ? ioctl(device.Get(), request, data) : ioctl(device.Get(), request);
    if (result < 0) {
        LogError("Ioctl Error: Send ioctl %d Data (%p) size (%d) to %s, ret=%d\n",
                 static_cast<int>(request), data, size, devicePath, result);
        return -1;
    }
    return 0;
}

int DoIoctlOrSay(const char *failure, const char *devicePath, unsigned request, void *data,
                 int size, const LogPlace &place) {
    const int result = DoIoctl(devicePath, request, data, size);
    if (result < 0) {
        LogErrorAt(place, "%s", failure);
    }
    return result;
}
} // namespace vesk
