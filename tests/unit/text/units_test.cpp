#include "text/units.h"

#include <gtest/gtest.h>

namespace vesk {
TEST(UnitsTest, BytesAreRoundedToTheUnitThatNeedsFewestDigits) {
    const std::pair<uint64_t, const char *> sizes[] = {
        {0, "0 B"},
        {1023, "1023 B"},
        {1024, "1.0 KiB"},
        {1075, "1.0 KiB"},
        {1076, "1.1 KiB"},
        {10188, "9.9 KiB"}, // 9.949
        {10189, "10 KiB"},  // 9.950
        {10240, "10 KiB"},
        {1048063, "1023 KiB"}, // 1023.499
        {1048064, "1.0 MiB"},  // 1023.5
        {1048576, "1.0 MiB"},
        {1310720, "1.2 MiB"}, // half way: to the even digit
        {1310721, "1.3 MiB"},
        {65536, "64 KiB"},
        {uint64_t{12} << 30, "12 GiB"},
        {uint64_t{1} << 40, "1.0 TiB"},
        {uint64_t{1} << 50, "1.0 PiB"},
        {uint64_t{1} << 60, "1.0 EiB"},
        {UINT64_MAX, "16 EiB"},
    };
    for (const auto &[bytes, expected] : sizes) {
        EXPECT_EQ(UnitsOfBytes(bytes), expected) << bytes;
    }
}

TEST(UnitsTest, SecondsAreShownWithAtMostTwoUnits) {
    const std::pair<uint64_t, const char *> times[] = {
        {0, "0 s"},
        {59, "59 s"},
        {60, "1 min 0 s"},
        {200, "3 min 20 s"},
        {3599, "59 min 59 s"},
        {3600, "1 h 0 min"},
        {7500, "2 h 5 min"},
        {360000, "100 h 0 min"},
    };
    for (const auto &[seconds, expected] : times) {
        EXPECT_EQ(UnitsOfSeconds(seconds), expected) << seconds;
    }
}

TEST(UnitsTest, WhatCannotBeHadIsADash) {
    EXPECT_EQ(UnitsOfCount(std::nullopt), "-");
    EXPECT_EQ(UnitsOfCount(0), "0");
    EXPECT_EQ(UnitsOfCount(UINT64_MAX), "18446744073709551615");
    EXPECT_EQ(UnitsOfAnswer(std::nullopt), "-");
    EXPECT_EQ(UnitsOfAnswer(true), "yes");
    EXPECT_EQ(UnitsOfAnswer(false), "no");
}

TEST(UnitsTest, OnlyOneThingIsSingular) {
    EXPECT_EQ(UnitsOfThings(0, "file"), "0 files");
    EXPECT_EQ(UnitsOfThings(1, "file"), "1 file");
    EXPECT_EQ(UnitsOfThings(2, "request"), "2 requests");
}
} // namespace vesk
