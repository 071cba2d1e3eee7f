#include "cachedev/block_range_lock.h"

#include <algorithm>

namespace vesk {
BlockRangeGuard::BlockRangeGuard(BlockRangeLock &rangeLock, const BlockRange &range)
    : lock_(rangeLock) {
    std::unique_lock<std::mutex> hold(lock_.mutex);
    place_ = lock_.queue.insert(lock_.queue.end(), range);
    const auto free = [this, &range] {
        return std::none_of(lock_.queue.begin(), place_, [&range](const BlockRange &earlier) {
            return earlier.first <= range.last && range.first <= earlier.last;
        });
    };
    ++lock_.waiting;
    lock_.released.wait(hold, free);
    --lock_.waiting;
}

BlockRangeGuard::~BlockRangeGuard() {
    bool wake = false;
    {
        const std::lock_guard<std::mutex> hold(lock_.mutex);
        lock_.queue.erase(place_);
        wake = lock_.waiting > 0;
    }
    if (wake) {
        lock_.released.notify_all();
    }
}
} // namespace vesk
