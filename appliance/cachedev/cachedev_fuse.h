// The files that the cache device shows through FUSE, as callbacks of libfuse's low-level
// interface.
//
// The tree is one folder: the device and, read-only, the files that show its state. The low-level
// interface is used because it lets a read answer while the cache slots that hold its data are
// still reserved for it: no copy in between, and nobody overwrites them meanwhile. The callbacks
// run in libfuse's threads, several at once; all they share is the cache device, which is
// thread-safe, and fields that are fixed before the first of them runs. No exception leaves them.
#pragma once

#include "cachedev/cache_device.h"
#include "cachedev/open_states.h"

#include <array>
#include <ctime>
#include <functional>
#include <string>

// FUSE 3.12 introduced the form of the loop configuration that is used here.
#define FUSE_USE_VERSION 312
#include <fuse_lowlevel.h>

namespace vesk {
// A read-only file beside the device; who opens it sees the state of that moment.
struct StateFile {
    std::string name; // file name
    OpenStates openStates;
};

struct ServedDevice {
    CacheDevice &device;
    std::string deviceName; // file name of the device
    std::array<StateFile, 2> stateFiles;
    time_t startTime;              // what all files show as their times
    std::function<void()> onReady; // called once, when requests are being served; must not throw
};

// The callbacks; to be registered with a ServedDevice as user data, which must outlive the session.
struct fuse_lowlevel_ops CachedevFuseOperations();
} // namespace vesk
