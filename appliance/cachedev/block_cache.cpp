#include "cachedev/block_cache.h"

namespace {

void MakeEvictable(BlockCache &cache, uint32_t slot) {
    // lastUse is unique: every use takes a new value of the clock.
    cache.evictable.emplace_hint(cache.evictable.end(), cache.slots[slot].lastUse, slot);
}

void UnpinSlotOf(BlockCache &cache, uint64_t block) {
    const uint32_t slot = cache.slotOfBlock.at(block);
    cache.slots[slot].pinned = false;
    if (!cache.slots[slot].inUse)
        MakeEvictable(cache, slot);
}

void Forget(BlockCache &cache, CacheSlot &slot) {
    if (slot.pinned)
        cache.pinnedBlocks.erase(slot.block);
    cache.slotOfBlock.erase(slot.block);
    slot.block = kNoBlock;
    slot.pinned = false;
}

} // namespace

void BlockCacheInit(BlockCache &cache, uint32_t slotCount) {
    cache = BlockCache();
    cache.slots.resize(slotCount);
    cache.slotOfBlock.reserve(slotCount);
    // Handed out from the back, so an empty cache fills in slot order and a sequential scan gets
    // neighbouring slots, which are written with one call.
    cache.freeSlots.reserve(slotCount);
    for (uint32_t slot = slotCount; slot > 0; --slot)
        cache.freeSlots.push_back(slot - 1);
}

uint32_t BlockCacheFind(const BlockCache &cache, uint64_t block) {
    const auto found = cache.slotOfBlock.find(block);
    return found == cache.slotOfBlock.end() ? kNoSlot : found->second;
}

void BlockCacheUse(BlockCache &cache, uint32_t slot) {
    CacheSlot &used = cache.slots[slot];
    if (!used.pinned)
        cache.evictable.erase(used.lastUse);
    used.inUse = true;
    used.lastUse = ++cache.useClock;
}

uint32_t BlockCacheTake(BlockCache &cache) {
    uint32_t slot = kNoSlot;
    if (!cache.freeSlots.empty()) {
        slot = cache.freeSlots.back();
        cache.freeSlots.pop_back();
    } else if (!cache.evictable.empty()) {
        slot = cache.evictable.begin()->second;
        cache.evictable.erase(cache.evictable.begin());
        Forget(cache, cache.slots[slot]);
        ++cache.evictions;
    } else {
        return kNoSlot;
    }
    cache.slots[slot].inUse = true;
    cache.slots[slot].lastUse = ++cache.useClock;
    return slot;
}

bool BlockCacheMayTakeLater(const BlockCache &cache) {
    return cache.pinnedBlocks.size() < cache.slots.size();
}

void BlockCacheStore(BlockCache &cache, uint32_t slot, uint64_t block) {
    cache.slots[slot].block = block;
    cache.slotOfBlock.emplace(block, slot);
}

void BlockCacheRelease(BlockCache &cache, uint32_t slot, bool pin) {
    CacheSlot &used = cache.slots[slot];
    used.inUse = false;
    if (pin && !used.pinned) {
        used.pinned = true;
        cache.pinnedBlocks.insert(used.block);
    }
    if (!used.pinned)
        MakeEvictable(cache, slot);
}

void BlockCacheDrop(BlockCache &cache, uint32_t slot) {
    if (cache.slots[slot].block != kNoBlock)
        Forget(cache, cache.slots[slot]);
    cache.slots[slot].inUse = false;
    cache.freeSlots.push_back(slot);
}

void BlockCacheUnpin(BlockCache &cache, const BlockRun &run) {
    const auto first = cache.pinnedBlocks.lower_bound(run.first);
    const auto end = cache.pinnedBlocks.lower_bound(run.first + run.count);
    for (auto block = first; block != end; ++block)
        UnpinSlotOf(cache, *block);
    cache.pinnedBlocks.erase(first, end);
}

void BlockCacheUnpinAll(BlockCache &cache) {
    for (const uint64_t block : cache.pinnedBlocks)
        UnpinSlotOf(cache, block);
    cache.pinnedBlocks.clear();
}

std::vector<BlockRun> BlockCachePinnedRuns(const BlockCache &cache) {
    std::vector<BlockRun> runs;
    for (const uint64_t block : cache.pinnedBlocks) {
        if (!runs.empty() && runs.back().first + runs.back().count == block)
            ++runs.back().count;
        else
            runs.push_back({block, 1});
    }
    return runs;
}
