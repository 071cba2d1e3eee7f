#include "flash_cache/cache_config.h"

#include <json/json.h>

#include <sys/stat.h>

#include <cerrno>
#include <cstdlib>
#include <fstream>
#include <memory>

namespace vesk {
namespace {
constexpr char kDefaultPath[] = "/etc/veskflashcache.json";
constexpr size_t kMaxBytes = size_t{1024} * 1024;
constexpr int kMaxDepth =
    16; // of nested values: the form needs three, the rest may be ignored members

// The whole text of a file of a configuration's size, which is commonly a few hundred bytes. False:
// unreadable or larger.
bool TextRead(const std::string &path, std::string &text) {
    std::ifstream file(path, std::ios::binary);
    char chunk[4096];
    do {
        file.read(chunk, sizeof chunk);
        text.append(chunk, static_cast<size_t>(file.gcount()));
        if (text.size() > kMaxBytes) {
            return false;
        }
    } while (file);
    // The end of the file is what must have ended it; a read error sets badbit.
    return file.eof() && !file.bad();
}

bool JsonParse(const std::string &text, Json::Value &document) {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    builder["stackLimit"] = kMaxDepth;
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    try {
        return reader->parse(text.data(), text.data() + text.size(), &document, nullptr);
    } catch (const Json::Exception &) {
        return false; // nested too deeply
    }
}

// A member's text. False: absent, no text, or one that does not survive as a C string.
bool TextGet(const Json::Value &object, const char *name, std::string &text) {
    const Json::Value &value = object[name];
    if (!value.isString()) {
        return false;
    }
    text = value.asString();
    return !text.empty() && text.find('\0') == std::string::npos;
}
} // namespace

std::string CacheConfigPath() {
    const char *path = secure_getenv("VESK_FLASHCACHE_CONFIG");
    return path == nullptr || *path == '\0' ? kDefaultPath : path;
}

bool CacheConfigRead(const std::string &path, std::vector<CacheConfigEntry> &entries) {
    entries.clear();
    // Not through the C++ library, which on a 32-bit machine knows no date past 2038.
    struct stat status = {};
    if (stat(path.c_str(), &status) != 0) {
        return errno == ENOENT || errno == ENOTDIR;
    }
    // Opening a FIFO would wait for a writer.
    std::string text;
    Json::Value document;
    if (!S_ISREG(status.st_mode) || !TextRead(path, text) || !JsonParse(text, document) ||
        !document.isObject() || !document["caches"].isArray()) {
        return false;
    }
    std::vector<CacheConfigEntry> caches;
    for (const Json::Value &cache : document["caches"]) {
        CacheConfigEntry entry;
        if (!cache.isObject() || !TextGet(cache, "spaceUuid", entry.spaceUuid) ||
            !TextGet(cache, "ssdPath", entry.ssdPath) ||
            !TextGet(cache, "cachePath", entry.cachePath)) {
            return false;
        }
        caches.push_back(std::move(entry));
    }
    entries.swap(caches);
    return true;
}
} // namespace vesk
