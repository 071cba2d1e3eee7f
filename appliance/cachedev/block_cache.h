// The cache's book-keeping: which block is in which slot, how recently it was used, what is pinned.
//
// Pure: no I/O, no clock, no lock. Not thread-safe; the owner of a BlockCache guards all of it with
// one lock (see cache_device.h). While a request reads or writes a slot's bytes outside that lock,
// it holds the slot "in use": such a slot is never handed out for another block.
//
// Every slot is in exactly one of these states: free (no block, not in use), in use, pinned,
// evictable (holds a block, unpinned, not in use). A pinned slot may be in use as well.
#pragma once

#include "bitmap/bit_runs.h"

#include <cstddef>
#include <cstdint>
#include <map>
#include <set>
#include <unordered_map>
#include <vector>

namespace vesk {
constexpr uint64_t kNoBlock = UINT64_MAX;
constexpr uint32_t kNoSlot = UINT32_MAX;

using BlockRun = BitRun; // a block's number is that of its bit in the pin bitmap

using UseOrder = std::map<uint64_t, uint32_t>;             // last use -> slot number
using BlockIndex = std::unordered_map<uint64_t, uint32_t>; // block number -> slot number
using BlockSet = std::set<uint64_t>;                       // block numbers

struct CacheSlot {
    uint64_t block = kNoBlock; // block whose bytes the slot holds; kNoBlock: none
    uint64_t lastUse = 0;      // value of BlockCache::useClock at the last use, unique
    bool inUse = false;        // a request works on the slot's bytes
    bool pinned = false;
    // The slot's nodes for the containers below, while they are not in there. They are made once,
    // so that no change of the cache's state allocates memory or can fail.
    UseOrder::node_type useNode;
    BlockIndex::node_type indexNode;
    BlockSet::node_type pinNode;
};

struct BlockCache {
    std::vector<CacheSlot> slots;
    BlockIndex slotOfBlock;          // the cached blocks
    UseOrder evictable;              // the evictable slots, least recently used first
    BlockSet pinnedBlocks;           // the pinned blocks
    std::vector<uint32_t> freeSlots; // slot numbers; the last one is handed out
    uint64_t useClock = 0;           // counts uses
    uint64_t evictions = 0;          // blocks that gave way to another block
};

// Makes `cache` an empty cache of `slotCount` slots (1 .. kNoSlot - 1). May throw std::bad_alloc;
// none of the functions below that change the cache throws.
void BlockCacheInit(BlockCache &cache, uint32_t slotCount);

// The slot that holds `block`, or kNoSlot.
uint32_t BlockCacheFind(const BlockCache &cache, uint64_t block);

// Marks the slot of a cached block as in use and as the most recently used one. It must not be in
// use yet. Ends with BlockCacheRelease or BlockCacheDrop.
void BlockCacheUse(BlockCache &cache, uint32_t slot);

// Takes a slot for a block that is not cached: a free one, else the least recently used evictable
// one, whose block is then no longer cached. The slot is in use and holds no block; it ends with
// BlockCacheStore and BlockCacheRelease, or with BlockCacheDrop. kNoSlot when there is none.
uint32_t BlockCacheTake(BlockCache &cache);

// Whether BlockCacheTake, after it gave kNoSlot, may succeed once other requests release their
// slots; false: every slot is pinned.
bool BlockCacheMayTakeLater(const BlockCache &cache);

// Records that a taken slot, still in use, now holds `block`, which must not be cached elsewhere.
void BlockCacheStore(BlockCache &cache, uint32_t slot, uint64_t block);

// Pins the block of a slot that is in use.
void BlockCachePin(BlockCache &cache, uint32_t slot);

// Ends the use of a slot that holds a block.
void BlockCacheRelease(BlockCache &cache, uint32_t slot);

// Ends the use of a slot whose bytes cannot be trusted: its block (if any) is no longer cached nor
// pinned and the slot is free.
void BlockCacheDrop(BlockCache &cache, uint32_t slot);

// Unpins every pinned block of the run (count may be 0, first + count must not overflow); each
// keeps its place in the order of use.
void BlockCacheUnpin(BlockCache &cache, const BlockRun &run);

// Unpins every block.
void BlockCacheUnpinAll(BlockCache &cache);

// The pinned blocks as runs in ascending order, no two of them adjacent.
std::vector<BlockRun> BlockCachePinnedRuns(const BlockCache &cache);
} // namespace vesk
