// The cache configuration: which SSD caches which space, and where the cache device is.
//
// A JSON file of the form
//   {"caches": [{"spaceUuid": "...", "ssdPath": "...", "cachePath": "..."}, ...]}
// Further members are ignored.
//
// Thread rule: no state; the functions are independent of each other.
#pragma once

#include <string>
#include <vector>

namespace vesk {
// One cache. No text is empty or holds a NUL.
struct CacheConfigEntry {
    std::string spaceUuid; // UUID of the space's filesystem
    std::string ssdPath;   // path of the cache's SSD device
    std::string cachePath; // path of the cache device
};

// The configuration file's path: the environment variable VESK_FLASHCACHE_CONFIG, which a program
// with raised privileges does not follow, or /etc/veskflashcache.json.
std::string CacheConfigPath();

// Reads the configuration, in file order. A missing file is a configuration without caches. False:
// the file cannot be read, is larger than a configuration can be (1 MiB), is no JSON or has another
// form; `entries` is then empty.
bool CacheConfigRead(const std::string &path, std::vector<CacheConfigEntry> &entries);
} // namespace vesk
