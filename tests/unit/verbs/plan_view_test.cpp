#include "verbs/plan.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
PlanFigures Figures() {
    PlanFigures figures;
    figures.files = 2;
    figures.bytes = 70000;
    figures.extents = 1;
    figures.blocks = 3;
    figures.blocksNew = 2;
    figures.roundingBytes = -4096;
    figures.ssdBlocks = 32;
    figures.marked = 20;
    figures.headroom = 6;
    figures.fits = true;
    figures.requests = 1;
    figures.seconds = 61;
    return figures;
}

std::string Table(const PlanFigures &figures, bool color = false) {
    Plan plan;
    plan.volumes.push_back({"/volume1", figures});
    TextSink sink;
    PlanShowTable(plan, color, sink);
    return sink.Kept();
}

// The line that tells of the room.
std::string Room(const PlanFigures &figures, bool color = false) {
    const std::string text = Table(figures, color);
    const size_t at = text.find("  room    ");
    return text.substr(at, text.find('\n', at) - at);
}

ExitStatus StatusOf(const Plan &plan, bool isUnknown = false) {
    LookErrors errors;
    errors.isUnknown = isUnknown;
    return PlanStatus(plan, errors);
}
} // namespace

TEST(PlanShowTest, ADocumentHasAllMembers) {
    Plan plan;
    plan.volumes.push_back({"/volume1", Figures()});
    plan.skipped.push_back({"/volume1/a b", SkipReason::Name});
    plan.skipped.push_back({"/volume1/\xFF", SkipReason::NotUtf8});
    LookErrors errors;
    LookErrorAdd(&errors, "", "is gone");
    TextSink sink;
    PlanShowJson(plan, errors, sink);
    EXPECT_EQ(sink.Kept(),
              R"({"command":"plan","schema":1,"volumes":[{"volume":"/volume1","fileCount":2,)"
              R"("bytes":70000,"extents":1,"blocks":3,"blocksNew":2,"roundingBytes":-4096,)"
              R"("ssdBlocks":32,"blocksMarked":20,"headroomBlocks":6,"fits":true,)"
              R"("requestsNeeded":1,"secondsEstimated":61}],"skipped":[)"
              R"({"path":"/volume1/a b","reason":"name"},)"
              R"({"path":"/volume1/\ufffd","pathBytes":"L3ZvbHVtZTEv/w==","reason":"not-utf8"}],)"
              R"("errors":[{"path":"","text":"is gone"}]})"
              "\n");
}

TEST(PlanShowTest, WhatCannotBeHadIsNull) {
    PlanFigures figures = Figures();
    figures.blocks = std::nullopt;
    figures.blocksNew = std::nullopt;
    figures.roundingBytes = std::nullopt;
    figures.ssdBlocks = std::nullopt;
    figures.marked = std::nullopt;
    figures.headroom = std::nullopt;
    figures.fits = std::nullopt;
    Plan plan;
    plan.volumes.push_back({"/volume1", figures});
    TextSink sink;
    PlanShowJson(plan, {}, sink);
    EXPECT_NE(sink.Kept().find(R"("blocks":null,"blocksNew":null,"roundingBytes":null,)"
                               R"("ssdBlocks":null,"blocksMarked":null,"headroomBlocks":null,)"
                               R"("fits":null,"requestsNeeded":1)"),
              std::string::npos)
        << sink.Kept();
}

TEST(PlanShowTest, TheTableTellsCostRoomTimeAndWhatIsLeftOut) {
    Plan plan;
    plan.volumes.push_back({"/volume1", Figures()});
    plan.volumes.push_back({"/v\n2", Figures()});
    plan.skipped.push_back({"/volume1/a\nb", SkipReason::Name});
    TextSink sink;
    PlanShowTable(plan, false, sink);
    const std::string body = ": 2 files, 68 KiB in 1 extent\n"
                             "  cost    3 blocks (192 KiB), 2 of them new\n"
                             "  room    20 blocks (1.2 MiB) of 32 marked: fits, 6 blocks (384 KiB) "
                             "to spare\n"
                             "  time    1 request, about 1 min 1 s\n";
    EXPECT_EQ(sink.Kept(),
              "/volume1" + body + "/v\\x0a2" + body + "left out  /volume1/a\\x0ab: name\n");
}

TEST(PlanShowTest, TheRoomIsToldAsFarAsItIsKnown) {
    PlanFigures figures = Figures();
    figures.headroom = 0;
    EXPECT_EQ(Room(figures), "  room    20 blocks (1.2 MiB) of 32 marked: fits, 0 blocks (0 B) to "
                             "spare");
    figures.headroom = -2;
    figures.fits = false;
    EXPECT_EQ(Room(figures), "  room    20 blocks (1.2 MiB) of 32 marked: does not fit, 2 blocks "
                             "(128 KiB) too many");
    figures.headroom = std::nullopt;
    EXPECT_EQ(Room(figures), "  room    20 blocks (1.2 MiB) marked; the SSD's size is not known");
    figures.ssdBlocks = std::nullopt;
    EXPECT_EQ(Room(figures), "  room    20 blocks (1.2 MiB) marked; the SSD's size is not known");
    figures.marked = std::nullopt;
    EXPECT_EQ(Room(figures), "  room    what is marked cannot be read");
    figures.blocksNew = std::nullopt;
    EXPECT_NE(Table(figures).find("  cost    3 blocks (192 KiB)\n"), std::string::npos);
    figures.blocks = std::nullopt;
    EXPECT_NE(Table(figures).find("  cost    unknown\n"), std::string::npos);
}

TEST(PlanShowTest, ColourMarksTheVolumeAndTheVerdict) {
    PlanFigures figures = Figures();
    EXPECT_EQ(Table(figures, true).compare(0, 17, "\033[1m/volume1\033[0m:"), 0);
    EXPECT_NE(Room(figures, true).find(" marked: \033[32mfits\033[0m, "), std::string::npos);
    figures.headroom = -1;
    EXPECT_NE(Room(figures, true).find(" marked: \033[31mdoes not fit\033[0m, "),
              std::string::npos);
}

TEST(PlanStatusTest, IsDoneWhereAllFitsAndNothingIsLeftOut) {
    Plan plan;
    plan.volumes.push_back({"/volume1", Figures()});
    EXPECT_EQ(StatusOf(plan), ExitStatus::Done);
    EXPECT_EQ(StatusOf(plan, true), ExitStatus::Unknown);
    plan.skipped.push_back({"/volume1/a b", SkipReason::Name});
    EXPECT_EQ(StatusOf(plan), ExitStatus::NotSo);
    plan.isAllFailed = true;
    EXPECT_EQ(StatusOf(plan), ExitStatus::Unknown);
}

TEST(PlanStatusTest, IsNotSoWhereOneVolumeDoesNotFitAndUnknownWhereThatIsUnknown) {
    Plan plan;
    plan.volumes.push_back({"/volume1", Figures()});
    plan.volumes.push_back({"/volume2", Figures()});
    plan.volumes[0].figures.fits = false;
    EXPECT_EQ(StatusOf(plan), ExitStatus::NotSo);
    plan.volumes[1].figures.fits = std::nullopt;
    EXPECT_EQ(StatusOf(plan), ExitStatus::Unknown);
}
} // namespace vesk
