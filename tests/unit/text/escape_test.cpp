#include "text/escape.h"

#include "text/utf8.h"

#include <gtest/gtest.h>

#include <set>

namespace vesk {
namespace {
std::string Encoded(int32_t number) {
    const auto byte = [](int32_t value) { return static_cast<char>(value); };
    if (number < 0x80) {
        return {byte(number)};
    }
    if (number < 0x800) {
        return {byte(0xC0 | number >> 6), byte(0x80 | (number & 63))};
    }
    if (number < 0x10000) {
        return {byte(0xE0 | number >> 12), byte(0x80 | (number >> 6 & 63)),
                byte(0x80 | (number & 63))};
    }
    return {byte(0xF0 | number >> 18), byte(0x80 | (number >> 12 & 63)),
            byte(0x80 | (number >> 6 & 63)), byte(0x80 | (number & 63))};
}
} // namespace

TEST(EscapeTest, WhatAPersonCanReadStaysAsItIs) {
    for (const char *text : {"", "/volume1/share/a b.txt", "~!\"#$%&'()*+,-./:;<=>?@[]^_`{|}",
                             "gr\xC3\xB6\xC3\x9F"
                             "e",
                             "\xE5\x86\x99\xE7\x9C\x9F", "\xF0\x9F\x93\xB7"}) {
        EXPECT_EQ(TextEscaped(text), text);
    }
}

TEST(EscapeTest, ABackslashIsDoubledSoThatNoNameLooksLikeAnEscapedOne) {
    EXPECT_EQ(TextEscaped("a\\x0a"), "a\\\\x0a");
    EXPECT_EQ(TextEscaped("a\n"), "a\\x0a");
}

TEST(EscapeTest, ControlCharactersAreShownByTheirBytes) {
    EXPECT_EQ(TextEscaped("\n\t\r\x1b[31m\x7f"), "\\x0a\\x09\\x0d\\x1b[31m\\x7f");
    EXPECT_EQ(TextEscaped(std::string("a\0b", 3)), "a\\x00b");
    EXPECT_EQ(TextEscaped("\xC2\x9B"
                          "31m"),
              "\\xc2\\x9b31m"); // C1's own escape sequences
}

TEST(EscapeTest, BytesThatAreNoCharacterAreShownOneByOneAndTheRestStays) {
    EXPECT_EQ(TextEscaped("a\xFF\xC3\xB6\xC3z"), "a\\xff\xC3\xB6\\xc3z");
    EXPECT_EQ(TextEscaped("\xE2\x80"), "\\xe2\\x80");
}

TEST(EscapeTest, WhatTurnsOrHidesTextIsShown) {
    EXPECT_EQ(TextEscaped("a\xE2\x80\xAEgpj.exe"), "a\\xe2\\x80\\xaegpj.exe"); // right to left
    EXPECT_EQ(TextEscaped("a\xE2\x80\x8B"), "a\\xe2\\x80\\x8b");               // of no width
    EXPECT_EQ(TextEscaped("\xEF\xBB\xBF"), "\\xef\\xbb\\xbf");                 // byte order mark
}

// Every character that there is.
TEST(EscapeTest, JustTheDangerousCharactersAreEscaped) {
    const std::pair<int32_t, int32_t> dangerous[] = {
        {0, 0x1F},        {'\\', '\\'},     {0x7F, 0x9F},     {0x061C, 0x061C},
        {0x200B, 0x200F}, {0x2028, 0x202E}, {0x2060, 0x206F}, {0xFEFF, 0xFEFF},
    };
    std::set<int32_t> expected;
    for (const auto &[first, last] : dangerous) {
        for (int32_t number = first; number <= last; ++number) {
            expected.insert(number);
        }
    }
    std::set<int32_t> escaped;
    for (int32_t number = 0; number <= 0x10FFFF; ++number) {
        const std::string text = Encoded(number);
        if (Utf8IsValid(text) && TextEscaped(text) != text) {
            escaped.insert(number);
        }
    }
    EXPECT_EQ(escaped, expected);
}
} // namespace vesk
