#include "tests/unit/verbs/records.h"
#include "verbs/plan_figures.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
class PlanSumTest : public ::testing::Test {
protected:
    WorldVolume volume_ = MakeVolume();
};

// A relative path of so many bytes that is nobody else's.
std::string Name(size_t bytes, int number) {
    std::string name = std::to_string(number);
    return name + std::string(bytes - name.size(), 'x');
}
} // namespace

TEST_F(PlanSumTest, NothingCostsNothing) {
    const PlanFigures figures = PlanSum(volume_).Total(0);
    EXPECT_EQ(figures.files, 0U);
    EXPECT_EQ(figures.blocks, 0U);
    EXPECT_EQ(figures.blocksNew, 0U);
    EXPECT_EQ(figures.roundingBytes, 0);
    EXPECT_EQ(figures.ssdBlocks, 32U);
    EXPECT_EQ(figures.marked, 0U);
    EXPECT_EQ(figures.headroom, 32);
    EXPECT_EQ(figures.fits, true);
    EXPECT_EQ(figures.requests, 0U);
    EXPECT_EQ(figures.seconds, 0U);
}

TEST_F(PlanSumTest, AFileCostsItsBlocks) {
    PlanSum sum(volume_);
    EXPECT_TRUE(sum.Add("a", MakeLook(7, {{0, 256}, {1288, 8}}, 135000), false));
    const PlanFigures figures = sum.Total(0);
    EXPECT_EQ(figures.files, 1U);
    EXPECT_EQ(figures.bytes, 135000U);
    EXPECT_EQ(figures.extents, 2U);
    EXPECT_EQ(figures.blocks, 3U);
    EXPECT_EQ(figures.blocksNew, 3U);
    EXPECT_EQ(figures.roundingBytes, 65536 - 8 * 512);
    EXPECT_EQ(figures.headroom, 29);
    EXPECT_EQ(figures.requests, 1U);
    EXPECT_EQ(figures.seconds, 1U);
}

TEST_F(PlanSumTest, ABlockThatFilesShareCostsOnceAndWastesOnlyWhatNobodyHas) {
    PlanSum sum(volume_);
    EXPECT_TRUE(sum.Add("a", MakeLook(7, {{1280, 8}}), false));
    EXPECT_TRUE(sum.Add("b", MakeLook(8, {{1288, 8}}), false));
    EXPECT_TRUE(sum.Add("c", MakeLook(9, {{1288, 8}, {1408, 128}}), false)); // shares an extent
    const PlanFigures figures = sum.Total(0);
    EXPECT_EQ(figures.files, 3U);
    EXPECT_EQ(figures.extents, 4U);
    EXPECT_EQ(figures.blocks, 2U);
    EXPECT_EQ(figures.blocksNew, 2U);
    EXPECT_EQ(figures.roundingBytes, (128 - 16) * 512);
}

TEST_F(PlanSumTest, AnotherPathOfTheSameFileIsNotTaken) {
    PlanSum sum(volume_);
    EXPECT_TRUE(sum.Add("a", MakeLook(7, {{0, 8}}, 5), false));
    EXPECT_FALSE(sum.Add("b", MakeLook(7, {{0, 8}}, 5), false));
    EXPECT_FALSE(sum.Add("c", MakeLook(0x100000007, {{1280, 8}}, 5), false)); // as records hold it
    const PlanFigures figures = sum.Total(0);
    EXPECT_EQ(figures.files, 1U);
    EXPECT_EQ(figures.bytes, 5U);
    EXPECT_EQ(figures.blocks, 1U);
    EXPECT_EQ(figures.requests, 1U);
}

TEST_F(PlanSumTest, WhatIsMarkedAlreadyIsNotNew) {
    BlockSetAdd(&*volume_.volume.marked, {1, 20});
    PlanSum sum(volume_);
    sum.Add("a", MakeLook(7, {{0, 384}}), false); // blocks 0 to 2
    const PlanFigures figures = sum.Total(0);
    EXPECT_EQ(figures.blocks, 3U);
    EXPECT_EQ(figures.blocksNew, 1U);
    EXPECT_EQ(figures.marked, 20U);
    EXPECT_EQ(figures.headroom, 32 - 20 - 1);
}

TEST_F(PlanSumTest, TheReserveIsRoundedUpAndRoomMayEndExactly) {
    volume_.volume.ssdBlocks = 31;
    BlockSetAdd(&*volume_.volume.marked, {0, 26});
    PlanSum sum(volume_);
    sum.Add("a", MakeLook(7, {{40 * 128, 128}}), false);
    EXPECT_EQ(sum.Total(0).headroom, 4);
    EXPECT_EQ(sum.Total(1).headroom, 3);  // 0.31 of a block
    EXPECT_EQ(sum.Total(10).headroom, 0); // 3.1 of them
    EXPECT_EQ(sum.Total(10).fits, true);
    EXPECT_EQ(sum.Total(13).headroom, -1); // 4.03
    EXPECT_EQ(sum.Total(13).fits, false);
    EXPECT_EQ(sum.Total(100).headroom, -27);
    volume_.volume.ssdBlocks = 30; // a tenth of it is whole
    EXPECT_EQ(sum.Total(10).headroom, 0);
}

TEST_F(PlanSumTest, StoredPinsTakeRoomWhereTheyAreNeitherMarkedNorPlanned) {
    BlockSetAdd(&*volume_.volume.marked, {0, 2});
    volume_.known.requests = 4;
    PlanSum sum(volume_);
    sum.Add("a", MakeLook(7, {{256, 256}}), false);   // blocks 2 and 3
    sum.AddStored(MakeLook(8, {{128, 128 * 5}}));     // 1 to 5
    sum.AddStored(MakeLook(9, {{5 * 128, 128 * 2}})); // 5 and 6
    const PlanFigures figures = sum.Total(0);
    EXPECT_EQ(figures.files, 1U);
    EXPECT_EQ(figures.blocks, 2U);
    EXPECT_EQ(figures.blocksNew, 2U);
    EXPECT_EQ(figures.headroom, 32 - 2 - 2 - 3);
    EXPECT_EQ(figures.seconds, 5U); // those that are stored go first
}

TEST_F(PlanSumTest, WhatIsPinnedIsCountedAndNotSent) {
    PlanSum sum(volume_);
    EXPECT_TRUE(sum.Add("a", MakeLook(7, {{0, uint64_t{400} << 11}}, 5), true));
    PlanFigures figures = sum.Total(0);
    EXPECT_EQ(figures.files, 1U);
    EXPECT_EQ(figures.requests, 0U);
    EXPECT_EQ(figures.seconds, 0U);
    EXPECT_TRUE(sum.Add("b", MakeLook(8, {{0, 8}}, 5), false));
    figures = sum.Total(0);
    EXPECT_EQ(figures.files, 2U);
    EXPECT_EQ(figures.requests, 1U);
    EXPECT_EQ(figures.seconds, 1U);
}

TEST_F(PlanSumTest, ReadingTakesItsTime) {
    PlanSum sum(volume_);
    sum.Add("a", MakeLook(7, {{0, uint64_t{250} << 11}}), false); // 250 MiB
    EXPECT_EQ(sum.Total(0).seconds, 1U + 2);
    sum.Add("b", MakeLook(8, {{uint64_t{250} << 11, uint64_t{50} << 11}}), false);
    EXPECT_EQ(sum.Total(0).seconds, 1U + 3);
}

// Below "/volume1": 9 bytes of each path are the mount path's and a "/".
TEST_F(PlanSumTest, RequestsAreFilledUpToTheirLastByteOfPaths) {
    PlanSum sum(volume_);
    int number = 1;
    const auto add = [&](size_t pathBytes) {
        sum.Add(Name(pathBytes - 9, number), MakeLook(static_cast<uint64_t>(number), {{0, 8}}),
                false);
        ++number;
        return sum.Total(0).requests;
    };
    EXPECT_EQ(add(500), 1U);
    EXPECT_EQ(add(511), 1U);
    EXPECT_EQ(add(10), 1U); // 500 + 1 + 511 + 1 + 10 = 1023
    EXPECT_EQ(add(10), 2U);
    EXPECT_EQ(add(512), 2U);
    EXPECT_EQ(add(500), 3U); // 10 + 1 + 512 + 1 + 500 = 1024
    EXPECT_EQ(add(400), 3U);
}

TEST_F(PlanSumTest, RequestsAreFilledUpToTheirLastByteOfTheList) {
    volume_ = MakeVolume("/v");
    PlanSum sum(volume_);
    uint64_t inode = 4000000000; // ten digits, more than the mount path
    int number = 0;
    const auto add = [&](size_t entryBytes) {
        sum.Add(Name(entryBytes - 11, ++number), MakeLook(++inode, {{0, 8}}), false);
        return sum.Total(0).requests;
    };
    EXPECT_EQ(add(500), 1U);
    EXPECT_EQ(add(522), 1U); // 500 + 1 + 522 = 1023
    EXPECT_EQ(add(20), 2U);
    EXPECT_EQ(add(500), 2U);
    EXPECT_EQ(add(502), 3U); // 20 + 1 + 500 + 1 + 502 = 1024
}

TEST_F(PlanSumTest, WithoutMarksNothingCanBeSaidOfTheRoom) {
    volume_.volume.marked = std::nullopt;
    PlanSum sum(volume_);
    sum.Add("a", MakeLook(7, {{0, 8}}), false);
    const PlanFigures figures = sum.Total(10);
    EXPECT_EQ(figures.blocks, 1U);
    EXPECT_EQ(figures.ssdBlocks, 32U);
    EXPECT_EQ(figures.marked, std::nullopt);
    EXPECT_EQ(figures.headroom, std::nullopt);
    EXPECT_EQ(figures.fits, std::nullopt);
}

TEST_F(PlanSumTest, AnSsdOfUnknownSizeHasNoRoomThatIsKnown) {
    volume_.volume.ssdBlocks = std::nullopt;
    PlanSum sum(volume_);
    sum.Add("a", MakeLook(7, {{0, 8}}), false);
    const PlanFigures figures = sum.Total(10);
    EXPECT_EQ(figures.blocksNew, 1U);
    EXPECT_EQ(figures.marked, 0U);
    EXPECT_EQ(figures.ssdBlocks, std::nullopt);
    EXPECT_EQ(figures.headroom, std::nullopt);
    EXPECT_EQ(figures.fits, std::nullopt);
}

TEST_F(PlanSumTest, BlocksThatTheBitmapDoesNotHoldCostNothingNew) {
    // A device of 70 blocks and a bit more has a bitmap of 8 bytes.
    volume_.volume.deviceBytes = 70 * 65536 + 4096;
    PlanSum sum(volume_);
    sum.Add("a", MakeLook(7, {{63 * 128, 128 * 7 + 8}}), false); // blocks 63 to 70
    const PlanFigures figures = sum.Total(0);
    EXPECT_EQ(figures.blocks, 8U);
    EXPECT_EQ(figures.blocksNew, 1U);
}

TEST_F(PlanSumTest, OfADeviceOfUnknownSizeNoBlocksAreCounted) {
    volume_.volume.deviceBytes = std::nullopt;
    volume_.volume.marked = std::nullopt;
    PlanSum sum(volume_);
    sum.Add("a", MakeLook(7, {{1280, 8}}), false);
    const PlanFigures figures = sum.Total(0);
    EXPECT_EQ(figures.files, 1U);
    EXPECT_EQ(figures.blocks, std::nullopt);
    EXPECT_EQ(figures.blocksNew, std::nullopt);
    EXPECT_EQ(figures.roundingBytes, std::nullopt);
    EXPECT_EQ(&sum.World(), &volume_);
}
} // namespace vesk
