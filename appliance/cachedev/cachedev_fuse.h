// The files that the cache device shows through FUSE, as callbacks of libfuse.
//
// The tree is one folder with two files: the device and, read-only, its state. The callbacks run in
// libfuse's threads, several at once; all they share is the cache device, which is thread-safe, and
// fields that are fixed before the first of them runs. No exception leaves them.
#pragma once

#include "cachedev/cache_device.h"

#include <ctime>
#include <functional>
#include <string>

// FUSE 3.12 introduced the form of the loop configuration that is used here.
#define FUSE_USE_VERSION 312
#include <fuse.h>

struct ServedDevice {
    CacheDevice &device;
    std::string devicePath;        // of the device file, from the mount point: "/cachedev_0"
    std::string statePath;         // of the state file
    time_t startTime;              // what both files show as their times
    std::function<void()> onReady; // called once, when the kernel has begun to send requests
};

// The callbacks; to be registered with a ServedDevice as private data, which must outlive them.
struct fuse_operations CachedevFuseOperations();
