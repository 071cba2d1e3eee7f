#include "base/log.h"

#include "tests/support/captured_log.h"
#include "tests/unit/base/log_calls.h"

#include <cstdio>
#include <gtest/gtest.h>
#include <string>

namespace vesk {
namespace {
// Taken before any test runs.
const int kInitialLogToSyslog = LogToSyslog;
const int kInitialLogLevel = LogLevel;
const char *const kInitialProgramName = ProgramName;

class LogToStdout : public ::testing::Test {};
} // namespace

TEST(LogSettings, BeginWithTheSystemLogAtLevel1AndNoProgramName) {
    EXPECT_EQ(kInitialLogToSyslog, 1);
    EXPECT_EQ(kInitialLogLevel, 1);
    EXPECT_EQ(kInitialProgramName, nullptr);
}

TEST_F(LogToStdout, ErrorAtLevel1HasTheProgramNameAndTheText) {
    CapturedLog log;
    ReportError();
    EXPECT_EQ(log.Text(), "tool: Invalid input 7\n");
}

TEST_F(LogToStdout, NoticeAtLevel1HasTheProgramNameAndTheText) {
    CapturedLog log;
    ReportNotice();
    EXPECT_EQ(log.Text(), "tool: Send bitmap OK\n");
}

TEST_F(LogToStdout, VerboseAndDebugAreNotWrittenAtLevel1) {
    CapturedLog log;
    ReportVerbose();
    ReportDebug();
    EXPECT_EQ(log.Text(), "");
}

TEST_F(LogToStdout, LongErrorHasFunctionLineAndMarker) {
    for (const int level : {2, 3}) {
        CapturedLog log(level);
        const std::string line = Line(ReportError());
        EXPECT_EQ(log.Text(), "tool: ReportError() [" + line + "] : ***** Invalid input 7\n");
    }
}

TEST_F(LogToStdout, LongNoticeHasFunctionAndLineButNoMarker) {
    for (const int level : {2, 3}) {
        CapturedLog log(level);
        const std::string line = Line(ReportNotice());
        EXPECT_EQ(log.Text(), "tool: ReportNotice() [" + line + "] : Send bitmap OK\n");
    }
}

TEST_F(LogToStdout, VerboseHasNoBlankBeforeTheColon) {
    for (const int level : {2, 3}) {
        CapturedLog log(level);
        const std::string line = Line(ReportVerbose());
        EXPECT_EQ(log.Text(), "tool: ReportVerbose() [" + line + "]: Get UUID = u\n");
    }
}

TEST_F(LogToStdout, DebugIsWrittenAtLevel3OnlyAndHasNoBlankBeforeTheColon) {
    CapturedLog silent(2);
    ReportDebug();
    EXPECT_EQ(silent.Text(), "");

    CapturedLog log(3);
    const std::string line = Line(ReportDebug());
    EXPECT_EQ(log.Text(), "tool: ReportDebug() [" + line + "]: Next read start = 0 bytes=1\n");
}

TEST_F(LogToStdout, TextThatEndsInALineFeedIsFollowedByAnEmptyLine) {
    CapturedLog log;
    LogError("Read bitmap file (%s) error\n", "f");
    EXPECT_EQ(log.Text(), "tool: Read bitmap file (f) error\n\n");
}

TEST_F(LogToStdout, TextOfAnyLengthIsWrittenWhole) {
    for (const size_t length : {1000U, 1023U, 1024U, 1025U, 100000U}) {
        CapturedLog log;
        const std::string text(length, 'x');
        LogError("%s", text.c_str());
        EXPECT_EQ(log.Text(), "tool: " + text + "\n");
    }
}

TEST_F(LogToStdout, ControlCharactersOfArgumentsAreWrittenOut) {
    CapturedLog log;
    LogError("Can't open file (%s)", "/a\nb\x1b[2J\x01\x1f\x7f \xc3\xa9~\r");
    EXPECT_EQ(log.Text(),
              "tool: Can't open file (/a\\x0ab\\x1b[2J\\x01\\x1f\\x7f \xc3\xa9~\\x0d)\n");
}

TEST_F(LogToStdout, OnlyAFormatsOwnLineFeedsStay) {
    CapturedLog log;
    LogError("Can't open file (%s) \n", "\n");
    LogError("%s\n\n", "a\n");
    LogError("%s", "a\n");
    EXPECT_EQ(log.Text(), "tool: Can't open file (\\x0a) \n\ntool: a\\x0a\n\n\ntool: a\\x0a\n");
}

TEST_F(LogToStdout, ControlCharactersOfALongTextAreWrittenOut) {
    for (const size_t length : {size_t{300}, size_t{1022}, size_t{1023}, size_t{5000}}) {
        CapturedLog log;
        LogError("%s", std::string(length, '\t').c_str());
        std::string expected;
        for (size_t i = 0; i < length; ++i) {
            expected += "\\x09";
        }
        EXPECT_EQ(log.Text(), "tool: " + expected + "\n");
    }
}

TEST_F(LogToStdout, ADocumentKeepsItsLines) {
    CapturedLog silent;
    LogVerboseDocument("jsConf:", std::string("{\n}\n"));
    EXPECT_EQ(silent.Text(), "");
    CapturedLog log(2);
    LogVerboseDocument("jsConf:", std::string("{\n}\n"));
    const std::string line = std::to_string(__LINE__ - 1);
    EXPECT_EQ(log.Text(), "tool: TestBody() [" + line + "]: jsConf:{\n}\n\n");
}

TEST_F(LogToStdout, PercentSignsInArgumentsAreText) {
    CapturedLog log;
    LogError("File (%s) doesn't exist", "%s%n%d");
    EXPECT_EQ(log.Text(), "tool: File (%s%n%d) doesn't exist\n");
}

TEST_F(LogToStdout, TextThatCannotBeFormattedIsLeftOut) {
    CapturedLog log;
    LogError("%ls", L"\u20ac"); // no such character in the C locale
    EXPECT_EQ(log.Text(), "tool: \n");
}

TEST_F(LogToStdout, NullTextIsWrittenAsThePrintFunctionsDo) {
    CapturedLog log;
    const char *volatile none = nullptr;
    LogError("Get UUID = %s", none);
    EXPECT_EQ(log.Text(), "tool: Get UUID = (null)\n");
}

TEST_F(LogToStdout, TraceIsWrittenInTheNoticeFormAtLevel2) {
    CapturedLog log(2);
    const int line = __LINE__ + 1;
    LogTraceEntry();
    LogTraceExit();
    EXPECT_EQ(log.Text(), "tool: TestBody() [" + Line(line) + "] : +++++\n" + "tool: TestBody() [" +
                              Line(line + 1) + "] : -----\n");
}

TEST_F(LogToStdout, TraceOfAScopeEnclosesItsMessages) {
    CapturedLog log(2);
    {
        LogTraceScope();
        LogNotice("inside");
    }
    EXPECT_EQ(log.Messages(),
              (std::vector<std::string>{"TestBody() [N] : +++++", "TestBody() [N] : inside",
                                        "TestBody() [N] : -----"}));
}

TEST_F(LogToStdout, TraceIsNotWrittenAtLevel1) {
    CapturedLog log;
    LogTraceScope();
    LogTraceEntry();
    LogTraceExit();
    EXPECT_EQ(log.Text(), "");
}

TEST_F(LogToStdout, ArgumentsOfSilentMessagesAreNotEvaluated) {
    CapturedLog log(1);
    int evaluated = 0;
    LogVerbose("%d", ++evaluated);
    LogDebug("%d", ++evaluated);
    LogVerboseAt(LogHere(), "%d", ++evaluated);
    EXPECT_EQ(evaluated, 0);
}

TEST(LogU64, GivesTheWholeRange) {
    EXPECT_EQ(LogU64(0), 0ULL);
    EXPECT_EQ(LogU64(UINT64_MAX), 18446744073709551615ULL);
}

TEST(GetTimeString, RepeatsTheWholeSubSecondPartInMicroseconds) {
    long seconds = 0;
    long milliseconds = 0;
    long microseconds = 0;
    const std::string text = GetTimeString();
    ASSERT_EQ(
        sscanf(text.c_str(), "sec=%ld msec=%ld usec=%ld", &seconds, &milliseconds, &microseconds),
        3);
    EXPECT_GT(seconds, 0);
    EXPECT_EQ(milliseconds, microseconds / 1000);
    EXPECT_LT(microseconds, 1000000);
    char again[512];
    snprintf(again, sizeof(again), "sec=%ld msec=%ld usec=%ld", seconds, milliseconds,
             microseconds);
    EXPECT_EQ(text, again);
}

TEST(GetTimeString, OverwritesOneBuffer) {
    EXPECT_EQ(GetTimeString(), GetTimeString());
}
} // namespace vesk
