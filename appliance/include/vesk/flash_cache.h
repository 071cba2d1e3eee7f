// The appliance's flash-cache library (libveskflashcache.so): which SSD caches which space, and the
// state of that cache.
//
// The tool is compiled against these declarations only; see storage_core.h. On the 32-bit target
// the queries are six words and two words long.
//
// Thread rule: no function keeps state between calls; calls from several threads are independent.
#ifndef VESK_FLASH_CACHE_H
#define VESK_FLASH_CACHE_H

#include <cstddef>
#include <cstdint>

struct VESKFlashCacheConfigQuery {
    int32_t kind; // 2: look up by space UUID
    int32_t reserved1, reserved2;
    const char *spaceUuid;
    int32_t reserved4, reserved5;
};

struct VESKFlashCacheConfig {
    int32_t reserved0;
    char *ssdPath; // path of the cache's SSD device, owned by the record
};

struct VESKFlashCacheStatQuery {
    int32_t kind; // 3: look up by SSD path
    const char *ssdPath;
};

struct VESKFlashCacheStat {
    int32_t reserved0[2];
    int32_t state; // 1: the cache is up
    int32_t reserved3[19];
    int32_t supportPin; // 1: the cache driver supports pinning
};
static_assert(sizeof(VESKFlashCacheStat) == 23 * sizeof(int32_t),
              "supportPin is the record's 23rd word");

// What the 32-bit target needs: the sizes below are the vendor library's there.
static_assert(sizeof(void *) != 4 || sizeof(VESKFlashCacheConfigQuery) == 24, "six words");
static_assert(sizeof(void *) != 4 || sizeof(VESKFlashCacheStatQuery) == 8, "two words");

extern "C" {

// -1: error; 0: the space has no cache; otherwise `*config` is set, released with
// VESKFlashCacheConfigFree.
int VESKFlashCacheConfigTmpGet(const VESKFlashCacheConfigQuery *query,
                               VESKFlashCacheConfig **config);
void VESKFlashCacheConfigFree(VESKFlashCacheConfig *config);

// 1 or more: `*stat` is set, released with VESKFlashCacheStatFree; less: failure.
int VESKFlashCacheStatGet(const VESKFlashCacheStatQuery *query, VESKFlashCacheStat **stat);
void VESKFlashCacheStatFree(VESKFlashCacheStat **stat);

// Writes the path of the cache device of the cache with this SSD into `buffer` (`size` bytes).
// 1: success; anything else: failure.
int VESKFlashcacheGetCachePath(const char *ssdPath, char *buffer, size_t size);
}

#endif
