// The flash-cache library as a test scripts it.
#include "vesk/flash_cache.h"
#include "tests/system/scripted/script.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

namespace {
template <typename Record> Record *Allocate() {
    auto *record = static_cast<Record *>(calloc(1, sizeof(Record)));
    if (record == nullptr) {
        abort();
    }
    return record;
}

std::string Words(std::initializer_list<int32_t> words) {
    std::string text;
    for (const int32_t word : words) {
        text += " " + std::to_string(word);
    }
    return text;
}
} // namespace

extern "C" int VESKFlashCacheConfigTmpGet(const VESKFlashCacheConfigQuery *query,
                                          VESKFlashCacheConfig **config) {
    ScriptCall("config" + Words({query->kind, query->reserved1, query->reserved2}) + " " +
               query->spaceUuid + Words({query->reserved4, query->reserved5}));
    const ScriptLine answer = ScriptFirst("config");
    const int result = ScriptNumber(answer, 0, 0);
    if (result > 0) {
        *config = Allocate<VESKFlashCacheConfig>();
        const std::string ssdPath = ScriptText(answer, 1);
        (*config)->ssdPath = ssdPath.empty() ? nullptr : strdup(ssdPath.c_str());
    }
    return result;
}

extern "C" void VESKFlashCacheConfigFree(VESKFlashCacheConfig *config) {
    ScriptCall("config-free");
    if (config != nullptr) {
        free(config->ssdPath);
        free(config);
    }
}

extern "C" int VESKFlashCacheStatGet(const VESKFlashCacheStatQuery *query,
                                     VESKFlashCacheStat **stat) {
    ScriptCall("stat" + Words({query->kind}) + " " + query->ssdPath);
    const ScriptLine answer = ScriptFirst("stat");
    const int result = ScriptNumber(answer, 0, 1);
    if (result >= 1 || ScriptText(answer, 3) == "set") {
        *stat = Allocate<VESKFlashCacheStat>();
        (*stat)->state = ScriptNumber(answer, 1, 1);
        (*stat)->supportPin = ScriptNumber(answer, 2, 1);
    }
    return result;
}

extern "C" void VESKFlashCacheStatFree(VESKFlashCacheStat **stat) {
    ScriptCall("stat-free");
    free(*stat);
    *stat = nullptr;
}

extern "C" int VESKFlashcacheGetCachePath(const char *ssdPath, char *buffer, size_t size) {
    ScriptCall("cache " + std::string(ssdPath) + " " + std::to_string(size));
    const ScriptLine answer = ScriptFirst("cache");
    snprintf(buffer, size, "%s", ScriptText(answer, 1).c_str());
    return ScriptNumber(answer, 0, 0);
}
