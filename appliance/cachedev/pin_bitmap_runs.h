// Reading a pin bitmap: one bit per cache block, least significant bit of byte 0 first.
//
// Pure functions, safe to call from any thread as long as the bytes do not change.
#pragma once

#include "cachedev/block_cache.h"

#include <cstdint>
#include <vector>

// Whether the bit of `block` is set; a block past the bitmap's end has none.
bool PinBitmapTest(const std::vector<uint8_t> &bitmap, uint64_t block);

// The set bits as runs in ascending order, no two of them adjacent.
std::vector<BlockRun> PinBitmapRuns(const std::vector<uint8_t> &bitmap);
