#include "verbs/answer.h"

#include "verbs/settings.h"

#include <gtest/gtest.h>

namespace vesk {
TEST(AnswerTest, EveryDocumentHasItsCommandItsSchemaAndWhatCouldNotBeLookedAt) {
    TextSink sink;
    JsonWriter json(sink);
    AnswerBegin(json, "export");
    LookErrors errors;
    LookErrorAdd(&errors, "/v/\xFF", "is \"gone\"");
    LookUnknownAdd(&errors, "", "nothing told");
    AnswerEnd(json, sink, errors);
    EXPECT_EQ(
        sink.Kept(),
        R"({"command":"export","schema":1,"errors":[{"path":"/v/\ufffd","pathBytes":"L3Yv/w==",)"
        R"("text":"is \"gone\""},{"path":"","text":"nothing told"}]})"
        "\n");
}

TEST(AnswerTest, WithoutErrorsTheListIsEmpty) {
    TextSink sink;
    JsonWriter json(sink);
    AnswerBegin(json, "list");
    AnswerEnd(json, sink, {});
    EXPECT_EQ(sink.Kept(), "{\"command\":\"list\",\"schema\":1,\"errors\":[]}\n");
}

TEST(AnswerTest, WhatIsNotListedIsCounted) {
    LookErrors errors;
    LookErrorAdd(&errors, "/v/a", "is gone");
    errors.more = 7;
    TextSink sink;
    JsonWriter json(sink);
    AnswerBegin(json, "list");
    AnswerEnd(json, sink, errors);
    EXPECT_EQ(sink.Kept(), R"({"command":"list","schema":1,"errors":[)"
                           R"({"path":"/v/a","text":"is gone"},{"path":"","text":"and 7 more"}]})"
                           "\n");
    testing::internal::CaptureStderr();
    AnswerErrors(errors);
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "veskpin: /v/a: is gone\nveskpin: and 7 more\n");
}

TEST(AnswerTest, ForPeopleErrorsAreLinesThatNoNameCanForge) {
    LookErrors errors;
    LookErrorAdd(&errors, "/v/a\nveskpin: all is well", "is gone");
    LookErrorAdd(&errors, "", "nothing\x1b[2J told");
    testing::internal::CaptureStderr();
    AnswerErrors(errors);
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "veskpin: /v/a\\x0aveskpin: all is well: is gone\n"
              "veskpin: nothing\\x1b[2J told\n");
}

TEST(TableRowTest, ColumnsStandApartAndTheLastIsAsLongAsItIs) {
    EXPECT_EQ(TableRow({"ab", "12", "last one"}, {-4, 5}), "ab       12  last one\n");
    EXPECT_EQ(TableRow({"", "", ""}, {-4, 5}), "\n");
    EXPECT_EQ(TableRow({"ab", "", ""}, {-4, 5}), "ab\n");
    EXPECT_EQ(TableRow({"abcdef", "123456", "x"}, {-4, 5}), "abcdef  123456  x\n");
    EXPECT_EQ(TableRow({"a"}, {}), "a\n");
}

TEST(TableRowTest, WidthsAreThoseOfCharacters) {
    EXPECT_EQ(TableRow({"/f\xC3\xBCr", "1"}, {-6}), "/f\xC3\xBCr    1\n");
    EXPECT_EQ(TableRow({"/fur", "1"}, {-6}), "/fur    1\n");
}

TEST(ColoredTest, OnlyWhereColourIsWanted) {
    EXPECT_EQ(Colored("x", 31, true), "\033[31mx\033[0m");
    EXPECT_EQ(Colored("x", 31, false), "x");
}

TEST(ExitStatusTest, TheUnknownWeighsMoreThanANo) {
    EXPECT_EQ(ExitStatusOf(false, true), ExitStatus::Done);
    EXPECT_EQ(ExitStatusOf(false, false), ExitStatus::NotSo);
    EXPECT_EQ(ExitStatusOf(true, true), ExitStatus::Unknown);
    EXPECT_EQ(ExitStatusOf(true, false), ExitStatus::Unknown);
    EXPECT_EQ(static_cast<int>(ExitStatus::Done), 0);
    EXPECT_EQ(static_cast<int>(ExitStatus::NotSo), 1);
    EXPECT_EQ(static_cast<int>(ExitStatus::Usage), 2);
    EXPECT_EQ(static_cast<int>(ExitStatus::Unknown), 3);
    EXPECT_EQ(static_cast<int>(ExitStatus::Service), 4);
}
} // namespace vesk
