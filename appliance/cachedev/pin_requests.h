// The ioctl requests of the cache device: decoding what the caller passed and carrying it out.
//
// Thread-safe. Nothing that a caller passes - a wild pointer, a bitmap of the wrong length, ranges
// past the end, its own death half-way - does more than refuse that one request.
#pragma once

#include "cachedev/cache_device.h"
#include "cachedev/caller_memory.h"

#include <cstdint>

namespace vesk {
struct PinRequest {
    uint32_t number;   // full request number
    uint64_t argument; // third argument of the ioctl: an address in the caller's memory
    Caller caller;
    void *data; // buffer for the answer, of the size that the number encodes; null when that is 0
};

// Carries out one request. 0 (the answer, if any, is in `data`), or a negative errno with nothing
// changed: -EINVAL for a bitmap of the wrong length or ranges past the device's end, -EFAULT for
// memory of the caller that cannot be reached, -ENOTTY for any other number, and what the fault
// settings order. Counts the request.
int PinRequestHandle(CacheDevice &device, const PinRequest &request);
} // namespace vesk
