#include "model/cache_state.h"

#include "files/file_whole.h"
#include "json/json_text.h"

#include <cerrno>
#include <cstring>

namespace vesk {
namespace {
const size_t kStateMaxBytes = size_t{64} << 20; // of either file: a device of 32 TiB needs 64 MiB

std::optional<std::string> ReadIfTold(const std::string &path, LookErrors *errors) {
    std::string content;
    const int error = FileReadAll(path, kStateMaxBytes, &content);
    if (error == 0) {
        return content;
    }
    if (error != ENOENT && error != ENOTDIR) {
        LookErrorAdd(errors, path, strerror(error));
    }
    return std::nullopt;
}
} // namespace

CacheState CacheStateRead(const std::string &cacheDevice, LookErrors *errors) {
    CacheState state;
    if (const auto text = ReadIfTold(cacheDevice + ".json", errors)) {
        const auto numbers = JsonReadNumbers(*text);
        const auto find = [&](const char *name) -> std::optional<uint64_t> {
            const auto found = numbers->find(name);
            return found == numbers->end() ? std::nullopt : std::optional(found->second);
        };
        if (numbers) {
            state.ssdBlocks = find("slots");
            state.blocksHeld = find("pinnedBlocks");
        } else {
            LookErrorAdd(errors, cacheDevice + ".json", "not the state of a cache device");
        }
    }
    if (const auto bits = ReadIfTold(cacheDevice + ".cached", errors)) {
        state.residentSet = BlockSet(bits->begin(), bits->end());
    }
    return state;
}
} // namespace vesk
