#include "verbs/plan_figures.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <vector>

namespace vesk {
namespace {
struct Range {
    uint64_t start, count;
};

uint64_t Covered(const std::vector<Range> &ranges) {
    SectorCover cover;
    for (const Range &range : ranges) {
        cover.Add(range.start, range.count);
    }
    return cover.Sectors();
}
} // namespace

TEST(SectorCoverTest, EachSectorCountsOnce) {
    EXPECT_EQ(Covered({}), 0U);
    EXPECT_EQ(Covered({{5, 0}}), 0U);
    EXPECT_EQ(Covered({{0, 1}}), 1U);
    EXPECT_EQ(Covered({{0, 8}, {0, 8}}), 8U);
    EXPECT_EQ(Covered({{0, 8}, {4, 8}}), 12U);
    EXPECT_EQ(Covered({{0, 8}, {8, 8}}), 16U);
    EXPECT_EQ(Covered({{120, 16}}), 16U); // over the border of a block
    EXPECT_EQ(Covered({{120, 16}, {127, 2}}), 16U);
}

TEST(SectorCoverTest, AWholeBlockTakesItsPartsIn) {
    EXPECT_EQ(Covered({{130, 8}, {128, 128}}), 128U);
    EXPECT_EQ(Covered({{128, 128}, {130, 8}}), 128U);
    EXPECT_EQ(Covered({{130, 8}, {200, 8}, {128, 128}, {128, 128}, {140, 1}}), 128U);
    EXPECT_EQ(Covered({{100, 500}, {128, 256}}), 500U);
    EXPECT_EQ(Covered({{128, 256}, {100, 500}}), 500U);
}

TEST(SectorCoverTest, BlocksThatShareAWordAreTheirOwn) {
    EXPECT_EQ(Covered({{0, 64 * 128}}), 64U * 128);
    EXPECT_EQ(Covered({{63 * 128, 256}}), 256U);
    EXPECT_EQ(Covered({{63 * 128, 128}, {64 * 128 + 5, 3}}), 131U);
    EXPECT_EQ(Covered({{0, 128}, {64 * 128, 128}, {128 * 128, 128}}), 384U);
}

TEST(SectorCoverTest, PartsThatFillABlockTogetherAreTheBlock) {
    EXPECT_EQ(Covered({{0, 64}, {64, 64}}), 128U);
    EXPECT_EQ(Covered({{0, 64}, {64, 64}, {0, 128}, {3, 3}}), 128U);
}

TEST(SectorCoverTest, TakesPlacesFarOnLargeDevices) {
    const uint64_t far = uint64_t{1} << 40;
    EXPECT_EQ(Covered({{far, 128}, {far + 5, 200}}), 205U);
}

TEST(SectorCoverTest, AgreesWithAMapOfSectors) {
    std::mt19937 random(17); // NOLINT(cert-msc32-c,cert-msc51-cpp): the same files each time
    const size_t sectors = 20000;
    for (int round = 0; round < 60; ++round) {
        SectorCover cover;
        std::vector<bool> model(sectors);
        for (int i = 0; i < 40; ++i) {
            const uint64_t unit = random() % 2 == 0 ? 8 : 128; // half of them of whole blocks
            const uint64_t start = random() % (sectors / unit) * unit;
            const uint64_t count = std::min<uint64_t>(
                sectors - start, unit * (random() % 2 == 0 ? random() % 4 : random() % 40));
            cover.Add(start, count);
            for (uint64_t sector = start; sector < start + count; ++sector) {
                model[static_cast<size_t>(sector)] = true;
            }
            ASSERT_EQ(cover.Sectors(),
                      static_cast<uint64_t>(std::count(model.begin(), model.end(), true)));
        }
    }
}
} // namespace vesk
