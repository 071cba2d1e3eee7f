#include "model/block_set.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <set>

namespace vesk {
TEST(BlockSetTest, HasRoomForWholeBytesOfBlocks) {
    EXPECT_EQ(BlockSetOf(0).size(), 0U);
    EXPECT_EQ(BlockSetOf(1).size(), 1U);
    EXPECT_EQ(BlockSetOf(8).size(), 1U);
    EXPECT_EQ(BlockSetOf(9).size(), 2U);
}

TEST(BlockSetTest, AddingTellsHowManyBlocksAreNew) {
    BlockSet set = BlockSetOf(24);
    EXPECT_EQ(BlockSetAdd(&set, {3, 7}), 7U);
    EXPECT_EQ(set, (BlockSet{0xF8, 0x03, 0x00}));
    EXPECT_EQ(BlockSetAdd(&set, {3, 7}), 0U);
    EXPECT_EQ(BlockSetAdd(&set, {0, 24}), 17U);
    EXPECT_EQ(set, (BlockSet{0xFF, 0xFF, 0xFF}));
    EXPECT_EQ(BlockSetAdd(&set, {5, 0}), 0U);
}

TEST(BlockSetTest, BlocksForWhichThereIsNoRoomAreLeftOut) {
    BlockSet set = BlockSetOf(8);
    EXPECT_EQ(BlockSetAdd(&set, {6, 10}), 2U);
    EXPECT_EQ(set, BlockSet{0xC0});
    EXPECT_EQ(BlockSetAdd(&set, {8, 1}), 0U);
    EXPECT_EQ(BlockSetAdd(&set, {1, UINT64_MAX}), 5U);
    EXPECT_EQ(BlockSetAdd(&set, {UINT64_MAX, UINT64_MAX}), 0U);
    EXPECT_EQ(set, BlockSet{0xFE});
    BlockSet none;
    EXPECT_EQ(BlockSetAdd(&none, {0, 5}), 0U);
    EXPECT_EQ(BlockSetCount(none), 0U);
}

TEST(BlockSetTest, SetsOfDifferentLengthsShareWhatBothHave) {
    EXPECT_EQ(BlockSetCountBoth({0xFF, 0x0F}, {0x81, 0xF8, 0xFF}), 3U);
    EXPECT_EQ(BlockSetCountBoth({0x81, 0xF8, 0xFF}, {0xFF, 0x0F}), 3U);
    EXPECT_EQ(BlockSetCountBoth({}, {0xFF}), 0U);
}

TEST(BlockSetTest, AgreesWithASetOfNumbers) {
    std::mt19937 random(3); // NOLINT(cert-msc32-c,cert-msc51-cpp): the same runs each time
    const uint64_t blocks = 200;
    for (int round = 0; round < 300; ++round) {
        BlockSet set = BlockSetOf(blocks);
        std::set<uint64_t> model;
        for (int i = 0; i < 6; ++i) {
            const BitRun run{random() % 220, random() % 60};
            uint64_t added = 0;
            for (uint64_t bit = run.first; bit < std::min(run.first + run.count, blocks); ++bit) {
                added += model.insert(bit).second ? 1 : 0;
            }
            ASSERT_EQ(BlockSetAdd(&set, run), added);
        }
        ASSERT_EQ(BlockSetCount(set), model.size());
        const BitRun asked{random() % 220, random() % 100};
        const auto inside = std::count_if(model.begin(), model.end(), [&](uint64_t bit) {
            return bit >= asked.first && bit < asked.first + asked.count;
        });
        ASSERT_EQ(BlockSetCountIn(set, asked), static_cast<uint64_t>(inside));
    }
}
} // namespace vesk
