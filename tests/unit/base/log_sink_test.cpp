// What another program sees of the messages that it takes for itself.
#include "base/log.h"

#include "tests/support/captured_log.h"
#include "tests/unit/base/log_calls.h"

#include <cerrno>
#include <gtest/gtest.h>
#include <string>
#include <vector>

namespace vesk {
namespace {
std::vector<std::string> taken; // "class function line text"

void Take(LogClass logClass, const LogPlace &place, const char *text) {
    const char *const classes[] = {"error", "notice", "verbose", "debug"};
    taken.push_back(std::string(classes[static_cast<int>(logClass)]) + " " + place.function + " " +
                    Line(place.line) + " " + text);
    errno = EPIPE;
}

class LogSinkTest : public ::testing::Test {
protected:
    void SetUp() override {
        taken.clear();
        LogSetSink(Take);
    }
    void TearDown() override { LogSetSink(nullptr); }

    using Taken = std::vector<std::string>;
};
} // namespace

TEST_F(LogSinkTest, GetsClassPlaceAndTextWithoutTheMarkerAndNothingIsWritten) {
    CapturedLog log(3);
    const std::string error = Line(ReportError());
    const std::string notice = Line(ReportNotice());
    const std::string verbose = Line(ReportVerbose());
    const std::string debug = Line(ReportDebug());
    EXPECT_EQ(taken, (Taken{
                         "error ReportError " + error + " Invalid input 7",
                         "notice ReportNotice " + notice + " Send bitmap OK",
                         "verbose ReportVerbose " + verbose + " Get UUID = u",
                         "debug ReportDebug " + debug + " Next read start = 0 bytes=1",
                     }));
    EXPECT_EQ(log.Text(), "");
}

TEST_F(LogSinkTest, GetsWhatTheLevelAsksForOnly) {
    const size_t counts[] = {2, 3, 4}; // at level 1, 2 and 3
    for (int level = 1; level <= 3; ++level) {
        CapturedLog log(level);
        taken.clear();
        ReportError();
        ReportNotice();
        ReportVerbose();
        ReportDebug();
        EXPECT_EQ(taken.size(), counts[level - 1]) << level;
    }
}

TEST_F(LogSinkTest, GetsThePlaceThatAHelperWasGiven) {
    CapturedLog log(2);
    const LogPlace place{"GetOptions", 12};
    LogWrite(LogClass::Error, place, "File (%s) doesn't exist", "/a");
    LogVerboseAt(place, "operation = %s", "pinFiles");
    LogTraceMark("+++++", place);
    EXPECT_EQ(taken, (Taken{
                         "error GetOptions 12 File (/a) doesn't exist",
                         "verbose GetOptions 12 operation = pinFiles",
                         "notice GetOptions 12 +++++",
                     }));
}

TEST_F(LogSinkTest, LeavesErrnoAsItWas) {
    errno = ENOENT;
    LogError("text");
    EXPECT_EQ(errno, ENOENT);
    EXPECT_EQ(taken.size(), 1U);
}

TEST_F(LogSinkTest, NullGoesBackToStandardOutput) {
    CapturedLog log;
    LogSetSink(nullptr);
    ReportError();
    EXPECT_EQ(taken, Taken{});
    EXPECT_EQ(log.Text(), "tool: Invalid input 7\n");
}
} // namespace vesk
