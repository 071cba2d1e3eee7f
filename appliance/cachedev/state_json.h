// The state file PATH.json of the cache device: a snapshot as JSON.
#pragma once

#include "cachedev/cache_device.h"

#include <string>
#include <sys/types.h>

namespace vesk {
// The snapshot as one line of JSON with a line feed at its end; `pid` is the daemon's. Pure.
std::string StateJsonText(const CacheSnapshot &snapshot, pid_t pid);

// That of the device at this moment, which this process serves.
std::string StateJsonOf(CacheDevice &device);
} // namespace vesk
