#include "text/utf8.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
// "U+00F6 2": the character at `at` and its length; "none 1".
std::string At(std::string_view text, size_t at) {
    size_t length = 99;
    const int32_t number = Utf8At(text, at, &length);
    char name[32];
    snprintf(name, sizeof(name), "U+%04X ", static_cast<unsigned>(number));
    return (number < 0 ? "none " : name) + std::to_string(length);
}
} // namespace

TEST(Utf8Test, EachFormHasItsFirstAndItsLastCharacter) {
    const std::pair<std::string, const char *> characters[] = {
        {std::string(1, '\0'), "U+0000 1"}, {"\x7F", "U+007F 1"},
        {"\xC2\x80", "U+0080 2"},           {"\xDF\xBF", "U+07FF 2"},
        {"\xE0\xA0\x80", "U+0800 3"},       {"\xED\x9F\xBF", "U+D7FF 3"},
        {"\xEE\x80\x80", "U+E000 3"},       {"\xEF\xBF\xBF", "U+FFFF 3"},
        {"\xF0\x90\x80\x80", "U+10000 4"},  {"\xF4\x8F\xBF\xBF", "U+10FFFF 4"},
    };
    for (const auto &[text, expected] : characters) {
        EXPECT_EQ(At(text, 0), expected);
        EXPECT_EQ(At("ab" + text + "c", 2), expected);
        EXPECT_TRUE(Utf8IsValid("ab" + text + "c")) << expected;
    }
}

TEST(Utf8Test, LongerFormsThanNeededSurrogatesAndWhatIsPastTheLastAreNoCharacters) {
    for (const char *text : {"\xC0\x80", "\xC0\xAF", "\xC1\xBF",     // "/" in two bytes
                             "\xE0\x80\xAF", "\xE0\x9F\xBF",         // in three
                             "\xF0\x80\x80\xAF", "\xF0\x8F\xBF\xBF", // in four
                             "\xED\xA0\x80", "\xED\xBF\xBF",         // surrogates
                             "\xF4\x90\x80\x80", "\xF7\xBF\xBF\xBF", // past U+10FFFF
                             "\xF8\x88\x80\x80\x80", "\xFE", "\xFF", // forms that there are none
                             "\x80", "\xBF"}) {                      // an end without a beginning
        EXPECT_EQ(At(text, 0), "none 1");
        EXPECT_FALSE(Utf8IsValid(text));
        EXPECT_FALSE(Utf8IsValid(std::string("a") + text + "b"));
    }
}

TEST(Utf8Test, ACharacterThatIsCutIsNone) {
    for (const char *text : {"\xC3", "\xE5\x86", "\xE5", "\xF0\x9F\x93", "\xF0\x9F", "\xF0"}) {
        EXPECT_EQ(At(text, 0), "none 1");
        EXPECT_EQ(At(std::string(text) + "zzz", 0), "none 1");
        EXPECT_FALSE(Utf8IsValid(text));
    }
    // The byte behind the text's end is no part of it.
    EXPECT_EQ(At(std::string_view("\xC3\xB6", 1), 0), "none 1");
}

TEST(Utf8Test, EachByteOfNoCharacterIsRepairedByItself) {
    EXPECT_EQ(Utf8Repaired("a\xC3\xB6z"), "a\xC3\xB6z");
    EXPECT_EQ(Utf8Repaired("\xFFz\xE5\x86"), "\xEF\xBF\xBDz\xEF\xBF\xBD\xEF\xBF\xBD");
    EXPECT_EQ(Utf8Repaired(""), "");
    EXPECT_EQ(Utf8Repaired(std::string("a\0b", 3)), std::string("a\0b", 3));
}

TEST(Base64Test, IsPaddedToFours) {
    const std::pair<const char *, const char *> texts[] = {
        {"", ""},
        {"f", "Zg=="},
        {"fo", "Zm8="},
        {"foo", "Zm9v"},
        {"foob", "Zm9vYg=="},
        {"fooba", "Zm9vYmE="},
        {"foobar", "Zm9vYmFy"},
    };
    for (const auto &[bytes, expected] : texts) {
        EXPECT_EQ(Base64Of(bytes), expected);
    }
}

TEST(Base64Test, TakesAnyByte) {
    EXPECT_EQ(Base64Of("\xFB\xEF\xBE\xFF\xFF\xFF"), "++++////");
    EXPECT_EQ(Base64Of(std::string("\0\0\0", 3)), "AAAA");
    EXPECT_EQ(Base64Of("/volume1/\xFF"), "L3ZvbHVtZTEv/w==");
}
} // namespace vesk
