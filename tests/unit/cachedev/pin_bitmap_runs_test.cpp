#include "cachedev/pin_bitmap_runs.h"

#include <gtest/gtest.h>

#include <random>

namespace {

// Runs as text, "first+count ...".
std::string Text(const std::vector<BlockRun> &runs) {
    std::string text;
    for (const BlockRun &run : runs) {
        text +=
            (text.empty() ? "" : " ") + std::to_string(run.first) + "+" + std::to_string(run.count);
    }
    return text;
}

} // namespace

TEST(PinBitmapTestTest, LeastSignificantBitComesFirst) {
    const std::vector<uint8_t> bitmap = {0x01, 0x80, 0x00};
    for (uint64_t block = 0; block < 24; ++block) {
        EXPECT_EQ(PinBitmapTest(bitmap, block), block == 0 || block == 15) << block;
    }
}

TEST(PinBitmapTestTest, PastTheEndNothingIsSet) {
    EXPECT_FALSE(PinBitmapTest({0xFF}, 8));
    EXPECT_FALSE(PinBitmapTest({0xFF}, UINT64_MAX));
    EXPECT_FALSE(PinBitmapTest({}, 0));
}

TEST(PinBitmapRunsTest, FindsRuns) {
    EXPECT_EQ(Text(PinBitmapRuns({})), "");
    EXPECT_EQ(Text(PinBitmapRuns({0x00, 0x00})), "");
    EXPECT_EQ(Text(PinBitmapRuns({0xFF, 0xFF})), "0+16");
    EXPECT_EQ(Text(PinBitmapRuns({0x01})), "0+1");
    EXPECT_EQ(Text(PinBitmapRuns({0x80})), "7+1");
    EXPECT_EQ(Text(PinBitmapRuns({0x80, 0x01})), "7+2");
    EXPECT_EQ(Text(PinBitmapRuns({0xC0, 0xFF, 0x03, 0x00, 0x10})), "6+12 36+1");
    EXPECT_EQ(Text(PinBitmapRuns({0x55})), "0+1 2+1 4+1 6+1");
}

TEST(PinBitmapRunsTest, AgreesWithTheSingleBits) {
    std::mt19937 random(1);
    for (int round = 0; round < 200; ++round) {
        std::vector<uint8_t> bitmap(random() % 12);
        const uint8_t choice[] = {0x00, 0xFF, 0x0F, 0xF0, static_cast<uint8_t>(random())};
        for (uint8_t &byte : bitmap) {
            byte = choice[random() % 5];
        }
        std::vector<uint8_t> rebuilt(bitmap.size());
        uint64_t end = 0;
        for (const BlockRun &run : PinBitmapRuns(bitmap)) {
            EXPECT_GT(run.count, 0U);
            EXPECT_TRUE(end == 0 || run.first > end) << "adjacent or overlapping runs";
            end = run.first + run.count;
            for (auto bit = static_cast<size_t>(run.first); bit < end; ++bit) {
                rebuilt.at(bit / 8) = static_cast<uint8_t>(rebuilt.at(bit / 8) | 1U << bit % 8);
            }
        }
        EXPECT_EQ(rebuilt, bitmap);
    }
}
