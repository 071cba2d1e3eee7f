#include "cachedev/cache_run.h"

#include "bitmap/bit_runs.h"

#include <algorithm>
#include <mutex>

namespace vesk {
namespace {
size_t MostBlocks(uint64_t first, uint64_t last) {
    return static_cast<size_t>(std::min<uint64_t>(kRunBlocks, last - first + 1));
}

// Begins a run with its first block. `hold` is locked.
void TakeFirst(CacheDevice &device, std::unique_lock<std::mutex> &hold, CacheRun &run) {
    run.count = 1;
    run.slots[0] = BlockCacheFind(device.cache, run.firstBlock);
    if (run.slots[0] != kNoSlot) {
        run.kind = RunKind::Hit;
        BlockCacheUse(device.cache, run.slots[0]);
        return;
    }
    run.slots[0] = BlockCacheTake(device.cache);
    while (run.slots[0] == kNoSlot && BlockCacheMayTakeLater(device.cache)) {
        ++device.slotWaiters;
        device.slotReleased.wait(hold);
        --device.slotWaiters;
        run.slots[0] = BlockCacheTake(device.cache);
    }
    run.kind = run.slots[0] != kNoSlot ? RunKind::Load : RunKind::Bypass;
}

// Adds the next block if it is of the run's kind. stateMutex is held.
bool TakeNext(BlockCache &cache, CacheRun &run) {
    uint32_t slot = BlockCacheFind(cache, run.firstBlock + run.count);
    if ((slot != kNoSlot) != (run.kind == RunKind::Hit)) {
        return false;
    }
    if (run.kind == RunKind::Hit) {
        BlockCacheUse(cache, slot);
    } else if (run.kind == RunKind::Load) {
        slot = BlockCacheTake(cache);
    }
    // Out of slots: those of this run will be free for the next one.
    if (run.kind == RunKind::Load && slot == kNoSlot) {
        return false;
    }
    if (run.kind == RunKind::Bypass && BlockCacheMayTakeLater(cache)) {
        return false;
    }
    run.slots[run.count++] = slot;
    return true;
}

void Count(CacheDevice &device, const CacheRun &run, int error) {
    CacheCounters &counters = device.counters;
    if (run.kind == RunKind::Write) {
        counters.writes += run.count;
        return;
    }
    (run.kind == RunKind::Hit ? counters.hits : counters.misses) += run.count;
    if (run.kind == RunKind::Hit && !run.broken) {
        counters.ssdReads += run.count;
    } else if (error == 0) {
        counters.backingReads += run.count;
    }
}

void WakeSlotWaiters(CacheDevice &device) {
    if (device.slotWaiters > 0) {
        device.slotReleased.notify_all();
    }
}
} // namespace

CacheRun CacheRunTakeForRead(CacheDevice &device, uint64_t first, uint64_t last) {
    CacheRun run;
    run.firstBlock = first;
    const size_t most = MostBlocks(first, last);
    std::unique_lock<std::mutex> hold(device.stateMutex);
    TakeFirst(device, hold, run);
    bool more = true;
    while (more && run.count < most) {
        more = TakeNext(device.cache, run);
    }
    return run;
}

CacheRun CacheRunTakeForWrite(CacheDevice &device, uint64_t first, uint64_t last) {
    CacheRun run;
    run.kind = RunKind::Write;
    run.firstBlock = first;
    run.count = MostBlocks(first, last);
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    for (size_t i = 0; i < run.count; ++i) {
        run.slots[i] = BlockCacheFind(device.cache, first + i);
        if (run.slots[i] != kNoSlot) {
            BlockCacheUse(device.cache, run.slots[i]);
        }
    }
    return run;
}

uint64_t CacheRunCountMissing(CacheDevice &device, uint64_t first, uint64_t last) {
    uint64_t missing = 0;
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    for (uint64_t block = first; block <= last; ++block) {
        missing += BlockCacheFind(device.cache, block) == kNoSlot ? 1 : 0;
    }
    return missing;
}

void CacheRunPublish(CacheDevice &device, CacheRun &run, int error) {
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    Count(device, run, error);
    for (size_t i = 0; i < run.count; ++i) {
        const uint32_t slot = run.slots[i];
        if (slot == kNoSlot) {
            continue;
        }
        if (run.broken) {
            BlockCacheDrop(device.cache, slot);
            run.slots[i] = kNoSlot;
            continue;
        }
        const uint64_t block = run.firstBlock + i;
        if (run.kind == RunKind::Load) {
            BlockCacheStore(device.cache, slot, block);
        }
        if (run.kind != RunKind::Write && device.bitmap &&
            BitIsSet(device.bitmap->data(), device.bitmap->size(), block)) {
            BlockCachePin(device.cache, slot);
        }
    }
    if (run.broken) {
        WakeSlotWaiters(device);
    }
}

void CacheRunRelease(CacheDevice &device, const CacheRun &run) {
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    for (size_t i = 0; i < run.count; ++i) {
        if (run.slots[i] != kNoSlot) {
            BlockCacheRelease(device.cache, run.slots[i]);
        }
    }
    WakeSlotWaiters(device);
}

size_t CacheRunGroupEnd(const CacheRun &run, size_t index) {
    size_t end = index + 1;
    while (end < run.count && run.slots[end] != kNoSlot &&
           run.slots[end] == run.slots[end - 1] + 1) {
        ++end;
    }
    return end;
}

uint64_t CacheRunBlockStart(const CacheRun &run, size_t index) {
    return (run.firstBlock + index) * kBlockBytes;
}
} // namespace vesk
