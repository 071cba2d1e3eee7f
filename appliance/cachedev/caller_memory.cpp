#include "cachedev/caller_memory.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <sys/uio.h>

namespace vesk {
namespace {
using TransferCall = ssize_t (*)(pid_t, const struct iovec *, unsigned long, const struct iovec *,
                                 unsigned long, unsigned long);

// One call moves at most about 2 GiB and may stop early, at a page that is not there.
int Transfer(TransferCall call, const Caller &caller, uint64_t address, void *buffer, size_t size) {
    if (caller.pid <= 0) {
        return -EFAULT;
    }
    // The address has lost its upper half on the way here; the lower half is somewhere else.
    if (!caller.is32bit && sizeof(void *) == 4) {
        return -EOVERFLOW;
    }
    constexpr size_t kMostBytes = 1U << 30U;
    for (size_t done = 0; done < size;) {
        const uint64_t remoteAddress = address + done;
        if (remoteAddress < address || remoteAddress > UINTPTR_MAX) {
            return -EFAULT;
        }
        const size_t step = std::min(size - done, kMostBytes);
        const struct iovec local = {static_cast<char *>(buffer) + done, step};
        // A pointer of another process: never dereferenced here.
        // NOLINTNEXTLINE(performance-no-int-to-ptr)
        void *const there = reinterpret_cast<void *>(static_cast<uintptr_t>(remoteAddress));
        const struct iovec remote = {there, step};
        const ssize_t moved = call(caller.pid, &local, 1, &remote, 1, 0);
        if (moved <= 0) {
            return -EFAULT;
        }
        done += static_cast<size_t>(moved);
    }
    return 0;
}
} // namespace

int CallerRead(const Caller &caller, uint64_t address, void *buffer, size_t size) {
    return Transfer(process_vm_readv, caller, address, buffer, size);
}

int CallerWrite(const Caller &caller, uint64_t address, const void *buffer, size_t size) {
    return Transfer(process_vm_writev, caller, address, const_cast<void *>(buffer), size);
}

size_t DescriptorBytes(bool is32bit) {
    return is32bit ? kDescriptorBytes32 : kDescriptorBytes64;
}

BitmapDescriptor DescriptorDecode(const unsigned char *bytes, bool is32bit) {
    BitmapDescriptor descriptor = {};
    if (is32bit) {
        uint32_t address = 0;
        memcpy(&address, bytes, sizeof address);
        memcpy(&descriptor.length, bytes + 4, sizeof descriptor.length);
        descriptor.address = address;
    } else {
        memcpy(&descriptor.address, bytes, sizeof descriptor.address);
        memcpy(&descriptor.length, bytes + 8, sizeof descriptor.length);
    }
    return descriptor;
}
} // namespace vesk
