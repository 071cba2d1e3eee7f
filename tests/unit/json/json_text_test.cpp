#include "json/json_text.h"

#include "text/utf8.h"

#include <gtest/gtest.h>
#include <json/reader.h>
#include <json/value.h>

#include <random>
#include <sstream>

namespace vesk {
namespace {
using Numbers = std::map<std::string, uint64_t>;

// The document that a text holds; strictly JSON, or the test fails.
Json::Value Parsed(const std::string &text) {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    std::istringstream stream(text);
    Json::Value root;
    std::string errors;
    EXPECT_TRUE(Json::parseFromStream(builder, stream, &root, &errors)) << errors << text;
    return root;
}

std::string WrittenText(std::string_view text) {
    TextSink sink;
    JsonWriter json(sink);
    json.BeginObject();
    json.Text("text", text);
    json.EndObject();
    return sink.Kept();
}
} // namespace

TEST(JsonWriterTest, MembersAndElementsStandInTheOrderOfTheCalls) {
    TextSink sink;
    JsonWriter json(sink);
    json.BeginObject();
    json.Text("text", std::string_view("a"));
    json.Number("number", 18446744073709551615U);
    json.Signed("signed", -7);
    json.Bool("yes", true);
    json.Bool("no", false);
    json.BeginArray("list");
    json.Number("", 1);
    json.Text("", std::string_view("b"));
    json.BeginObject();
    json.EndObject();
    json.BeginObject();
    json.Null("null");
    json.EndObject();
    json.EndArray();
    json.BeginArray("empty");
    json.EndArray();
    json.BeginObject("inner");
    json.Number("zero", 0);
    json.EndObject();
    json.EndObject();
    EXPECT_EQ(sink.Kept(), R"({"text":"a","number":18446744073709551615,"signed":-7,"yes":true,)"
                           R"("no":false,"list":[1,"b",{},{"null":null}],"empty":[],)"
                           R"("inner":{"zero":0}})");
}

TEST(JsonWriterTest, WhatIsAbsentIsNull) {
    TextSink sink;
    JsonWriter json(sink);
    json.BeginObject();
    json.Text("text", std::optional<std::string>());
    json.Text("there", std::optional<std::string>("x"));
    json.Number("number", std::nullopt);
    json.Signed("signed", std::nullopt);
    json.Bool("bool", std::nullopt);
    json.EndObject();
    EXPECT_EQ(sink.Kept(), R"({"text":null,"there":"x","number":null,"signed":null,"bool":null})");
}

TEST(JsonWriterTest, APathThatIsNoUtf8HasItsBytesBesideIt) {
    TextSink sink;
    JsonWriter json(sink);
    json.BeginObject();
    json.Path("path", "/v/\xFF");
    json.Path("other", "/v/\xC3\xB6");
    json.EndObject();
    EXPECT_EQ(sink.Kept(), R"({"path":"/v/\ufffd","pathBytes":"L3Yv/w==","other":"/v/\u00f6"})");
}

TEST(JsonWriterTest, QuotationMarksAndControlCharactersAreEscaped) {
    EXPECT_EQ(WrittenText("a\"b\\c\n\t\x1b\x7f/"), "{\"text\":\"a\\\"b\\\\c\\n\\t\\u001b\x7f/\"}");
    EXPECT_EQ(WrittenText("\xF0\x9F\x93\xB7"), R"({"text":"\ud83d\udcf7"})");
}

TEST(JsonWriterTest, ANulDoesNotCutAText) {
    EXPECT_EQ(WrittenText(std::string_view("a\0b", 3)), R"({"text":"a\u0000b"})");
}

TEST(JsonWriterTest, WhateverATextHoldsTheDocumentIsValidAndTheTextTheRepairedOne) {
    std::mt19937 random(7); // NOLINT(cert-msc32-c,cert-msc51-cpp): the same texts each time
    for (int i = 0; i < 20000; ++i) {
        std::string text;
        for (size_t left = random() % 12; left > 0; --left) {
            // Half of the bytes are such as characters of several bytes are made of.
            text += static_cast<char>(random() % 2 == 0 ? random() % 256 : 128 + random() % 128);
        }
        const std::string written = WrittenText(text);
        ASSERT_TRUE(Utf8IsValid(written)) << i;
        ASSERT_EQ(Parsed(written)["text"].asString(), Utf8Repaired(text)) << i;
    }
}

TEST(JsonReadNumbersTest, TakesTheWholeNumbersFromZeroOn) {
    const auto numbers = JsonReadNumbers(
        R"({"a": 0, "b": 18446744073709551615, "c": -1, "d": 1.5, "e": "7", "f": null,
            "g": [1], "h": {"i": 2}, "j": 18446744073709551616, "k": true})");
    ASSERT_TRUE(numbers);
    EXPECT_EQ(*numbers, (Numbers{{"a", 0}, {"b", 18446744073709551615U}}));
    EXPECT_EQ(JsonReadNumbers("{}"), Numbers{});
}

TEST(JsonReadNumbersTest, WhatIsNoObjectIsNothing) {
    const std::string deep = std::string(5000, '[') + std::string(5000, ']');
    const std::string deepObject = "{\"a\":" + deep + "}";
    for (const std::string &text :
         {std::string(), std::string("null"), std::string("[1]"), std::string("7"),
          std::string("{"), std::string("{\"a\":1"), std::string("\xFF\xFE"), std::string(1, '\0'),
          deep, deepObject}) {
        EXPECT_EQ(JsonReadNumbers(text), std::nullopt) << text.substr(0, 20);
    }
}

TEST(JsonReadRecordsTest, TakesTheTextsAndWholeNumbersOfEachObject) {
    const auto records = JsonReadRecords(
        R"({"files": [{"path": "a", "inode": 7, "birth": -5, "x": null, "y": [1], "z": 1.5,
                       "w": true, "v": 18446744073709551615}, {}], "other": 3})",
        "files");
    ASSERT_TRUE(records);
    EXPECT_EQ(
        *records,
        (std::vector<JsonRecord>{
            {{"path", "a"}, {"inode", "7"}, {"birth", "-5"}, {"v", "18446744073709551615"}}, {}}));
    EXPECT_EQ(JsonReadRecords(R"({"files": []})", "files"), std::vector<JsonRecord>{});
}

TEST(JsonReadRecordsTest, WhatIsNoArrayOfObjectsIsNothing) {
    for (const char *text :
         {"", "{", "[]", "{}", R"({"files": {}})", R"({"files": null})", R"({"files": [{}, 1]})",
          R"({"files": ["a"]})", R"({"others": [{}]})"}) {
        EXPECT_EQ(JsonReadRecords(text, "files"), std::nullopt) << text;
    }
}
} // namespace vesk
