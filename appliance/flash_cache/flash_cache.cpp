#include "vesk/flash_cache.h"

#include "base/deleter.h"
#include "flash_cache/cache_config.h"
#include "flash_cache/cache_device.h"

#include <cstdlib>
#include <cstring>
#include <exception>
#include <memory>

namespace vesk {
namespace {
constexpr int32_t kConfigBySpaceUuid = 2;
constexpr int32_t kStatBySsdPath = 3;

using ConfigPtr = std::unique_ptr<VESKFlashCacheConfig, Deleter<VESKFlashCacheConfigFree>>;

template <typename Record> Record *RecordAllocate() {
    return static_cast<Record *>(std::calloc(1, sizeof(Record)));
}

enum class Lookup { Found, NotFound, Failed };

// Finds the first cache whose `field` has this text.
Lookup CacheFind(std::string CacheConfigEntry::*field, const char *text, CacheConfigEntry &cache) {
    std::vector<CacheConfigEntry> caches;
    if (!CacheConfigRead(CacheConfigPath(), caches)) {
        return Lookup::Failed;
    }
    for (CacheConfigEntry &candidate : caches) {
        if (candidate.*field == text) {
            cache = std::move(candidate);
            return Lookup::Found;
        }
    }
    return Lookup::NotFound;
}

int ConfigGet(const char *spaceUuid, VESKFlashCacheConfig *&config) {
    CacheConfigEntry cache;
    const Lookup lookup = CacheFind(&CacheConfigEntry::spaceUuid, spaceUuid, cache);
    if (lookup != Lookup::Found) {
        return lookup == Lookup::NotFound ? 0 : -1;
    }
    ConfigPtr found(RecordAllocate<VESKFlashCacheConfig>());
    if (found == nullptr || (found->ssdPath = strdup(cache.ssdPath.c_str())) == nullptr) {
        return -1;
    }
    config = found.release();
    return 1;
}

int StatGet(const char *ssdPath, VESKFlashCacheStat *&stat) {
    CacheConfigEntry cache;
    const Lookup lookup = CacheFind(&CacheConfigEntry::ssdPath, ssdPath, cache);
    if (lookup != Lookup::Found) {
        return lookup == Lookup::NotFound ? 0 : -1;
    }
    const CacheDeviceState state = CacheDeviceAsk(cache.cachePath);
    VESKFlashCacheStat *found = RecordAllocate<VESKFlashCacheStat>();
    if (found == nullptr) {
        return -1;
    }
    found->state = state.isUp ? 1 : 0;
    found->supportPin = state.supportsPin ? 1 : 0;
    stat = found;
    return 1;
}

// What `get` finds for the query's `key`; -1 for a query that makes no sense. The record is null
// where nothing is found.
template <typename Query, typename Record>
int Answer(const Query *query, int32_t kind, const char *Query::*key, Record **record,
           int (*get)(const char *key, Record *&record)) {
    if (record == nullptr) {
        return -1;
    }
    *record = nullptr;
    if (query == nullptr || query->kind != kind || query->*key == nullptr) {
        return -1;
    }
    try {
        return get(query->*key, *record);
    } catch (const std::exception &) {
        return -1;
    }
}

int CachePathGet(const char *ssdPath, char *buffer, size_t size) {
    CacheConfigEntry cache;
    if (CacheFind(&CacheConfigEntry::ssdPath, ssdPath, cache) != Lookup::Found ||
        cache.cachePath.size() >= size) {
        return 0;
    }
    std::memcpy(buffer, cache.cachePath.c_str(), cache.cachePath.size() + 1);
    return 1;
}
} // namespace

extern "C" int VESKFlashCacheConfigTmpGet(const VESKFlashCacheConfigQuery *query,
                                          VESKFlashCacheConfig **config) {
    return Answer(query, kConfigBySpaceUuid, &VESKFlashCacheConfigQuery::spaceUuid, config,
                  ConfigGet);
}

extern "C" void VESKFlashCacheConfigFree(VESKFlashCacheConfig *config) {
    if (config != nullptr) {
        std::free(config->ssdPath);
        std::free(config);
    }
}

extern "C" int VESKFlashCacheStatGet(const VESKFlashCacheStatQuery *query,
                                     VESKFlashCacheStat **stat) {
    return Answer(query, kStatBySsdPath, &VESKFlashCacheStatQuery::ssdPath, stat, StatGet);
}

extern "C" void VESKFlashCacheStatFree(VESKFlashCacheStat **stat) {
    if (stat != nullptr) {
        std::free(*stat);
        *stat = nullptr;
    }
}

extern "C" int VESKFlashcacheGetCachePath(const char *ssdPath, char *buffer, size_t size) {
    if (ssdPath == nullptr || buffer == nullptr) {
        return 0;
    }
    try {
        return CachePathGet(ssdPath, buffer, size);
    } catch (const std::exception &) {
        return 0;
    }
}
} // namespace vesk
