// A run: consecutive blocks of a request whose slots are held in use together.
//
// Reads and writes are worked off in runs, so that a run's bytes move with as few system calls as
// its slots allow. These functions are the only ones through which reads and writes reach the
// book-keeping of a CacheDevice: each takes its stateMutex for a moment and does no I/O. The caller
// holds the blocks in CacheDevice::blocksInWork. Thread-safe.
#pragma once

#include "cachedev/cache_device.h"

#include <array>
#include <cstddef>
#include <cstdint>

namespace vesk {
// Blocks of one run at most: a request of 1 MiB that begins inside a block.
constexpr size_t kRunBlocks = 17;
static_assert(kRunBlocks < kMostPieces, "a run is moved with one list of pieces");

enum class RunKind {
    Hit,    // every block is cached
    Load,   // no block is cached, a slot is taken for each
    Bypass, // no block is cached, and there are no slots for them: all are pinned
    Write,  // blocks that are cached have their slots, the others have kNoSlot
};

struct CacheRun {
    RunKind kind = RunKind::Bypass;
    uint64_t firstBlock = 0;
    size_t count = 0;                       // blocks
    std::array<uint32_t, kRunBlocks> slots; // per block its slot or kNoSlot
    bool broken = false;                    // the bytes in the slots cannot be trusted
    CacheRun() { slots.fill(kNoSlot); }
};

// Takes the blocks of `first` .. `last` that form the next run of a read, at least `first`. Waits
// when every unpinned slot is in use: the caller must hold no slots, and whoever holds slots must
// not wait for blocks.
CacheRun CacheRunTakeForRead(CacheDevice &device, uint64_t first, uint64_t last);

// Takes up to kRunBlocks blocks of `first` .. `last` for a write. Never waits.
CacheRun CacheRunTakeForWrite(CacheDevice &device, uint64_t first, uint64_t last);

// How many of the blocks `first` .. `last` are not cached now.
uint64_t CacheRunCountMissing(CacheDevice &device, uint64_t first, uint64_t last);

// The run's bytes have been moved: counts it, makes loaded blocks cached ones, pins those blocks of
// a read whose bits are set, or takes the blocks out of the cache when the run is broken. The slots
// stay in use. `error`: the result of the move, 0 or a negative errno.
void CacheRunPublish(CacheDevice &device, CacheRun &run, int error);

// Gives the run's slots back.
void CacheRunRelease(CacheDevice &device, const CacheRun &run);

// The end of the group of blocks that begins at block `index` of the run and whose slots are
// neighbours: their bytes follow each other in the SSD image as on the device. That block has a
// slot.
size_t CacheRunGroupEnd(const CacheRun &run, size_t index);

// Where block `index` of the run begins, in bytes on the device.
uint64_t CacheRunBlockStart(const CacheRun &run, size_t index);
} // namespace vesk
