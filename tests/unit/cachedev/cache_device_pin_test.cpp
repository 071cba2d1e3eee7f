// Pinning: the bitmap, what a read pins, and what releases it.
#include "cachedev/cache_device.h"

#include "tests/support/test_device.h"

#include <gtest/gtest.h>

#include <cerrno>

namespace vesk {
namespace {
using Blocks = std::vector<uint64_t>;

struct CacheDevicePinTest : testing::Test {
    TestDevice test{32 * kBlockBytes, 4};
    CacheDevice &device = test.device;

    void SetBits(const Blocks &blocks) { CacheDeviceSetBitmap(device, TestBitmap(device, blocks)); }
    void Scan() { EXPECT_EQ(TestReadResult(device, 0, 32 * kBlockBytes), 32 * 65536); }
};

constexpr uint64_t kLastSector = 32 * kBlockSectors - 1;
} // namespace

TEST_F(CacheDevicePinTest, AMarkedBlockIsPinnedWhenReadAndSurvivesAScan) {
    SetBits({3, 20});
    EXPECT_TRUE(TestPinned(device).empty());
    EXPECT_TRUE(CacheDeviceIsAllUnpinned(device));
    TestTouch(device, {3});
    EXPECT_EQ(TestPinned(device), (Blocks{3}));
    EXPECT_FALSE(CacheDeviceIsAllUnpinned(device));
    Scan(); // reads 20 as well
    Scan();
    EXPECT_EQ(TestPinned(device), (Blocks{3, 20}));
    EXPECT_EQ(TestCached(device), (Blocks{3, 20, 30, 31}));
    const uint64_t hits = CacheDeviceSnapshot(device).counters.hits;
    TestTouch(device, {3, 20});
    EXPECT_EQ(CacheDeviceSnapshot(device).counters.hits, hits + 2);
}

TEST_F(CacheDevicePinTest, AHitPinsToo) {
    TestTouch(device, {5});
    SetBits({5});
    EXPECT_TRUE(TestPinned(device).empty());
    TestTouch(device, {5});
    EXPECT_EQ(TestPinned(device), (Blocks{5}));
}

TEST_F(CacheDevicePinTest, AWriteDoesNotPin) {
    SetBits({5});
    EXPECT_EQ(CacheDeviceWrite(device, 5 * kBlockBytes, "x", 1), 1);
    EXPECT_TRUE(TestCached(device).empty());
    TestTouch(device, {6});
    SetBits({5, 6});
    EXPECT_EQ(CacheDeviceWrite(device, 6 * kBlockBytes, "x", 1), 1);
    EXPECT_TRUE(TestPinned(device).empty());
    TestTouch(device, {6});
    EXPECT_EQ(CacheDeviceWrite(device, 6 * kBlockBytes, "y", 1), 1);
    EXPECT_EQ(TestPinned(device), (Blocks{6}));
    EXPECT_EQ(TestRead(device, 6 * kBlockBytes, 1), "y");
}

TEST_F(CacheDevicePinTest, WithEverySlotPinnedReadsBypassTheCache) {
    SetBits({0, 1, 2, 3, 4});
    TestTouch(device, {0, 1, 2, 3});
    const uint64_t evictions = CacheDeviceSnapshot(device).evictions;
    EXPECT_EQ(TestRead(device, 4 * kBlockBytes + 7, 3 * kBlockBytes),
              TestBytes(4 * kBlockBytes + 7, 3 * kBlockBytes));
    EXPECT_EQ(TestRead(device, 2 * kBlockBytes + 7, 3 * kBlockBytes),
              TestBytes(2 * kBlockBytes + 7, 3 * kBlockBytes));
    EXPECT_EQ(TestPinned(device), (Blocks{0, 1, 2, 3}));
    EXPECT_EQ(CacheDeviceSnapshot(device).evictions, evictions);
    // Released, they give way again.
    EXPECT_EQ(CacheDeviceUnpinRanges(device, {{0, 1}}), 0);
    TestTouch(device, {4});
    EXPECT_EQ(TestPinned(device), (Blocks{1, 2, 3, 4}));
}

TEST_F(CacheDevicePinTest, ANewBitmapUnpinsNothing) {
    SetBits({1, 2});
    TestTouch(device, {1, 2});
    SetBits({});
    Scan();
    EXPECT_EQ(TestPinned(device), (Blocks{1, 2}));
    EXPECT_TRUE(CacheDeviceIsBitmapSet(device));
}

TEST_F(CacheDevicePinTest, RangesAreRoundedOutwards) {
    SetBits({1, 2, 3, 4});
    const auto pinAll = [this] { TestTouch(device, {1, 2, 3, 4}); };
    pinAll();
    EXPECT_EQ(CacheDeviceUnpinRanges(device, {{3 * kBlockSectors - 1, 2}}), 0);
    EXPECT_EQ(TestPinned(device), (Blocks{1, 4}));
    pinAll();
    EXPECT_EQ(CacheDeviceUnpinRanges(device, {{3 * kBlockSectors - 1, 1}}), 0);
    EXPECT_EQ(TestPinned(device), (Blocks{1, 3, 4}));
    pinAll();
    EXPECT_EQ(CacheDeviceUnpinRanges(device, {{kBlockSectors, kBlockSectors}, {4 * 128 + 5, 1}}),
              0);
    EXPECT_EQ(TestPinned(device), (Blocks{2, 3}));
    pinAll();
    EXPECT_EQ(CacheDeviceUnpinRanges(device, {{0, kLastSector + 1}}), 0);
    EXPECT_TRUE(TestPinned(device).empty());
}

TEST_F(CacheDevicePinTest, ReleasedBlocksStayCachedAndMarked) {
    SetBits({1});
    TestTouch(device, {1});
    EXPECT_EQ(CacheDeviceUnpinRanges(device, {{kBlockSectors, 1}}), 0);
    EXPECT_EQ(TestCached(device), (Blocks{1}));
    TestTouch(device, {1}); // its bit is still set
    EXPECT_EQ(TestPinned(device), (Blocks{1}));
    SetBits({});
    EXPECT_EQ(CacheDeviceUnpinRanges(device, {{kBlockSectors, 1}}), 0);
    Scan();
    EXPECT_EQ(TestCached(device), (Blocks{28, 29, 30, 31}));
}

TEST_F(CacheDevicePinTest, ARangeWithoutSectorsReleasesNothing) {
    SetBits({1});
    TestTouch(device, {1});
    EXPECT_EQ(CacheDeviceUnpinRanges(device, {{kBlockSectors + 1, 0}}), 0);
    EXPECT_EQ(CacheDeviceUnpinRanges(device, {{kLastSector + 1, 0}}), 0);
    EXPECT_EQ(CacheDeviceUnpinRanges(device, {}), 0);
    EXPECT_EQ(TestPinned(device), (Blocks{1}));
}

TEST_F(CacheDevicePinTest, ARangePastTheEndChangesNothing) {
    SetBits({1, 2});
    TestTouch(device, {1, 2});
    ASSERT_EQ(CacheDeviceUnpinRanges(device, {{2 * kBlockSectors, 1}}), 0);
    const std::vector<SectorRange> bad = {{kLastSector, 2},
                                          {kLastSector + 1, 1},
                                          {kLastSector + 2, 0},
                                          {UINT64_MAX, 1},
                                          {1, UINT64_MAX},
                                          {UINT64_MAX, UINT64_MAX},
                                          {UINT64_MAX / 2 + 1, UINT64_MAX / 2 + 1}};
    for (const SectorRange &range : bad) {
        EXPECT_EQ(CacheDeviceUnpinRanges(device, {{kBlockSectors, 1}, range}), -EINVAL)
            << range.startSector << " " << range.sectorCount;
        EXPECT_EQ(TestPinned(device), (Blocks{1}));
    }
    const std::vector<SectorRange> last = CacheDeviceSnapshot(device).lastUnpin;
    ASSERT_EQ(last.size(), 1U); // that of the accepted request
    EXPECT_EQ(last[0].startSector, 2 * kBlockSectors);
    EXPECT_EQ(CacheDeviceUnpinRanges(device, {{kLastSector, 1}}), 0);
}

TEST_F(CacheDevicePinTest, UnpinAllDropsTheBitmap) {
    SetBits({1, 2, 3, 4});
    TestTouch(device, {1, 2, 3, 4});
    EXPECT_TRUE(CacheDeviceIsBitmapSet(device));
    CacheDeviceUnpinAll(device);
    EXPECT_FALSE(CacheDeviceIsBitmapSet(device));
    EXPECT_TRUE(CacheDeviceIsAllUnpinned(device));
    TestTouch(device, {1});
    EXPECT_TRUE(TestPinned(device).empty());
    Scan();
    EXPECT_EQ(TestCached(device), (Blocks{28, 29, 30, 31}));
}

TEST(CacheDeviceTailTest, BlocksPastTheBitmapAreNeverPinned) {
    TestDevice test(9 * kBlockBytes + 512, 10); // bitmap of 1 byte, 10 blocks
    EXPECT_EQ(CacheDeviceBitmapBytes(test.device), 1U);
    CacheDeviceSetBitmap(test.device, {0xFF});
    EXPECT_EQ(TestReadResult(test.device, 0, 10 * kBlockBytes), 9 * 65536 + 512);
    EXPECT_EQ(TestPinned(test.device), (Blocks{0, 1, 2, 3, 4, 5, 6, 7}));
    EXPECT_EQ(CacheDeviceUnpinRanges(test.device, {{9 * kBlockSectors, 1}}), 0);
    EXPECT_EQ(CacheDeviceUnpinRanges(test.device, {{9 * kBlockSectors, 2}}), -EINVAL);
}

TEST(CacheDeviceTailTest, ATinyDeviceHasAnEmptyBitmap) {
    TestDevice test(512, 1);
    EXPECT_EQ(CacheDeviceBitmapBytes(test.device), 0U);
    CacheDeviceSetBitmap(test.device, {});
    EXPECT_TRUE(CacheDeviceIsBitmapSet(test.device));
    EXPECT_EQ(TestRead(test.device, 0, 1000), TestBytes(0, 512));
    EXPECT_TRUE(CacheDeviceIsAllUnpinned(test.device));
}
} // namespace vesk
