#include "tests/support/fake_appliance.h"

#include "vesk/flash_cache.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace vesk {
std::vector<FakeSpace> FakeAppliance::spaces;
std::vector<FakeCache> FakeAppliance::caches;
int FakeAppliance::enumResult = 0;
int FakeAppliance::configResult = 1;
std::function<void()> FakeAppliance::onConfigLookup;
int FakeAppliance::enumScope = 0;
int FakeAppliance::devicePathResult = 0;
std::string FakeAppliance::devicePath = "/dev/space1";
std::string FakeAppliance::askedPath;
bool FakeAppliance::createFails = false;
std::function<int(const std::string &, uint64_t, int, FileMappingTable &)> FakeAppliance::onLookup;
int FakeAppliance::lookups = 0;
int FakeAppliance::liveSpaceLists = 0;
int FakeAppliance::liveConfigs = 0;
int FakeAppliance::liveStats = 0;
int FakeAppliance::liveDevices = 0;

void FakeAppliance::Reset() {
    spaces.clear();
    caches.clear();
    enumResult = 0;
    configResult = 1;
    onConfigLookup = nullptr;
    enumScope = 0;
    devicePathResult = 0;
    devicePath = "/dev/space1";
    askedPath.clear();
    createFails = false;
    onLookup = nullptr;
    lookups = 0;
    liveSpaceLists = liveConfigs = liveStats = liveDevices = 0;
}

void FakeApplianceOneVolume(const std::string &cachePath, const std::string &mountPath) {
    FakeAppliance::Reset();
    FakeAppliance::spaces = {{"/dev/space1", mountPath, "uuid-1"}};
    FakeAppliance::caches = {{"uuid-1", "/dev/ssd1", cachePath}};
}

FileMappingEntry FakeExtent(uint64_t fileStart, uint64_t count, uint64_t deviceStart,
                            uint32_t flag) {
    FileMappingEntry entry{};
    entry.fileStartSector = fileStart;
    entry.numSectors = count;
    entry.deviceStartSector = deviceStart;
    entry.flag = flag;
    return entry;
}

namespace {
const FakeCache *FindBySsd(const char *ssdPath) {
    const auto &caches = FakeAppliance::caches;
    const auto found =
        std::find_if(caches.begin(), caches.end(),
                     [ssdPath](const FakeCache &cache) { return cache.ssdPath == ssdPath; });
    return found == caches.end() ? nullptr : &*found;
}

class ScriptedDevice : public FileSystemDevice {
public:
    ScriptedDevice() { ++FakeAppliance::liveDevices; }
    ~ScriptedDevice() override { --FakeAppliance::liveDevices; }
    int GetMappingByInode(const std::string &directory, uint64_t inode,
                          FileMappingTable &table) override {
        table.entries.clear();
        const int attempt = FakeAppliance::lookups++;
        return FakeAppliance::onLookup ? FakeAppliance::onLookup(directory, inode, attempt, table)
                                       : -1;
    }
};
} // namespace
} // namespace vesk

using namespace vesk;

FileMappingTable::~FileMappingTable() = default;
FileSystemDevice::~FileSystemDevice() = default;
int FileSystemDevice::Reserved() {
    return 0;
}

int FileSystemDevice::GetDevicePath(const std::string &filePath, std::string &devicePath,
                                    bool reserved) {
    FakeAppliance::askedPath = filePath;
    if (FakeAppliance::devicePathResult == 0 && !reserved) {
        devicePath = FakeAppliance::devicePath;
    }
    return FakeAppliance::devicePathResult;
}

FileSystemDevice *FileSystemDeviceCreater::Create(const std::string & /*devicePath*/) {
    return FakeAppliance::createFails ? nullptr : new ScriptedDevice;
}

extern "C" {

int VESKSpaceInfoEnum(int scope, VESKSpaceInfo **list) {
    FakeAppliance::enumScope = scope;
    *list = nullptr;
    for (auto space = FakeAppliance::spaces.rbegin(); space != FakeAppliance::spaces.rend();
         ++space) {
        auto *record = new VESKSpaceInfo{};
        snprintf(record->devicePath, sizeof(record->devicePath), "%s", space->devicePath.c_str());
        snprintf(record->referencePath, sizeof(record->referencePath), "%s",
                 space->referencePath.c_str());
        record->next = *list;
        *list = record;
    }
    if (*list != nullptr) {
        ++FakeAppliance::liveSpaceLists;
    }
    return FakeAppliance::enumResult;
}

void VESKSpaceInfoFree(VESKSpaceInfo *list) {
    if (list != nullptr) {
        --FakeAppliance::liveSpaceLists;
    }
    while (list != nullptr) {
        VESKSpaceInfo *next = list->next;
        delete list;
        list = next;
    }
}

char *VESKSpaceUUIDGet(const VESKSpaceInfo *space) {
    for (const FakeSpace &known : FakeAppliance::spaces) {
        if (known.devicePath == space->devicePath && known.referencePath == space->referencePath) {
            return known.uuid.empty() ? nullptr : strdup(known.uuid.c_str());
        }
    }
    return nullptr;
}

int VESKFlashCacheConfigTmpGet(const VESKFlashCacheConfigQuery *query,
                               VESKFlashCacheConfig **config) {
    if (FakeAppliance::onConfigLookup) {
        FakeAppliance::onConfigLookup();
    }
    const VESKFlashCacheConfigQuery expected{2, 0, 0, query->spaceUuid, 0, 0};
    if (FakeAppliance::configResult == -1 || query->kind != expected.kind ||
        query->reserved1 != 0 || query->reserved2 != 0 || query->reserved4 != 0 ||
        query->reserved5 != 0) {
        return -1;
    }
    for (const FakeCache &cache : FakeAppliance::caches) {
        if (cache.spaceUuid == query->spaceUuid) {
            *config = new VESKFlashCacheConfig{0, cache.noSsdPath ? nullptr
                                                                  : strdup(cache.ssdPath.c_str())};
            ++FakeAppliance::liveConfigs;
            return FakeAppliance::configResult;
        }
    }
    return 0;
}

void VESKFlashCacheConfigFree(VESKFlashCacheConfig *config) {
    --FakeAppliance::liveConfigs;
    free(config->ssdPath);
    delete config;
}

int VESKFlashCacheStatGet(const VESKFlashCacheStatQuery *query, VESKFlashCacheStat **stat) {
    const FakeCache *cache = query->kind == 3 ? FindBySsd(query->ssdPath) : nullptr;
    if (cache == nullptr) {
        return -1;
    }
    *stat = new VESKFlashCacheStat{};
    (*stat)->state = cache->state;
    (*stat)->supportPin = cache->supportPin;
    ++FakeAppliance::liveStats;
    return cache->statResult;
}

void VESKFlashCacheStatFree(VESKFlashCacheStat **stat) {
    --FakeAppliance::liveStats;
    delete *stat;
    *stat = nullptr;
}

int VESKFlashcacheGetCachePath(const char *ssdPath, char *buffer, size_t size) {
    const FakeCache *cache = FindBySsd(ssdPath);
    if (cache == nullptr) {
        return 0;
    }
    snprintf(buffer, size, "%s", cache->cachePath.c_str());
    return cache->cachePathResult;
}
}
