#include "cachedev/block_cache.h"

#include <utility>

namespace vesk {
namespace {
void MakeEvictable(BlockCache &cache, uint32_t number) {
    CacheSlot &slot = cache.slots[number];
    slot.useNode.key() = slot.lastUse;
    cache.evictable.insert(cache.evictable.end(), std::move(slot.useNode));
}

// Takes the pin off a slot; the caller takes the block out of pinnedBlocks.
void ClearPin(BlockCache &cache, uint32_t number) {
    cache.slots[number].pinned = false;
    if (!cache.slots[number].inUse) {
        MakeEvictable(cache, number);
    }
}

// Takes the block out of a slot that is in use or no longer evictable.
void Forget(BlockCache &cache, CacheSlot &slot) {
    if (slot.pinned) {
        slot.pinNode = cache.pinnedBlocks.extract(slot.block);
    }
    slot.indexNode = cache.slotOfBlock.extract(slot.block);
    slot.block = kNoBlock;
    slot.pinned = false;
}
} // namespace

void BlockCacheInit(BlockCache &cache, uint32_t slotCount) {
    cache = BlockCache();
    cache.slots.resize(slotCount);
    cache.slotOfBlock.reserve(slotCount);
    cache.freeSlots.reserve(slotCount);
    // Handed out from the back, so an empty cache fills in slot order and a sequential scan gets
    // neighbouring slots, which take part in one transfer.
    for (uint32_t number = slotCount; number-- > 0;) {
        CacheSlot &slot = cache.slots[number];
        slot.useNode = cache.evictable.extract(cache.evictable.emplace(0, number).first);
        slot.indexNode = cache.slotOfBlock.extract(cache.slotOfBlock.emplace(0, number).first);
        slot.pinNode = cache.pinnedBlocks.extract(cache.pinnedBlocks.insert(0).first);
        cache.freeSlots.push_back(number);
    }
}

uint32_t BlockCacheFind(const BlockCache &cache, uint64_t block) {
    const auto found = cache.slotOfBlock.find(block);
    return found == cache.slotOfBlock.end() ? kNoSlot : found->second;
}

void BlockCacheUse(BlockCache &cache, uint32_t slot) {
    CacheSlot &used = cache.slots[slot];
    if (!used.pinned) {
        used.useNode = cache.evictable.extract(used.lastUse);
    }
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
        cache.slots[slot].useNode = cache.evictable.extract(cache.evictable.begin());
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
    CacheSlot &stored = cache.slots[slot];
    stored.block = block;
    stored.indexNode.key() = block;
    cache.slotOfBlock.insert(std::move(stored.indexNode));
}

void BlockCachePin(BlockCache &cache, uint32_t slot) {
    CacheSlot &pinned = cache.slots[slot];
    if (pinned.pinned) {
        return;
    }
    pinned.pinned = true;
    pinned.pinNode.value() = pinned.block;
    cache.pinnedBlocks.insert(std::move(pinned.pinNode));
}

void BlockCacheRelease(BlockCache &cache, uint32_t slot) {
    cache.slots[slot].inUse = false;
    if (!cache.slots[slot].pinned) {
        MakeEvictable(cache, slot);
    }
}

void BlockCacheDrop(BlockCache &cache, uint32_t slot) {
    if (cache.slots[slot].block != kNoBlock) {
        Forget(cache, cache.slots[slot]);
    }
    cache.slots[slot].inUse = false;
    cache.freeSlots.push_back(slot);
}

void BlockCacheUnpin(BlockCache &cache, const BlockRun &run) {
    const auto end = cache.pinnedBlocks.lower_bound(run.first + run.count);
    for (auto block = cache.pinnedBlocks.lower_bound(run.first); block != end;) {
        const uint32_t slot = cache.slotOfBlock.find(*block)->second;
        ClearPin(cache, slot);
        cache.slots[slot].pinNode = cache.pinnedBlocks.extract(block++);
    }
}

void BlockCacheUnpinAll(BlockCache &cache) {
    BlockCacheUnpin(cache, {0, UINT64_MAX});
}

std::vector<BlockRun> BlockCachePinnedRuns(const BlockCache &cache) {
    std::vector<BlockRun> runs;
    for (const uint64_t block : cache.pinnedBlocks) {
        if (!runs.empty() && runs.back().first + runs.back().count == block) {
            ++runs.back().count;
        } else {
            runs.push_back({block, 1});
        }
    }
    return runs;
}
} // namespace vesk
