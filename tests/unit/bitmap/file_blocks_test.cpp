#include "bitmap/file_blocks.h"

#include "bitmap/pin_bitmap.h"

#include <gtest/gtest.h>

#include <random>
#include <string>

namespace vesk {
namespace {
FileMappingEntry Extent(uint64_t deviceStart, uint64_t count) {
    FileMappingEntry entry{};
    entry.deviceStartSector = deviceStart;
    entry.numSectors = count;
    return entry;
}

FileMappingTable Table(const std::vector<FileMappingEntry> &entries) {
    FileMappingTable table;
    table.entries = entries;
    return table;
}

std::string Text(const BitRun &run) {
    return std::to_string(run.first) + "+" + std::to_string(run.count);
}

// "first+count ..."
std::string BlocksOf(const std::vector<FileMappingEntry> &entries) {
    std::string text;
    for (const BitRun &run : FileBlocksOf(Table(entries))) {
        text.append(text.empty() ? "" : " ").append(Text(run));
    }
    return text;
}
} // namespace

TEST(BitmapBlocksOfTest, ARangeIsRoundedOutwards) {
    EXPECT_EQ(Text(BitmapBlocksOf(0, 1)), "0+1");
    EXPECT_EQ(Text(BitmapBlocksOf(0, 128)), "0+1");
    EXPECT_EQ(Text(BitmapBlocksOf(0, 129)), "0+2");
    EXPECT_EQ(Text(BitmapBlocksOf(127, 1)), "0+1");
    EXPECT_EQ(Text(BitmapBlocksOf(127, 2)), "0+2");
    EXPECT_EQ(Text(BitmapBlocksOf(128, 256)), "1+2");
    EXPECT_EQ(Text(BitmapBlocksOf(1000, 5000)), "7+40");
}

TEST(BitmapBlocksOfTest, NoSectorsAreNoBlockWhereABlockBeginsAndOneWithin) {
    EXPECT_EQ(BitmapBlocksOf(128, 0).count, 0U);
    EXPECT_EQ(Text(BitmapBlocksOf(129, 0)), "1+1");
    EXPECT_EQ(Text(BitmapBlocksOf(0, 0)), "0+" + std::to_string(uint64_t{1} << 57));
}

TEST(FileBlocksTest, EachBlockIsThereOnceInOrder) {
    EXPECT_EQ(BlocksOf({}), "");
    EXPECT_EQ(BlocksOf({Extent(1280, 8), Extent(0, 8)}), "0+1 10+1");
    EXPECT_EQ(BlocksOf({Extent(0, 8), Extent(8, 8), Extent(120, 8)}), "0+1"); // one block's
    EXPECT_EQ(BlocksOf({Extent(0, 130), Extent(200, 8)}), "0+2");
    EXPECT_EQ(BlocksOf({Extent(0, 1280), Extent(256, 8)}), "0+10");   // within another
    EXPECT_EQ(BlocksOf({Extent(256, 128), Extent(384, 128)}), "2+2"); // side by side
    EXPECT_EQ(BlocksOf({Extent(256, 128), Extent(512, 128)}), "2+1 4+1");
    EXPECT_EQ(BlocksOf({Extent(128, 0), Extent(256, 128)}), "2+1");
}

TEST(FileBlocksTest, AreJustTheBitsThatMarkingSets) {
    std::mt19937 random(5); // NOLINT(cert-msc32-c,cert-msc51-cpp): the same files each time
    for (int round = 0; round < 300; ++round) {
        std::vector<FileMappingEntry> entries;
        std::vector<unsigned char> marked(64);
        PinBitmap bitmap{marked.data(), static_cast<uint32_t>(marked.size())};
        for (size_t left = random() % 10; left > 0; --left) {
            entries.push_back(Extent(random() % 60000, 1 + random() % 3000));
            BitmapSetRange(&bitmap, entries.back().deviceStartSector, entries.back().numSectors);
        }
        std::vector<unsigned char> set(64);
        uint64_t end = 0;
        bool isFirst = true;
        for (const BitRun &run : FileBlocksOf(Table(entries))) {
            ASSERT_GT(run.count, 0U);
            ASSERT_TRUE(isFirst || run.first > end) << "adjacent or out of order";
            isFirst = false;
            end = run.first + run.count;
            for (uint64_t bit = run.first; bit < end; ++bit) {
                unsigned char &byte = set[static_cast<size_t>(bit / 8)];
                byte = static_cast<unsigned char>(byte | 1U << bit % 8);
            }
        }
        ASSERT_EQ(set, marked);
    }
}
} // namespace vesk
