// The appliance's libraries as a test scripts them: spaces, caches and extents are plain records.
//
// The test program defines the libraries' functions itself, so that they answer in place of the
// shared libraries. Reset() in SetUp; every field is then as declared here.
#pragma once

#include "vesk/storage_core.h"

#include <functional>
#include <string>
#include <vector>

namespace vesk {
struct FakeSpace {
    std::string devicePath;
    std::string referencePath; // empty: missing
    std::string uuid;          // empty: cannot be read
};

struct FakeCache {
    std::string spaceUuid;
    std::string ssdPath;
    std::string cachePath;
    int state = 1;
    int supportPin = 1;
    int statResult = 1;      // of VESKFlashCacheStatGet
    int cachePathResult = 1; // of VESKFlashcacheGetCachePath
    bool noSsdPath = false;  // the configuration has none
};

struct FakeAppliance {
    static void Reset();

    static std::vector<FakeSpace> spaces;
    static std::vector<FakeCache> caches;
    static int enumResult;   // negative: enumeration fails (the list is handed out all the same)
    static int configResult; // of VESKFlashCacheConfigTmpGet when a cache is found; -1: error
    static int enumScope;    // what the last enumeration was asked for

    // Called before a cache configuration is looked up.
    static std::function<void()> onConfigLookup;

    static int devicePathResult;   // of FileSystemDevice::GetDevicePath
    static std::string devicePath; // what it gives
    static std::string askedPath;  // what it was last asked for
    static bool createFails;       // FileSystemDeviceCreater::Create gives null

    // The extent lookup: called with directory, inode and the number of the try (0: first).
    static std::function<int(const std::string &, uint64_t, int, FileMappingTable &)> onLookup;
    static int lookups;

    // What is handed out and not yet given back; 0 when everything was freed.
    static int liveSpaceLists, liveConfigs, liveStats, liveDevices;
};

// One volume /volume1 on /dev/space1 with UUID uuid-1, SSD /dev/ssd1 and this cache device.
void FakeApplianceOneVolume(const std::string &cachePath,
                            const std::string &mountPath = "/volume1");

// An extent; sectors.
FileMappingEntry FakeExtent(uint64_t fileStart, uint64_t count, uint64_t deviceStart,
                            uint32_t flag = 0);
} // namespace vesk
