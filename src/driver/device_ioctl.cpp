#include "driver/device_ioctl.h"

#include "base/scoped_fd.h"

#include <fcntl.h>
#include <sys/ioctl.h>

namespace vesk {

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
        LogWrite(LogClass::Error, place, "%s", failure);
    }
    return result;
}

} // namespace vesk
