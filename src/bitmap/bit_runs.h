// Runs of set bits in a bitmap's bytes: bit b is bit (b mod 8) of byte (b div 8), bit 0 the least
// significant.
//
// Pure: no log, no I/O, nothing of the pin bitmap but its bytes, so that other programs can share
// it.
//
// Thread rule: no state; the bytes must not change meanwhile.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace vesk {
struct BitRun {
    uint64_t first; // number of the first bit
    uint64_t count; // bits
};

// A walk over the bits, from the first on: {bytes, size} begins one.
struct BitScan {
    const unsigned char *bytes;
    size_t size;       // bytes
    uint64_t next = 0; // first bit that was not looked at
    BitRun open{0, 0}; // the set bits right before it
};

// Looks at the next stretch of equal bits, at most 4096 bytes of them, so that the caller can do
// something else now and then. `run` becomes the run whose end was seen by that, or one of no bits.
// False: nothing was left to look at; a run up to the last bit is given then.
bool BitScanStep(BitScan &scan, BitRun &run);

// All runs in ascending order, no two of them adjacent.
std::vector<BitRun> BitRunsOf(const unsigned char *bytes, size_t size);

// How many bits of the run are set; those past the end are not.
uint64_t BitCountIn(const unsigned char *bytes, size_t size, const BitRun &run);

// A bit past the end is not set.
bool BitIsSet(const unsigned char *bytes, size_t size, uint64_t bit);
} // namespace vesk
