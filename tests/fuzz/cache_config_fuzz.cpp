// A cache configuration of any bytes: refused without caches, or every cache whole.
#include "tests/fuzz/fuzz_input.h"

#include "flash_cache/cache_config.h"

namespace vesk {
extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    static const std::string path = FuzzPath("veskflashcache.json");
    FuzzWrite(path, std::string(reinterpret_cast<const char *>(data), size));
    std::vector<CacheConfigEntry> entries(1);
    const bool good = CacheConfigRead(path, entries);
    FuzzExpect(good || entries.empty(), "a refused configuration has no caches");
    for (const CacheConfigEntry &entry : entries) {
        FuzzExpect(!entry.spaceUuid.empty() && !entry.ssdPath.empty() && !entry.cachePath.empty() &&
                       (entry.spaceUuid + entry.ssdPath + entry.cachePath).find('\0') ==
                           std::string::npos,
                   "a cache's texts are C strings");
    }
    return 0;
}
} // namespace vesk
