// A set of a device's blocks of 64 KiB, as the bits of a bitmap. Thread rule: one owner.
#pragma once

#include "bitmap/bit_runs.h"

#include <cstdint>
#include <vector>

namespace vesk {
using BlockSet = std::vector<unsigned char>; // one bit a block

// An empty set with room for this many blocks.
BlockSet BlockSetOf(uint64_t blocks);

// Adds the run as far as there is room. How many blocks were not in the set before.
uint64_t BlockSetAdd(BlockSet *set, const BitRun &run);

uint64_t BlockSetCount(const BlockSet &set);

// How many blocks of the run, or of the first set, are in the (second) set.
uint64_t BlockSetCountIn(const BlockSet &set, const BitRun &run);
uint64_t BlockSetCountBoth(const BlockSet &a, const BlockSet &b);
} // namespace vesk
