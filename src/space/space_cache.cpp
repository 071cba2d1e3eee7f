#include "space/space_cache.h"

#include "base/deleter.h"

#include "vesk/flash_cache.h"

#include <cstring>
#include <memory>

namespace vesk {
namespace {
const int kConfigBySpaceUuid = 2;
const int kStatBySsdPath = 3;

using CacheConfig = std::unique_ptr<VESKFlashCacheConfig, Deleter<VESKFlashCacheConfigFree>>;

// Its function takes a pointer to the pointer.
struct StatDeleter {
    void operator()(VESKFlashCacheStat *stat) const { VESKFlashCacheStatFree(&stat); }
};
using CacheStat = std::unique_ptr<VESKFlashCacheStat, StatDeleter>;
} // namespace

VESKFlashCacheConfig *SpaceGetCacheConfig(const char *uuid, SpaceCause *cause) {
    VESKFlashCacheConfigQuery query{};
    query.kind = kConfigBySpaceUuid;
    query.spaceUuid = uuid;
    VESKFlashCacheConfig *config = nullptr;
    const int result = VESKFlashCacheConfigTmpGet(&query, &config);
    if (result == 0) {
        LogVerbose("Can't find cache in the config file. Space UUID is (%s)", uuid);
    } else if (result == -1) {
        LogError("Fail to get SSD cache config");
    }
    const SpaceCause missing = result == -1 ? SpaceCause::NoCacheConfig : SpaceCause::NoCache;
    SpaceTell(cause, config != nullptr ? SpaceCause::Found : missing);
    return config;
}

int SpaceHasCache(const char *uuid, SpaceCause *cause) {
    const CacheConfig config(SpaceGetCacheConfig(uuid, cause));
    if (!config) {
        LogVerbose("Space (%s) doesn't be found in the config", uuid);
        return 0;
    }
    // The number in this message has always been 0, and log readers know it so.
    LogVerbose("Check Space (%s) ret=%d", uuid, 0);
    return 1;
}

char *SpaceGetCacheSsdPath(const char *uuid, SpaceCause *cause) {
    const CacheConfig config(SpaceGetCacheConfig(uuid, cause));
    if (!config) {
        return nullptr;
    }
    if (config->ssdPath == nullptr) {
        SpaceTell(cause, SpaceCause::NoSsdPath);
        return nullptr;
    }
    return strdup(config->ssdPath);
}

char *SpaceGetCachePath(const char *uuid, SpaceCause *cause) {
    MallocText ssdPath;
    if (!SpaceTake(SpaceGetCacheSsdPath(uuid, cause), &ssdPath, "Can't get cache's ssd path",
                   LogHere())) {
        return nullptr;
    }
    char cachePath[512] = {};
    if (VESKFlashcacheGetCachePath(ssdPath.get(), cachePath, sizeof(cachePath)) != 1) {
        LogError("Can't get cache path");
        SpaceTell(cause, SpaceCause::NoCachePath);
        return nullptr;
    }
    return strndup(cachePath, sizeof(cachePath) - 1);
}

char *SpaceGetCachePathByMountPath(const char *mountPath, SpaceCause *cause) {
    const MallocText uuid(SpaceGetUUID(mountPath, cause));
    if (!uuid) {
        LogError("Can't get space uuid from reference path (%s)", mountPath);
        return nullptr;
    }
    MallocText cachePath;
    SpaceTake(SpaceGetCachePath(uuid.get(), cause), &cachePath, "Can't get cache path", LogHere());
    return cachePath.release();
}

int SpaceHasCacheAndSupportPin(const char *mountPath, SpaceCause *cause) {
    const MallocText uuid(SpaceGetUUID(mountPath, cause));
    if (!uuid) {
        LogError("Can't get space uuid from mount path (%s)", mountPath);
        return 0;
    }
    const int supportPin = SpaceHasCacheAndSupportPinByUUID(uuid.get(), cause);
    if (supportPin == 1) {
        LogVerbose("Volume (%s) support pin", mountPath);
    }
    return supportPin;
}

int SpaceHasCacheAndSupportPinByUUID(const char *uuid, SpaceCause *cause) {
    if (!SpaceHasCache(uuid, cause)) {
        LogVerbose("Space (UUID = %s) doesn't has cache", uuid);
        return 0;
    }
    MallocText ssdPath;
    if (!SpaceTake(SpaceGetCacheSsdPath(uuid, cause), &ssdPath, "Can't get cache's ssd path",
                   LogHere())) {
        return 0;
    }
    VESKFlashCacheStatQuery query{};
    query.kind = kStatBySsdPath;
    query.ssdPath = ssdPath.get();
    VESKFlashCacheStat *answer = nullptr;
    const int result = VESKFlashCacheStatGet(&query, &answer);
    const CacheStat stat(answer);
    if (result < 1 || !stat) {
        LogVerbose(
            "Failed to get status of flashcache, ssd = %s. (Might be due to cache is not estabilied yet)",
            ssdPath.get());
        SpaceTell(cause, SpaceCause::NoCacheStatus);
        return 0;
    }
    LogVerbose("supportPin=%d", stat->supportPin);
    const bool isUp = stat->state == 1;
    const bool canPin = isUp && stat->supportPin == 1;
    if (!canPin) {
        SpaceTell(cause, isUp ? SpaceCause::NoPinSupport : SpaceCause::CacheNotUp);
    }
    return canPin ? 1 : 0;
}
} // namespace vesk
