#include "bitmap/file_marking.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
using Messages = std::vector<std::string>;

const std::string kFile = "/volume1/photo/a.jpg";

class FileMarkingTest : public LeakCheckedTest {
protected:
    static void AnswerWith(int result, std::vector<FileMappingEntry> entries) {
        FakeAppliance::onLookup = [=](const std::string &, uint64_t, int,
                                      FileMappingTable &answer) {
            answer.entries = entries;
            return result;
        };
    }
    static void AnswerWithThreeExtents() {
        AnswerWith(
            0, {FakeExtent(0, 128, 0), FakeExtent(128, 10, 1150, 1), FakeExtent(138, 256, 384)});
    }
    int Add(uint32_t inode = 4711) {
        return BitmapAddFile(&bitmap, "/volume1", kFile, inode, &table);
    }
    int Unset(uint32_t inode = 4711) {
        return UnsetBitmapAndAppendUnpinInfos(nullptr, &bitmap, "/volume1", kFile, inode, &infos);
    }
    void ExpectBytes(unsigned char first, unsigned char second) {
        EXPECT_EQ(bytes[0], first);
        EXPECT_EQ(bytes[1], second);
    }
    void ExpectInfo(size_t index, uint64_t start, uint64_t count) {
        ASSERT_LT(index, infos.size());
        EXPECT_EQ(infos[index].startSector, start);
        EXPECT_EQ(infos[index].numSectors, count);
    }

    unsigned char bytes[2] = {0, 0};
    PinBitmap bitmap = {bytes, 2};
    FileMappingTable table;
    std::vector<UnpinInfo> infos;
};

using BitmapAddFileTest = FileMarkingTest;
using UnsetBitmapTest = FileMarkingTest;
} // namespace

TEST_F(BitmapAddFileTest, MarksEveryExtentTheUninitialisedOnesToo) {
    CapturedLog log;
    AnswerWithThreeExtents();
    EXPECT_EQ(Add(), 0);
    ExpectBytes(0x19, 0x03); // blocks 0, 8 and 9, 3 and 4
    EXPECT_EQ(log.Text(), "");
}

// A table of a file in many pieces is large: the one that the library fills is the caller's.
TEST_F(BitmapAddFileTest, HandsOverTheTableItself) {
    CapturedLog log;
    const FileMappingEntry *filled = nullptr;
    FakeAppliance::onLookup = [&filled](const std::string &, uint64_t, int,
                                        FileMappingTable &answer) {
        answer.entries = {FakeExtent(0, 128, 0), FakeExtent(128, 10, 1150)};
        filled = answer.entries.data();
        return 0;
    };
    EXPECT_EQ(Add(), 0);
    ASSERT_NE(filled, nullptr);
    EXPECT_EQ(table.entries.data(), filled);
}

TEST_F(BitmapAddFileTest, HandsOutTheExtents) {
    CapturedLog log;
    AnswerWithThreeExtents();
    table.entries.push_back(FakeExtent(9, 9, 9)); // replaced, not appended to
    EXPECT_EQ(Add(), 0);
    ASSERT_EQ(table.entries.size(), 3U);
    EXPECT_EQ(table.entries[1].fileStartSector, 128U);
    EXPECT_EQ(table.entries[1].numSectors, 10U);
    EXPECT_EQ(table.entries[1].deviceStartSector, 1150U);
    EXPECT_EQ(table.entries[1].flag, 1U);
}

TEST_F(UnsetBitmapTest, MakesRoomForAllRangesOfAFileAtOnce) {
    CapturedLog log;
    AnswerWith(0, std::vector<FileMappingEntry>(1000, FakeExtent(0, 128, 0)));
    EXPECT_EQ(Unset(), 0);
    EXPECT_EQ(infos.size(), 1000U);
    EXPECT_EQ(infos.capacity(), 1000U);
    AnswerWithThreeExtents();
    EXPECT_EQ(Unset(), 0);
    EXPECT_EQ(infos.size(), 1003U);
    EXPECT_EQ(infos.capacity(), 2000U);
}

TEST_F(FileMarkingTest, InodeIsHandedOnWhole) {
    CapturedLog log;
    std::vector<uint64_t> asked;
    FakeAppliance::onLookup = [&asked](const std::string &, uint64_t inode, int,
                                       FileMappingTable &answer) {
        asked.push_back(inode);
        answer.entries = {FakeExtent(0, 128, 0)};
        return 0;
    };
    EXPECT_EQ(Add(4294967294), 0);
    EXPECT_EQ(Unset(4294967293), 0);
    EXPECT_EQ(asked, (std::vector<uint64_t>{4294967294, 4294967293}));
}

TEST_F(BitmapAddFileTest, KeepsTheBitsOfOtherFiles) {
    CapturedLog log;
    bytes[1] = 0x40;
    AnswerWithThreeExtents();
    EXPECT_EQ(Add(), 0);
    ExpectBytes(0x19, 0x43);
}

TEST_F(BitmapAddFileTest, ExtentPastTheEndIsAppliedAsFarAsTheBitmapGoes) {
    CapturedLog log;
    AnswerWith(0, {FakeExtent(0, 10000, 15 * 128), FakeExtent(10000, 8, 1ULL << 40),
                   FakeExtent(10008, 1, 0)});
    EXPECT_EQ(Add(), 0);
    ExpectBytes(0x01, 0x80);
}

TEST_F(BitmapAddFileTest, FailedLookupLeavesBitmapAndTableUntouched) {
    CapturedLog log;
    table.entries.push_back(FakeExtent(9, 9, 9));
    AnswerWith(-1, {FakeExtent(0, 128, 0), FakeExtent(128, 128, 128)});
    EXPECT_EQ(Add(), -1);
    ExpectBytes(0, 0);
    EXPECT_EQ(table.entries.size(), 1U);
    EXPECT_EQ(log.Text(), "tool: Get mapping result fail.\n");
}

TEST_F(BitmapAddFileTest, FailedLookupIsToldAtLevel2WithoutTheErrorMarker) {
    CapturedLog log(2);
    AnswerWith(-1, {});
    EXPECT_EQ(Add(), -1);
    EXPECT_EQ(log.Messages(),
              (Messages{"BitmapAddFile() [N]: Add file (/volume1/photo/a.jpg) start",
                        "GetMappingTableFromFile() [N]: Start for file (/volume1/photo/a.jpg), "
                        "inode = 4711",
                        "GetMappingTableFromFile() [N] : ***** Get mapping result fail.",
                        "BitmapAddFile() [N]: Can't get mapping table of file "
                        "(/volume1/photo/a.jpg)"}));
}

TEST_F(BitmapAddFileTest, EveryExtentIsToldAtLevel3AndNoTimes) {
    AnswerWith(0, {FakeExtent(0, 8, 1024), FakeExtent(8, 16, 128)});
    CapturedLog log(3);
    EXPECT_EQ(Add(), 0);
    EXPECT_EQ(log.Messages(),
              (Messages{"BitmapAddFile() [N]: Add file (/volume1/photo/a.jpg) start",
                        "GetMappingTableFromFile() [N]: Start for file (/volume1/photo/a.jpg), "
                        "inode = 4711",
                        "GetMappingTableFromFile() [N]: Entry number = 2",
                        "BitmapAddFile() [N]: File [/volume1/photo/a.jpg] start sector=0 "
                        "num_sector=8 device_start sector =1024",
                        "", "BitmapOperation() [N]: Disk start sector=1024 num sectors=8", "",
                        "BitmapAddFile() [N]: File [/volume1/photo/a.jpg] start sector=8 "
                        "num_sector=16 device_start sector =128",
                        "", "BitmapOperation() [N]: Disk start sector=128 num sectors=16", "",
                        "BitmapAddFile() [N]: Add file (/volume1/photo/a.jpg) finish"}));
}

TEST_F(UnsetBitmapTest, ClearsEveryExtentAndAppendsItsRangeInOrder) {
    CapturedLog log;
    bytes[0] = bytes[1] = 0xFF;
    AnswerWithThreeExtents();
    EXPECT_EQ(Unset(), 0);
    ExpectBytes(0xE6, 0xFC);
    ASSERT_EQ(infos.size(), 3U);
    ExpectInfo(0, 0, 128);
    ExpectInfo(1, 1150, 10);
    ExpectInfo(2, 384, 256);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(UnsetBitmapTest, AppendsBehindTheRangesOfEarlierFiles) {
    CapturedLog log;
    infos.push_back({7, 7});
    AnswerWithThreeExtents();
    EXPECT_EQ(Unset(), 0);
    EXPECT_EQ(Unset(), 0);
    ASSERT_EQ(infos.size(), 7U);
    ExpectInfo(0, 7, 7);
    ExpectInfo(1, 0, 128);
    ExpectInfo(4, 0, 128);
}

TEST_F(UnsetBitmapTest, BlockThatTwoFilesShareIsCleared) {
    CapturedLog log;
    AnswerWith(0, {FakeExtent(0, 100, 0)});
    EXPECT_EQ(Add(), 0);
    AnswerWith(0, {FakeExtent(0, 20, 100)});
    EXPECT_EQ(Add(), 0);
    EXPECT_EQ(Unset(), 0);
    ExpectBytes(0, 0);
    ExpectInfo(0, 100, 20); // the range is the extent, not its blocks
}

TEST_F(UnsetBitmapTest, FailedLookupClearsAndAppendsNothing) {
    bytes[0] = 0xFF;
    AnswerWith(-1, {FakeExtent(0, 128, 0), FakeExtent(128, 128, 128)});
    CapturedLog log;
    EXPECT_EQ(Unset(), -1);
    ExpectBytes(0xFF, 0);
    EXPECT_TRUE(infos.empty());
    EXPECT_EQ(log.Text(), "tool: Get mapping result fail.\n"
                          "tool: Get mapping table of file (/volume1/photo/a.jpg) failed\n");
}

TEST_F(UnsetBitmapTest, EveryExtentIsToldAtLevel3) {
    AnswerWith(0, {FakeExtent(0, 8, 1024)});
    CapturedLog log(3);
    EXPECT_EQ(Unset(), 0);
    EXPECT_EQ(log.Messages(),
              (Messages{"GetMappingTableFromFile() [N]: Start for file (/volume1/photo/a.jpg), "
                        "inode = 4711",
                        "GetMappingTableFromFile() [N]: Entry number = 1",
                        "UnsetBitmapAndAppendUnpinInfos() [N]: File [/volume1/photo/a.jpg] start "
                        "sector=0 num_sector=8 device_start sector =1024",
                        "", "BitmapOperation() [N]: Disk start sector=1024 num sectors=8", ""}));
}

TEST_F(UnsetBitmapTest, FailureHasTheErrorMarker) {
    AnswerWith(-1, {});
    CapturedLog log(2);
    EXPECT_EQ(Unset(), -1);
    EXPECT_EQ(LastOf(log.Messages()), "UnsetBitmapAndAppendUnpinInfos() [N] : ***** Get mapping "
                                      "table of file (/volume1/photo/a.jpg) failed");
}
} // namespace vesk
