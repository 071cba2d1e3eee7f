#include "bitmap/pin_bitmap.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"

#include <cstdlib>
#include <gtest/gtest.h>
#include <random>

namespace vesk {
namespace {
using Bytes = std::vector<unsigned char>;
using Messages = std::vector<std::string>;

const uint64_t kMostSectors = UINT64_MAX;

// The bitmap's bytes after the operation, which must keep to them.
Bytes After(const Bytes &before, uint64_t startSector, uint64_t numSectors, int op) {
    const size_t guard = 8;
    Bytes memory(before.size() + 2 * guard, 0xA5);
    std::copy(before.begin(), before.end(), memory.begin() + guard);
    PinBitmap bitmap = {memory.data() + guard, static_cast<uint32_t>(before.size())};
    EXPECT_EQ(BitmapOperation(&bitmap, startSector, numSectors, op), 0);
    for (size_t i = 0; i < guard; ++i) {
        EXPECT_EQ(memory[i], 0xA5);
        EXPECT_EQ(memory[memory.size() - 1 - i], 0xA5);
    }
    return Bytes(memory.begin() + guard, memory.end() - guard);
}

Bytes Set(const Bytes &before, uint64_t startSector, uint64_t numSectors) {
    return After(before, startSector, numSectors, 1);
}

Bytes Cleared(const Bytes &before, uint64_t startSector, uint64_t numSectors) {
    return After(before, startSector, numSectors, 0);
}

// The same, bit by bit: every block from the first sector's to the last sector's.
Bytes Model(Bytes bytes, uint64_t startSector, uint64_t numSectors, int op) {
    const uint64_t first = startSector / 128;
    const uint64_t last = (startSector + numSectors - 1) / 128;
    for (size_t bit = 0; bit < bytes.size() * 8; ++bit) {
        if (bit < first || bit > last) {
            continue;
        }
        const auto mask = static_cast<unsigned char>(1U << bit % 8);
        unsigned char &byte = bytes[bit / 8];
        byte = static_cast<unsigned char>(op == 1 ? byte | mask : byte & ~mask);
    }
    return bytes;
}

using PinBitmapTest = LeakCheckedTest;

PinBitmap *NewBitmap(unsigned char *data, uint32_t size) {
    auto *bitmap = static_cast<PinBitmap *>(calloc(1, sizeof(PinBitmap)));
    *bitmap = {data, size};
    return bitmap;
}
} // namespace

TEST_F(PinBitmapTest, BlockIsTheFirst128SectorsInTheLowestBit) {
    EXPECT_EQ(Set({0, 0}, 0, 128), (Bytes{0x01, 0}));
    EXPECT_EQ(Set({0, 0}, 0, 1), (Bytes{0x01, 0}));
    EXPECT_EQ(Set({0, 0}, 127, 1), (Bytes{0x01, 0}));
    EXPECT_EQ(Set({0, 0}, 128, 1), (Bytes{0x02, 0}));
    EXPECT_EQ(Set({0, 0}, 1023, 1), (Bytes{0x80, 0}));
    EXPECT_EQ(Set({0, 0}, 1024, 1), (Bytes{0, 0x01}));
}

TEST_F(PinBitmapTest, RangeIsRoundedOutwardsToWholeBlocks) {
    EXPECT_EQ(Set({0, 0}, 127, 2), (Bytes{0x03, 0}));
    EXPECT_EQ(Set({0, 0}, 200, 1000), (Bytes{0xFE, 0x03}));
    EXPECT_EQ(Cleared({0xFF, 0xFF}, 127, 2), (Bytes{0xFC, 0xFF}));
}

TEST_F(PinBitmapTest, WholeBytesInBetweenAreFilled) {
    EXPECT_EQ(Set({0, 0, 0, 0}, 7 * 128, 18 * 128), (Bytes{0x80, 0xFF, 0xFF, 0x01}));
    EXPECT_EQ(Cleared({0xFF, 0xFF, 0xFF, 0xFF}, 7 * 128, 18 * 128), (Bytes{0x7F, 0, 0, 0xFE}));
}

TEST_F(PinBitmapTest, ClearingARangeThatSharesABlockClearsTheOthersBitToo) {
    const Bytes twoFiles = Set(Set({0}, 0, 130), 130, 100); // both use sectors of block 1
    EXPECT_EQ(twoFiles, Bytes{0x03});
    EXPECT_EQ(Cleared(twoFiles, 130, 100), Bytes{0x01});
}

TEST_F(PinBitmapTest, OtherBitsStayAsTheyAre) {
    EXPECT_EQ(Set({0x50, 0x0A}, 0, 128), (Bytes{0x51, 0x0A}));
    EXPECT_EQ(Cleared({0x51, 0x0A}, 0, 128), (Bytes{0x50, 0x0A}));
}

TEST_F(PinBitmapTest, EveryOperationButOneClears) {
    for (const int op : {0, 2, -1, 0x101}) {
        EXPECT_EQ(After({0xFF}, 128, 128, op), Bytes{0xFD});
    }
}

TEST_F(PinBitmapTest, NoSectorsFromABlocksStartTouchNothing) {
    EXPECT_EQ(Set({0, 0}, 128, 0), (Bytes{0, 0}));
    EXPECT_EQ(Cleared({0xFF, 0xFF}, 1024, 0), (Bytes{0xFF, 0xFF}));
}

TEST_F(PinBitmapTest, NoSectorsFromWithinABlockTouchThatBlock) {
    EXPECT_EQ(Set({0, 0}, 129, 0), (Bytes{0x02, 0}));
    EXPECT_EQ(Set({0, 0}, 255, 0), (Bytes{0x02, 0}));
    EXPECT_EQ(Cleared({0xFF, 0xFF}, 1, 0), (Bytes{0xFE, 0xFF}));
}

TEST_F(PinBitmapTest, NoSectorsFromSector0WrapToEveryBlock) {
    EXPECT_EQ(Set({0, 0}, 0, 0), (Bytes{0xFF, 0xFF}));
}

TEST_F(PinBitmapTest, BitsPastTheEndAreIgnoredAndThoseBeforeItApplied) {
    EXPECT_EQ(Set({0, 0}, 15 * 128, 100 * 128), (Bytes{0, 0x80}));
    EXPECT_EQ(Set({0, 0}, 16 * 128, 1), (Bytes{0, 0}));
    EXPECT_EQ(Set({0, 0}, kMostSectors, 1), (Bytes{0, 0}));
    EXPECT_EQ(Cleared({0xFF, 0xFF}, 15 * 128, kMostSectors - 15 * 128), (Bytes{0xFF, 0x7F}));
}

TEST_F(PinBitmapTest, HugeCountsReturnAtOnce) {
    const Bytes large(1 << 20, 0);
    EXPECT_EQ(Set(large, 0, kMostSectors), Bytes(1 << 20, 0xFF));
    EXPECT_EQ(Cleared(Bytes(1 << 20, 0xFF), 0, kMostSectors), large);
    EXPECT_EQ(Set({0}, 0, 1ULL << 63), Bytes{0xFF});
}

TEST_F(PinBitmapTest, RangeWhoseEndWrapsTouchesNothing) {
    EXPECT_EQ(Set({0, 0}, 256, kMostSectors), (Bytes{0, 0}));
    EXPECT_EQ(Set({0, 0}, kMostSectors - 5, 300), (Bytes{0, 0}));
}

TEST_F(PinBitmapTest, EmptyBitmapIsLeftAlone) {
    PinBitmap empty = {nullptr, 0};
    EXPECT_EQ(BitmapSetRange(&empty, 0, kMostSectors), 0);
    EXPECT_EQ(BitmapUnsetRange(&empty, 0, 0), 0);
}

TEST_F(PinBitmapTest, SetAndUnsetAreTheTwoOperations) {
    unsigned char byte = 0;
    PinBitmap bitmap = {&byte, 1};
    EXPECT_EQ(BitmapSetRange(&bitmap, 0, 1024), 0);
    EXPECT_EQ(byte, 0xFF);
    EXPECT_EQ(BitmapUnsetRange(&bitmap, 128, 256), 0);
    EXPECT_EQ(byte, 0xF9);
}

TEST_F(PinBitmapTest, AgreesWithTheModelAtBothEndsOfALargeBitmap) {
    const Bytes before(10000);
    for (uint64_t block = 0; block < 200; ++block) {
        for (const uint64_t at : {block, before.size() * 8 - 1 - block}) {
            ASSERT_EQ(After(before, at * 128, 1, 1), Model(before, at * 128, 1, 1)) << at;
        }
    }
}

TEST_F(PinBitmapTest, AgreesWithTheModelOnRandomRanges) {
    std::mt19937_64 random(20180608);
    const auto below = [&random](uint64_t limit) { return random() % limit; };
    for (int i = 0; i < 20000; ++i) {
        Bytes before(static_cast<size_t>(below(40)));
        for (unsigned char &byte : before) {
            byte = static_cast<unsigned char>(random());
        }
        const uint64_t sectors = before.size() * 1024 + 1;
        // Mostly near the bitmap, at times anywhere, at times close to the 64-bit wrap.
        const uint64_t starts[] = {below(sectors), below(2 * sectors), random(),
                                   kMostSectors - below(1024)};
        const uint64_t counts[] = {below(300), below(sectors), random(), kMostSectors - below(2048),
                                   0};
        const uint64_t start = starts[below(4)];
        const uint64_t count = counts[below(5)];
        const int op = static_cast<int>(below(3)) - 1;
        ASSERT_EQ(After(before, start, count, op), Model(before, start, count, op))
            << "start " << start << " count " << count << " op " << op << " bytes "
            << before.size();
    }
}

TEST_F(PinBitmapTest, RangeIsToldAtLevel3) {
    CapturedLog silent(2);
    Set({0}, 128, 256);
    EXPECT_EQ(silent.Text(), "");
    CapturedLog log(3);
    Set({0}, kMostSectors, 256);
    EXPECT_EQ(log.Messages(),
              (Messages{"BitmapOperation() [N]: Disk start sector=18446744073709551615 num "
                        "sectors=256",
                        ""}));
}

TEST_F(PinBitmapTest, FreeReleasesBytesAndRecord) { // the address sanitizer tells of a leak
    CapturedLog log(3);
    BitmapFree(NewBitmap(static_cast<unsigned char *>(malloc(16)), 16));
    EXPECT_EQ(log.Text(), "");
}

TEST_F(PinBitmapTest, FreeOfNullIsAnError) {
    CapturedLog log(2);
    BitmapFree(nullptr);
    EXPECT_EQ(log.Messages(), Messages{"BitmapFree() [N] : ***** Bitmap is already NULL"});
}

TEST_F(PinBitmapTest, FreeOfNullBytesIsAnErrorAndReleasesTheRecord) {
    CapturedLog log(2);
    BitmapFree(NewBitmap(nullptr, 16));
    EXPECT_EQ(log.Messages(), Messages{"BitmapFree() [N] : ***** Warning: data is NULL for free"});
}
} // namespace vesk
