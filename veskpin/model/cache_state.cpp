#include "model/cache_state.h"

#include "base/scoped_fd.h"
#include "json/json_text.h"

#include <fcntl.h>
#include <sys/stat.h>

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

int FileReadAll(const std::string &path, size_t maxBytes, std::string *content) {
    const ScopedFd file(open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
    struct stat status {};
    if (!file.IsOpen() || fstat(file.Get(), &status) != 0) {
        return errno;
    }
    if (!S_ISREG(status.st_mode)) {
        return EINVAL;
    }
    char chunk[65536];
    content->clear();
    for (;;) {
        const ssize_t count = read(file.Get(), chunk, sizeof(chunk));
        if (count == 0) {
            return 0;
        }
        if (count < 0) {
            return errno;
        }
        content->append(chunk, static_cast<size_t>(count));
        if (content->size() > maxBytes) {
            return EFBIG;
        }
    }
}

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
