// What a cache device tells of itself beside its driver: the emulated one shows its state in
// PATH.json and the blocks that it holds in PATH.cached; others show nothing.
//
// Thread rule: no state.
#pragma once

#include "model/block_set.h"
#include "model/look_errors.h"

#include <cstdint>
#include <optional>
#include <string>

namespace vesk {
struct CacheState {
    std::optional<uint64_t> ssdBlocks;   // how many blocks fit on the SSD
    std::optional<uint64_t> blocksHeld;  // pinned in the driver
    std::optional<BlockSet> residentSet; // on the SSD now
};

// What is not told is absent and no error; what is told and cannot be read is one.
CacheState CacheStateRead(const std::string &cacheDevice, LookErrors *errors);
} // namespace vesk
