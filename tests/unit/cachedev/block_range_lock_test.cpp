#include "cachedev/block_range_lock.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <memory>
#include <thread>
#include <vector>

namespace vesk {
namespace {
// Waits, within reason, until `count` ranges are held or awaited.
void AwaitQueue(BlockRangeLock &lock, size_t count) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(30);
    while (std::chrono::steady_clock::now() < deadline) {
        {
            const std::lock_guard<std::mutex> hold(lock.mutex);
            if (lock.queue.size() >= count) {
                return;
            }
        }
        std::this_thread::yield();
    }
    FAIL() << "the queue never got " << count << " ranges";
}
} // namespace

TEST(BlockRangeLockTest, DistinctRangesAreHeldTogether) {
    BlockRangeLock lock;
    const BlockRangeGuard one(lock, {0, 4});
    const BlockRangeGuard two(lock, {5, 5}); // would hang if they excluded each other
    const BlockRangeGuard three(lock, {6, UINT64_MAX});
    EXPECT_EQ(lock.queue.size(), 3U);
}

TEST(BlockRangeLockTest, OverlappingRangesWaitInOrderOfArrival) {
    BlockRangeLock lock;
    std::vector<int> order; // guarded by the ranges: all of them overlap
    auto first = std::make_unique<BlockRangeGuard>(lock, BlockRange{10, 20});
    const auto enter = [&lock, &order](int name, BlockRange range) {
        const BlockRangeGuard guard(lock, range);
        order.push_back(name);
    };
    std::thread a(enter, 1, BlockRange{20, 30});
    AwaitQueue(lock, 2);
    std::thread b(enter, 2, BlockRange{5, 25});
    AwaitQueue(lock, 3);
    std::thread c(enter, 3, BlockRange{20, 20});
    AwaitQueue(lock, 4);
    order.push_back(0);
    first.reset();
    a.join();
    b.join();
    c.join();
    EXPECT_EQ(order, (std::vector<int>{0, 1, 2, 3}));
    EXPECT_TRUE(lock.queue.empty());
    EXPECT_EQ(lock.waiting, 0U);
}

TEST(BlockRangeLockTest, ALaterRangePassesThoseItDoesNotOverlap) {
    BlockRangeLock lock;
    auto first = std::make_unique<BlockRangeGuard>(lock, BlockRange{0, 9});
    std::thread waiter([&lock] { const BlockRangeGuard guard(lock, {9, 11}); });
    AwaitQueue(lock, 2);
    { const BlockRangeGuard passes(lock, {12, 13}); } // would hang if it queued up
    first.reset();
    waiter.join();
}

TEST(BlockRangeLockTest, OneHolderPerBlockAtATime) {
    constexpr size_t kBlocks = 8;
    BlockRangeLock lock;
    std::vector<int> holders(kBlocks, 0); // plain ints: a race would be one for the sanitizer, too
    std::atomic<int> clashes{0};
    const auto work = [&](unsigned seed) {
        for (int i = 0; i < 2000; ++i) {
            seed = seed * 1664525U + 1013904223U;
            const size_t first = (seed >> 8U) % kBlocks;
            const size_t last = first + (seed >> 16U) % (kBlocks - first);
            const BlockRangeGuard guard(lock, {first, last});
            for (size_t block = first; block <= last; ++block) {
                clashes += holders[block]++ != 0 ? 1 : 0;
            }
            for (size_t block = first; block <= last; ++block) {
                --holders[block];
            }
        }
    };
    std::vector<std::thread> threads;
    for (unsigned seed = 1; seed <= 4; ++seed) {
        threads.emplace_back(work, seed);
    }
    for (std::thread &thread : threads) {
        thread.join();
    }
    EXPECT_EQ(clashes, 0);
}
} // namespace vesk
