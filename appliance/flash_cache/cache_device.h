// What a cache device tells about itself.
//
// Thread rule: no state.
#pragma once

#include <string>

namespace vesk {
struct CacheDeviceState {
    bool isUp = false;        // the device is there and opens
    bool supportsPin = false; // its driver has the pin interface
};

// Opens the device for a moment and asks its driver. Anything but a block device or a regular file
// (an emulated device) is no cache device and counts as not up.
CacheDeviceState CacheDeviceAsk(const std::string &devicePath);
} // namespace vesk
