// The files that the cache device shows through FUSE, as callbacks of libfuse's low-level
// interface.
//
// The tree is one folder with two files: the device and, read-only, its state. The low-level
// interface is used because it lets a read answer while the cache slots that hold its data are
// still reserved for it: no copy in between, and nobody overwrites them meanwhile. The callbacks
// run in libfuse's threads, several at once; all they share is the cache device, which is
// thread-safe, and fields that are fixed before the first of them runs. No exception leaves them.
#pragma once

#include "cachedev/cache_device.h"

#include <cstdint>
#include <ctime>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <string>

// FUSE 3.12 introduced the form of the loop configuration that is used here.
#define FUSE_USE_VERSION 312
#include <fuse_lowlevel.h>

// What an open of the state file shows: the state at that moment. Shared with the reads, because a
// file may be closed as soon as the reply of a read is on its way, before its callback is done.
using StateText = std::shared_ptr<const std::string>;

struct OpenStates {
    std::mutex mutex; // guards what follows
    uint64_t lastHandle = 0;
    std::map<uint64_t, StateText> texts; // by file handle, which is above 0
};

struct ServedDevice {
    CacheDevice &device;
    std::string deviceName;        // file name of the device
    std::string stateName;         // file name of the state
    time_t startTime;              // what both files show as their times
    std::function<void()> onReady; // called once, when requests are being served; must not throw
    OpenStates openStates;
};

// The callbacks; to be registered with a ServedDevice as user data, which must outlive the session.
struct fuse_lowlevel_ops CachedevFuseOperations();
