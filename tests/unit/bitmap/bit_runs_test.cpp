#include "bitmap/bit_runs.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <string>

namespace vesk {
namespace {
using Bytes = std::vector<unsigned char>;

const size_t kStretchBytes = 4096; // what one step looks at, at the most
const uint64_t kStretchBits = kStretchBytes * 8;

bool NaiveIsSet(const Bytes &bytes, uint64_t bit) {
    return bit / 8 < bytes.size() && (bytes[static_cast<size_t>(bit / 8)] & 1U << bit % 8) != 0;
}

// Bit by bit.
std::vector<BitRun> NaiveRuns(const Bytes &bytes) {
    std::vector<BitRun> runs;
    for (uint64_t bit = 0; bit < bytes.size() * 8; ++bit) {
        if (!NaiveIsSet(bytes, bit)) {
            continue;
        }
        if (bit == 0 || !NaiveIsSet(bytes, bit - 1)) {
            runs.push_back({bit, 0});
        }
        ++runs.back().count;
    }
    return runs;
}

// Runs as text, "first+count ...".
std::string Text(const std::vector<BitRun> &runs) {
    std::string text;
    for (const BitRun &run : runs) {
        text +=
            (text.empty() ? "" : " ") + std::to_string(run.first) + "+" + std::to_string(run.count);
    }
    return text;
}

std::string RunsOf(const Bytes &bytes) {
    return Text(BitRunsOf(bytes.data(), bytes.size()));
}

// Stretches of equal bytes and of any bytes; some longer than a step's.
Bytes RandomBytes(std::mt19937 &random, size_t size, size_t longest) {
    Bytes bytes;
    while (bytes.size() < size) {
        const size_t kind = random() % 5;
        const size_t stretch = std::min(size - bytes.size(), 1 + random() % longest);
        for (size_t i = 0; i < stretch; ++i) {
            const unsigned choice[] = {0x00, 0xFF, 0x0F, 0xAA, static_cast<unsigned>(random())};
            bytes.push_back(static_cast<unsigned char>(choice[kind]));
        }
    }
    return bytes;
}

// Goes through the bits step by step and checks every step against the single bits.
void ExpectStepsFit(const Bytes &bytes) {
    BitScan scan{bytes.data(), bytes.size()};
    std::vector<BitRun> runs;
    while (true) {
        const uint64_t before = scan.next;
        BitRun run{7, 7};
        const bool more = BitScanStep(scan, run);
        if (run.count > 0) {
            // Its end was seen just now: by the first bit of this step, or by the end.
            EXPECT_EQ(run.first + run.count, before);
            runs.push_back(run);
        }
        if (!more) {
            EXPECT_EQ(before, bytes.size() * 8);
            EXPECT_EQ(scan.next, before);
            break;
        }
        ASSERT_GT(scan.next, before);
        ASSERT_LE(scan.next - before, kStretchBits);
        for (uint64_t bit = before; bit < scan.next; ++bit) {
            ASSERT_EQ(NaiveIsSet(bytes, bit), NaiveIsSet(bytes, before)) << "not a stretch";
        }
    }
    EXPECT_EQ(Text(runs), Text(NaiveRuns(bytes)));
    BitRun run{7, 7};
    EXPECT_FALSE(BitScanStep(scan, run)) << "behind the end";
    EXPECT_EQ(run.count, 0U) << "behind the end";
}
} // namespace

TEST(BitRunsTest, LeastSignificantBitComesFirst) {
    const Bytes bytes = {0x01, 0x80, 0x00};
    for (uint64_t bit = 0; bit < 24; ++bit) {
        EXPECT_EQ(BitIsSet(bytes.data(), bytes.size(), bit), bit == 0 || bit == 15) << bit;
    }
}

TEST(BitRunsTest, PastTheEndNothingIsSet) {
    const unsigned char byte = 0xFF;
    EXPECT_FALSE(BitIsSet(&byte, 1, 8));
    EXPECT_FALSE(BitIsSet(&byte, 1, UINT64_MAX));
    EXPECT_FALSE(BitIsSet(nullptr, 0, 0));
}

TEST(BitRunsTest, FindsRuns) {
    EXPECT_EQ(Text(BitRunsOf(nullptr, 0)), "");
    EXPECT_EQ(RunsOf({0x00, 0x00}), "");
    EXPECT_EQ(RunsOf({0xFF, 0xFF}), "0+16");
    EXPECT_EQ(RunsOf({0x01}), "0+1");
    EXPECT_EQ(RunsOf({0x80}), "7+1");
    EXPECT_EQ(RunsOf({0x80, 0x01}), "7+2");
    EXPECT_EQ(RunsOf({0xC0, 0xFF, 0x03, 0x00, 0x10}), "6+12 36+1");
    EXPECT_EQ(RunsOf({0x55}), "0+1 2+1 4+1 6+1");
    EXPECT_EQ(RunsOf(Bytes(3 * kStretchBytes + 5, 0xFF)), "0+" + std::to_string(98344));
}

TEST(BitRunsTest, AgreesWithTheSingleBits) {
    std::mt19937 random(1);
    for (int round = 0; round < 400; ++round) {
        const Bytes bytes = RandomBytes(random, random() % 40, 6);
        ASSERT_EQ(RunsOf(bytes), Text(NaiveRuns(bytes))) << round;
        for (uint64_t bit = 0; bit < bytes.size() * 8 + 9; ++bit) {
            ASSERT_EQ(BitIsSet(bytes.data(), bytes.size(), bit), NaiveIsSet(bytes, bit)) << round;
        }
    }
}

TEST(BitRunsTest, StepsAreShortStretchesOfEqualBits) {
    std::mt19937 random(2);
    for (const size_t size : {size_t{0}, size_t{1}, size_t{7}, kStretchBytes - 1, kStretchBytes,
                              kStretchBytes + 1, 4 * kStretchBytes + 3}) {
        ExpectStepsFit(Bytes(size, 0x00));
        ExpectStepsFit(Bytes(size, 0xFF));
        ExpectStepsFit(Bytes(size, 0x18));
        for (int round = 0; round < 10; ++round) {
            ExpectStepsFit(RandomBytes(random, size, 2 * kStretchBytes));
            ExpectStepsFit(RandomBytes(random, size, 9));
        }
    }
}

TEST(BitRunsTest, AStepTakesWholeStretchesOfBytes) {
    const Bytes bytes(8 * kStretchBytes, 0xFF);
    BitScan scan{bytes.data(), bytes.size()};
    BitRun run{0, 0};
    int steps = 0;
    while (BitScanStep(scan, run)) {
        ++steps;
    }
    EXPECT_EQ(steps, 8);
    EXPECT_EQ(run.count, bytes.size() * 8);
}

TEST(BitCountTest, OnlySetBitsOfTheRunCountAndNonePastTheEnd) {
    const Bytes bytes{0x81, 0xFF, 0x00, 0x10};
    const auto count = [&](uint64_t first, uint64_t bits) {
        return BitCountIn(bytes.data(), bytes.size(), {first, bits});
    };
    EXPECT_EQ(count(0, 32), 11U);
    EXPECT_EQ(count(0, 1), 1U);
    EXPECT_EQ(count(0, 0), 0U);
    EXPECT_EQ(count(1, 6), 0U);
    EXPECT_EQ(count(7, 2), 2U);
    EXPECT_EQ(count(28, UINT64_MAX), 1U);
    EXPECT_EQ(count(29, UINT64_MAX), 0U);
    EXPECT_EQ(count(32, 1), 0U);
    EXPECT_EQ(count(UINT64_MAX, UINT64_MAX), 0U);
    EXPECT_EQ(BitCountIn(nullptr, 0, {0, 5}), 0U);
}

TEST(BitCountTest, AgreesWithCountingBitByBit) {
    std::mt19937 random(11); // NOLINT(cert-msc32-c,cert-msc51-cpp): the same bytes each time
    for (int round = 0; round < 500; ++round) {
        const Bytes bytes = RandomBytes(random, random() % 40, 5);
        const BitRun run{random() % 340, random() % 340};
        uint64_t expected = 0;
        for (uint64_t bit = run.first; bit < run.first + run.count; ++bit) {
            expected += NaiveIsSet(bytes, bit) ? 1 : 0;
        }
        ASSERT_EQ(BitCountIn(bytes.data(), bytes.size(), run), expected);
    }
}
} // namespace vesk
