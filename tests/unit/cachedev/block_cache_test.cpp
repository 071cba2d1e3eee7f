#include "cachedev/block_cache.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
uint32_t Load(BlockCache &cache, uint64_t block) {
    const uint32_t slot = BlockCacheTake(cache);
    if (slot != kNoSlot) {
        BlockCacheStore(cache, slot, block);
        BlockCacheRelease(cache, slot);
    }
    return slot;
}

void Use(BlockCache &cache, uint64_t block) {
    const uint32_t slot = BlockCacheFind(cache, block);
    ASSERT_NE(slot, kNoSlot);
    BlockCacheUse(cache, slot);
    BlockCacheRelease(cache, slot);
}

void Pin(BlockCache &cache, uint64_t block) {
    const uint32_t slot = BlockCacheFind(cache, block);
    ASSERT_NE(slot, kNoSlot);
    BlockCacheUse(cache, slot);
    BlockCachePin(cache, slot);
    BlockCacheRelease(cache, slot);
}

struct BlockCacheTest : testing::Test {
    BlockCache cache;
    BlockCacheTest() { BlockCacheInit(cache, 3); }
    bool Has(uint64_t block) const { return BlockCacheFind(cache, block) != kNoSlot; }
};
} // namespace

TEST_F(BlockCacheTest, FillsFreeSlotsInOrder) {
    EXPECT_EQ(Load(cache, 70), 0U);
    EXPECT_EQ(Load(cache, 50), 1U);
    EXPECT_EQ(Load(cache, 60), 2U);
    EXPECT_EQ(BlockCacheFind(cache, 50), 1U);
    EXPECT_EQ(BlockCacheFind(cache, 51), kNoSlot);
    EXPECT_EQ(cache.evictions, 0U);
}

TEST_F(BlockCacheTest, EvictsTheLeastRecentlyUsed) {
    for (const uint64_t block : {1U, 2U, 3U}) {
        Load(cache, block);
    }
    Use(cache, 1);
    EXPECT_EQ(Load(cache, 4), 1U); // the slot of block 2
    EXPECT_TRUE(Has(1));
    EXPECT_FALSE(Has(2));
    Load(cache, 5);
    EXPECT_FALSE(Has(3));
    EXPECT_TRUE(Has(1));
    EXPECT_EQ(cache.evictions, 2U);
}

TEST_F(BlockCacheTest, BlockZeroAndHugeBlockNumbersAreOrdinary) {
    Load(cache, 0);
    Load(cache, kNoBlock - 1);
    Pin(cache, 0);
    EXPECT_TRUE(Has(0));
    EXPECT_TRUE(Has(kNoBlock - 1));
    BlockCacheUnpinAll(cache);
    EXPECT_TRUE(cache.pinnedBlocks.empty());
}

TEST_F(BlockCacheTest, NeverEvictsPinnedOrUsedBlocks) {
    for (const uint64_t block : {1U, 2U, 3U}) {
        Load(cache, block);
    }
    Pin(cache, 1);
    BlockCacheUse(cache, BlockCacheFind(cache, 2));
    EXPECT_EQ(Load(cache, 4), 2U);
    BlockCacheUse(cache, BlockCacheFind(cache, 4));
    EXPECT_EQ(BlockCacheTake(cache), kNoSlot);
    EXPECT_TRUE(BlockCacheMayTakeLater(cache));
    BlockCachePin(cache, 1);
    BlockCachePin(cache, 2);
    EXPECT_EQ(BlockCacheTake(cache), kNoSlot);
    EXPECT_FALSE(BlockCacheMayTakeLater(cache)); // all pinned: waiting is of no use
}

TEST_F(BlockCacheTest, UnpinnedBlocksKeepTheirPlaceInTheOrderOfUse) {
    for (const uint64_t block : {1U, 2U, 3U}) {
        Load(cache, block);
    }
    Pin(cache, 2);
    Use(cache, 1);
    Use(cache, 3);
    BlockCacheUnpin(cache, {2, 1});
    Load(cache, 4);
    EXPECT_FALSE(Has(2)); // used longest ago
    EXPECT_TRUE(Has(1));
    EXPECT_TRUE(Has(3));
}

TEST_F(BlockCacheTest, UnpinTakesExactlyTheRun) {
    for (const uint64_t block : {10U, 11U, 12U}) {
        Load(cache, block);
        Pin(cache, block);
    }
    BlockCacheUnpin(cache, {11, 0});
    BlockCacheUnpin(cache, {0, 10});
    BlockCacheUnpin(cache, {13, 100});
    EXPECT_EQ(cache.pinnedBlocks.size(), 3U);
    BlockCacheUnpin(cache, {11, 1});
    const std::vector<BlockRun> runs = BlockCachePinnedRuns(cache);
    ASSERT_EQ(runs.size(), 2U);
    EXPECT_EQ(runs[0].first, 10U);
    EXPECT_EQ(runs[1].first, 12U);
    BlockCacheUnpin(cache, {12, UINT64_MAX - 12});
    EXPECT_EQ(cache.pinnedBlocks.size(), 1U);
}

TEST_F(BlockCacheTest, APinnedBlockCanBeUnpinnedWhileInUse) {
    const uint32_t slot = Load(cache, 1);
    BlockCacheUse(cache, slot);
    BlockCachePin(cache, slot);
    BlockCacheUnpinAll(cache);
    Load(cache, 2);
    Load(cache, 3);
    const uint32_t taken = BlockCacheTake(cache);
    EXPECT_TRUE(Has(1)); // in use: block 2 had to go
    EXPECT_FALSE(Has(2));
    BlockCacheDrop(cache, taken);
    BlockCacheRelease(cache, slot);
    Load(cache, 4); // into the free slot
    Load(cache, 5);
    EXPECT_FALSE(Has(1));
}

TEST_F(BlockCacheTest, PinningTwiceIsPinningOnce) {
    Load(cache, 1);
    Pin(cache, 1);
    Pin(cache, 1);
    EXPECT_EQ(cache.pinnedBlocks.size(), 1U);
    BlockCacheUnpin(cache, {1, 1});
    Pin(cache, 1);
    EXPECT_EQ(cache.pinnedBlocks.size(), 1U);
}

TEST_F(BlockCacheTest, ADroppedSlotIsFreeAgain) {
    const uint32_t slot = Load(cache, 1);
    Pin(cache, 1);
    BlockCacheUse(cache, slot);
    BlockCacheDrop(cache, slot);
    EXPECT_FALSE(Has(1));
    EXPECT_TRUE(cache.pinnedBlocks.empty());
    EXPECT_EQ(Load(cache, 2), slot);
    const uint32_t empty = BlockCacheTake(cache); // never stored
    BlockCacheDrop(cache, empty);
    EXPECT_EQ(Load(cache, 3), empty);
    EXPECT_EQ(cache.evictions, 0U);
}

TEST_F(BlockCacheTest, PinnedRunsAreMergedAndAscending) {
    BlockCacheInit(cache, 6);
    for (const uint64_t block : {9U, 4U, 8U, 5U, 1U}) {
        Load(cache, block);
        Pin(cache, block);
    }
    const std::vector<BlockRun> runs = BlockCachePinnedRuns(cache);
    ASSERT_EQ(runs.size(), 3U);
    EXPECT_EQ(runs[0].first, 1U);
    EXPECT_EQ(runs[0].count, 1U);
    EXPECT_EQ(runs[1].first, 4U);
    EXPECT_EQ(runs[1].count, 2U);
    EXPECT_EQ(runs[2].first, 8U);
    EXPECT_EQ(runs[2].count, 2U);
}
} // namespace vesk
