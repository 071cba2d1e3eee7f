#include "cachedev/block_range_lock.h"

#include <algorithm>

namespace vesk {

BlockRangeGuard::BlockRangeGuard(BlockRangeLock &rangeLock, const BlockRange &range)
    : lock(rangeLock) {
    std::unique_lock<std::mutex> hold(lock.mutex);
    place = lock.queue.insert(lock.queue.end(), range);
    const auto free = [this, &range] {
        return std::none_of(lock.queue.begin(), place, [&range](const BlockRange &earlier) {
            return earlier.first <= range.last && range.first <= earlier.last;
        });
    };
    ++lock.waiting;
    lock.released.wait(hold, free);
    --lock.waiting;
}

BlockRangeGuard::~BlockRangeGuard() {
    bool wake = false;
    {
        const std::lock_guard<std::mutex> hold(lock.mutex);
        lock.queue.erase(place);
        wake = lock.waiting > 0;
    }
    if (wake) {
        lock.released.notify_all();
    }
}

} // namespace vesk
