#include "tests/support/private_world.h"
#include "tests/unit/verbs/commands_fixture.h"

#include <cstdlib>
#include <ctime>
#include <filesystem>

namespace vesk {
namespace {
// The whole answer of status ends with what the machine's own services are, which is left out here.
using StatusCommandTest = CommandsTest;
using ListCommandTest = CommandsTest;
using PlanCommandTest = CommandsTest;
using MetricsCommandTest = CommandsTest;
} // namespace

TEST_F(StatusCommandTest, ShowsTheVolumesAndTheConfiguration) {
    Record(R"("5": "b", "6": "a")");
    Run(StatusCommand);
    EXPECT_TRUE(Answers("\nConfiguration " + config_ + ": 0 requests stored\n")) << answer_;
    EXPECT_TRUE(Answers("\n" + mountPath_ + "  ")) << answer_;
    settings_.json = true;
    Run(StatusCommand);
    EXPECT_TRUE(Answers(R"({"command":"status","schema":1,"config":")" + config_ + "\""))
        << answer_;
    EXPECT_TRUE(Answers(R"("storedRequests":0,"volumes":[{"volume":")" + mountPath_ +
                        R"(","uuid":"uuid-1","cacheDevice":")" + device_ + "\""))
        << answer_;
    EXPECT_TRUE(Answers(R"("files":2,"requests":0,"held":false}])")) << answer_;
    EXPECT_EQ(said_, "");
}

TEST_F(StatusCommandTest, IsUnknownWhereAVolumeOrTheConfigurationIs) {
    settings_.volumes = {"/volume7"};
    EXPECT_EQ(Run(StatusCommand), 3);
    EXPECT_NE(said_.find("veskpin: /volume7: is no volume\n"), std::string::npos) << said_;
    settings_.volumes.clear();
    WriteWhole(config_, "[]");
    settings_.json = true;
    EXPECT_EQ(Run(StatusCommand), 3);
    EXPECT_TRUE(Answers(R"("storedRequests":null,)")) << answer_;
    EXPECT_TRUE(Answers(R"("files":null,"requests":null,)")) << answer_;
    EXPECT_TRUE(Answers("is no JSON object")) << answer_;
}

TEST_F(StatusCommandTest, VolumesStandThereInTheOrderInWhichTheyWereAskedForAndOnce) {
    WriteWhole(config_, R"({"volumes": {"/volume9": {}}})");
    settings_.volumes = {"/volume9", mountPath_, "/volume9"};
    settings_.json = true;
    Run(StatusCommand);
    const size_t first = answer_.find(R"({"volume":"/volume9","uuid":null)");
    EXPECT_NE(first, std::string::npos) << answer_;
    EXPECT_EQ(answer_.find(R"({"volume":"/volume9")", first + 1), std::string::npos) << answer_;
    EXPECT_GT(answer_.find(R"({"volume":")" + mountPath_), first);
}

TEST_F(StatusCommandTest, AHeldVolumeIsShownAsSuch) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    std::filesystem::create_directories("/run/veskpin");
    WriteWhole(VolumeHoldNote("uuid-1"), "");
    Run(StatusCommand);
    EXPECT_TRUE(Answers("  held\n")) << answer_;
    settings_.json = true;
    Run(StatusCommand);
    EXPECT_TRUE(Answers(R"("held":true}])")) << answer_;
    std::filesystem::remove_all("/run/veskpin");
}

TEST_F(ListCommandTest, IsDoneWhereAllIsPinned) {
    WriteWhole(BitmapPath(), std::string("\x02\x00\x00", 3));
    Record("\"" + Make("a", 1) + "\": \"a\"");
    EXPECT_EQ(Run(ListCommand), 0);
    EXPECT_EQ(answer_, "STATE           SIZE    BLOCKS    MARKED    ON SSD   EXTENTS  FILE\n"
                       "pinned           1 B         1         1         -         1  " +
                           mountPath_ + "/a\n");
    settings_.paths = {mountPath_ + "/a", mountPath_};
    Make("b", 2);
    EXPECT_EQ(Run(ListCommand), 1);
    EXPECT_TRUE(Answers(mountPath_ + ": 1 of 3 files pinned; 128 KiB in blocks, 64 KiB marked, "
                                     "unknown on the SSD\n"))
        << answer_;
    EXPECT_EQ(said_, "");
}

TEST_F(ListCommandTest, IsDoneWhereThereIsNothing) {
    EXPECT_EQ(Run(ListCommand), 0);
    EXPECT_EQ(answer_, "");
    settings_.json = true;
    EXPECT_EQ(Run(ListCommand), 0);
    EXPECT_EQ(answer_,
              "{\"command\":\"list\",\"schema\":1,\"files\":[],\"folders\":[],\"errors\":[]}\n");
}

TEST_F(ListCommandTest, IsNotSoWhereAPathCannotBeLookedAtAndUnknownWhereNoneCan) {
    WriteWhole(BitmapPath(), std::string("\x02\x00\x00", 3));
    Record("\"" + Make("a", 1) + "\": \"a\"");
    settings_.paths = {mountPath_ + "/gone", mountPath_ + "/a"};
    EXPECT_EQ(Run(ListCommand), 1);
    EXPECT_EQ(said_, "veskpin: " + mountPath_ + "/gone: No such file or directory\n");
    settings_.paths = {mountPath_ + "/gone"};
    EXPECT_EQ(Run(ListCommand), 3);
    settings_.paths = {"/", mountPath_ + "/gone"};
    EXPECT_EQ(Run(ListCommand), 3);
}

TEST_F(ListCommandTest, IsUnknownWhereTheDriverIs) {
    WriteWhole(BitmapPath(), std::string("\x02\x00\x00", 3));
    Record("\"" + Make("a", 1) + "\": \"a\"");
    refused_ = {kPinIoctlQueryBitmapSet};
    settings_.json = true;
    EXPECT_EQ(Run(ListCommand), 3);
    EXPECT_TRUE(Answers(R"("state":null,)")) << answer_;
}

TEST_F(PlanCommandTest, TellsWhetherItFits) {
    Make("a", 1);
    settings_.paths = {mountPath_ + "/a"};
    settings_.reservePercent = 80;
    EXPECT_EQ(Run(PlanCommand), 0);
    EXPECT_EQ(answer_, mountPath_ + ": 1 file, 1 B in 1 extent\n"
                                    "  cost    1 blocks (64 KiB), 1 of them new\n"
                                    "  room    0 blocks (0 B) of 5 marked: fits, 0 blocks (0 B) to "
                                    "spare\n"
                                    "  time    1 request, about 1 s\n");
    settings_.reservePercent = 81;
    EXPECT_EQ(Run(PlanCommand), 1);
    settings_.json = true;
    EXPECT_EQ(Run(PlanCommand), 1);
    EXPECT_TRUE(Answers(R"("headroomBlocks":-1,"fits":false,)")) << answer_;
    EXPECT_EQ(said_, "");
}

TEST_F(PlanCommandTest, IsUnknownWhereNoPathCanBePlanned) {
    settings_.paths = {mountPath_ + "/a b"};
    EXPECT_EQ(Run(PlanCommand), 3);
    EXPECT_EQ(answer_, "left out  " + mountPath_ + "/a b: not-found\n");
    Make("a b", 1);
    EXPECT_EQ(Run(PlanCommand), 1);
    EXPECT_TRUE(Answers("left out  " + mountPath_ + "/a b: name\n"));
    WriteWhole(config_, "{");
    EXPECT_EQ(Run(PlanCommand), 3);
    EXPECT_EQ(said_, "veskpin: " + config_ + ": Prase file " + config_ + " error\n");
}

TEST_F(MetricsCommandTest, CountsFilesByState) {
    WriteWhole(BitmapPath(), std::string("\x02\x00\x00", 3));
    Record("\"" + Make("a", 1) + R"(": "a", ")" + Make("b", 2) + R"(": "b", "7": "gone")");
    const time_t before = time(nullptr);
    Run(MetricsCommand);
    const std::string label = "{volume=\"" + mountPath_ + "\",state=";
    EXPECT_TRUE(Answers("veskpin_files_by_state" + label + "\"pinned\"} 1\n")) << answer_;
    EXPECT_TRUE(Answers("veskpin_files_by_state" + label + "\"unmarked\"} 1\n"));
    EXPECT_TRUE(Answers("veskpin_files_by_state" + label + "\"missing\"} 1\n"));
    EXPECT_TRUE(Answers("veskpin_files_by_state" + label + "\"partial\"} 0\n"));
    EXPECT_TRUE(Answers("veskpin_files{volume=\"" + mountPath_ + "\"} 3\n"));
    EXPECT_TRUE(Answers("veskpin_look_errors 0\n"));
    const size_t at = answer_.rfind(' ');
    const auto lookedAt = static_cast<time_t>(strtoll(answer_.c_str() + at, nullptr, 10));
    EXPECT_GE(lookedAt, before);
    EXPECT_LE(lookedAt, time(nullptr));
}

TEST_F(MetricsCommandTest, AFileIsReplacedWhole) {
    settings_.output = folder_.FileMake("veskpin.prom", "old\n");
    struct stat old {};
    ASSERT_EQ(stat(settings_.output.c_str(), &old), 0);
    Run(MetricsCommand);
    EXPECT_EQ(answer_, "");
    EXPECT_EQ(ReadWhole(settings_.output).compare(0, 23, "# HELP veskpin_services"), 0);
    struct stat now {};
    ASSERT_EQ(stat(settings_.output.c_str(), &now), 0);
    EXPECT_NE(now.st_ino, old.st_ino); // another file, by one rename
}

TEST_F(MetricsCommandTest, AFileThatCannotBeWrittenIsAFailure) {
    settings_.output = folder_.Path("go\nne/veskpin.prom");
    EXPECT_EQ(Run(MetricsCommand), 1);
    EXPECT_NE(said_.find("veskpin: " + folder_.Path() +
                         "/go\\x0ane/veskpin.prom: No such file or directory\n"),
              std::string::npos)
        << said_;
    WriteWhole(config_, "{"); // and what is unknown weighs more
    EXPECT_EQ(Run(MetricsCommand), 3);
}

TEST_F(MetricsCommandTest, AFileOfUnknownStateIsCountedInNone) {
    Record("\"" + Make("a", 1) + "\": \"a\"");
    refused_ = {kPinIoctlQueryBitmapSet};
    WriteWhole(BitmapPath(), std::string("\x02\x00\x00", 3));
    EXPECT_EQ(Run(MetricsCommand), 3);
    EXPECT_EQ(answer_.find("veskpin_files_by_state{"), std::string::npos) << answer_;
    EXPECT_TRUE(Answers("veskpin_files{volume=\"" + mountPath_ + "\"} 1\n"));
    EXPECT_TRUE(Answers("veskpin_look_errors 1\n"));
    EXPECT_EQ(said_.compare(0, 9 + device_.size(), "veskpin: " + device_), 0) << said_;
}
} // namespace vesk
