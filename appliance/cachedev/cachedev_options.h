// The command line of veskcachedev. Parsing uses getopt_long: one thread at a time.
#pragma once

#include "cachedev/cache_device.h"

#include <string>

namespace vesk {
struct CachedevOptions {
    std::string folder;      // absolute path of the folder that becomes the mount point
    std::string deviceName;  // file name of the device in it
    std::string backingPath; // as given
    std::string ssdPath;     // as given
    std::string pidFile;     // absolute; empty: none
    CacheSettings settings;
    bool foreground = false;
    bool help = false; // print the usage and do nothing else
};

// Fills `options` from the arguments of main. False: `error` is a message for the user. With --help
// nothing else is checked.
bool CachedevOptionsParse(int argc, char *const *argv, CachedevOptions &options,
                          std::string &error);

// The usage text.
const char *CachedevUsage();
} // namespace vesk
