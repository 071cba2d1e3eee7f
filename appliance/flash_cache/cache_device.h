// What a cache device tells about itself.
//
// Thread rule: no state.
#ifndef VESK_FLASH_CACHE_CACHE_DEVICE_H
#define VESK_FLASH_CACHE_CACHE_DEVICE_H

#include <string>

struct CacheDeviceState {
    bool isUp = false;        // the device is there and opens
    bool supportsPin = false; // its driver has the pin interface
};

// Opens the device for a moment and asks its driver. Anything but a block device or a regular file
// (an emulated device) is no cache device and counts as not up.
CacheDeviceState CacheDeviceAsk(const std::string &devicePath);

#endif
