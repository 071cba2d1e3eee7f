#include "cachedev/cache_run.h"

#include "cachedev/pin_bitmap_runs.h"

#include <algorithm>
#include <mutex>

namespace {

size_t MostBlocks(uint64_t first, uint64_t last) {
    return static_cast<size_t>(std::min<uint64_t>(kRunBlocks, last - first + 1));
}

// Takes a slot to load a block into; kNoSlot when all are pinned or, unless `mayWait`, in use.
uint32_t TakeSlot(CacheDevice &device, std::unique_lock<std::mutex> &hold, bool mayWait) {
    uint32_t slot = BlockCacheTake(device.cache);
    while (slot == kNoSlot && mayWait && BlockCacheMayTakeLater(device.cache)) {
        ++device.slotWaiters;
        device.slotReleased.wait(hold);
        --device.slotWaiters;
        slot = BlockCacheTake(device.cache);
    }
    return slot;
}

void Count(CacheDevice &device, const CacheRun &run, int error) {
    CacheCounters &counters = device.counters;
    switch (run.kind) {
    case RunKind::Write: counters.writes += run.count; return;
    case RunKind::Hit: counters.hits += run.count; break;
    case RunKind::Load:
    case RunKind::Bypass: counters.misses += run.count; break;
    }
    if (run.kind == RunKind::Hit && !run.broken)
        counters.ssdReads += run.count;
    else if (error == 0)
        counters.backingReads += run.count;
}

} // namespace

CacheRun CacheRunTakeForRead(CacheDevice &device, uint64_t first, uint64_t last) {
    CacheRun run;
    run.firstBlock = first;
    const size_t most = MostBlocks(first, last);
    std::unique_lock<std::mutex> hold(device.stateMutex);
    for (; run.count < most; ++run.count) {
        const bool isFirst = run.count == 0;
        uint32_t slot = BlockCacheFind(device.cache, first + run.count);
        RunKind kind = RunKind::Hit;
        if (slot == kNoSlot) {
            if (!isFirst && run.kind == RunKind::Hit)
                break; // before a slot is taken that this run has no use for
            slot = TakeSlot(device, hold, isFirst);
            // Without a slot for a later block the run ends here if others are in use: this run's
            // own ones will be free for the next run.
            kind = slot != kNoSlot ? RunKind::Load : RunKind::Bypass;
        } else if (isFirst || run.kind == RunKind::Hit) {
            BlockCacheUse(device.cache, slot);
        }
        if (!isFirst && kind != run.kind)
            break;
        run.kind = kind;
        run.slots[run.count] = slot;
    }
    return run;
}
