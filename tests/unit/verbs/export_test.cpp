#include "tests/unit/verbs/commands_fixture.h"

namespace vesk {
using ExportTest = CommandsTest;

TEST_F(ExportTest, EachRecordedPathIsALineAndStandsThereOnce) {
    Record(R"("5": "b", "6": "a", "7": "b", "8": "share/c d")");
    EXPECT_EQ(Run(ExportCommand), 0);
    EXPECT_EQ(answer_, mountPath_ + "/a\n" + mountPath_ + "/b\n" + mountPath_ + "/share/c d\n");
    EXPECT_EQ(said_, "");
}

TEST_F(ExportTest, WhatIsOnlyRequestedIsNotRecorded) {
    WriteWhole(config_, R"({"requestQueue": ["1"], "requests": {"1": {"type": "pinFiles",
        "mountPath": ")" + mountPath_ +
                            R"(", "data": "a#5"}}})");
    EXPECT_EQ(Run(ExportCommand), 0);
    EXPECT_EQ(answer_, "");
}

TEST_F(ExportTest, ANameWithALineFeedNeedsNuls) {
    Record(R"("5": "a\nb", "6": "c")");
    EXPECT_EQ(Run(ExportCommand), 1);
    EXPECT_EQ(answer_, mountPath_ + "/c\n");
    EXPECT_EQ(said_, "veskpin: " + mountPath_ + "/a\\x0ab: its name holds a line feed: use -0\n");
    settings_.nulSeparated = true;
    EXPECT_EQ(Run(ExportCommand), 0);
    EXPECT_EQ(answer_, mountPath_ + "/a\nb" + std::string(1, '\0') + mountPath_ + "/c" +
                           std::string(1, '\0'));
    EXPECT_EQ(said_, "");
}

TEST_F(ExportTest, TheDocumentNamesVolumeAndPath) {
    Record(R"("5": "a\nb")");
    settings_.json = true;
    EXPECT_EQ(Run(ExportCommand), 0);
    EXPECT_EQ(answer_, R"({"command":"export","schema":1,"files":[{"volume":")" + mountPath_ +
                           R"(","path":")" + mountPath_ + R"(/a\nb"}],"errors":[]})" + "\n");
}

TEST_F(ExportTest, OnlyTheVolumesThatAreAskedFor) {
    WriteWhole(config_, R"({"volumes": {"/volume8": {"files": {"5": "a"}},
                                        "/volume9": {"files": {"5": "b"}}}})");
    settings_.volumes = {"/volume9"};
    EXPECT_EQ(Run(ExportCommand), 0);
    EXPECT_EQ(answer_, "/volume9/b\n");
    settings_.volumes = {"/volume7", "/volume8"};
    EXPECT_EQ(Run(ExportCommand), 3);
    EXPECT_EQ(answer_, "/volume8/a\n");
    EXPECT_EQ(said_, "veskpin: /volume7: is no volume\n");
    settings_.json = true;
    EXPECT_EQ(Run(ExportCommand), 3);
    EXPECT_TRUE(Answers(R"({"path":"/volume7","text":"is no volume"}]})"));
    EXPECT_EQ(said_, "");
}

TEST_F(ExportTest, WhatIsRecordedIsToldWhateverElseCannotBeLookedAt) {
    Record(R"("5": "b", "x": "a")");
    refused_ = {kPinIoctlQueryBitmapSet, BLKGETSIZE64};
    EXPECT_EQ(Run(ExportCommand), 0);
    EXPECT_EQ(answer_, mountPath_ + "/b\n");
    EXPECT_EQ(said_,
              "veskpin: " + config_ + ": volume " + mountPath_ + ": record \"x\" names no file\n");
}

TEST_F(ExportTest, AConfigurationThatCannotBeReadIsUnknown) {
    WriteWhole(config_, "{");
    EXPECT_EQ(Run(ExportCommand), 3);
    EXPECT_EQ(answer_, "");
    EXPECT_EQ(said_, "veskpin: " + config_ + ": Prase file " + config_ + " error\n");
}
} // namespace vesk
