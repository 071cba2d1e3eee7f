// The forms that messages have in the system log.
#include "base/log.h"

#include "tests/support/captured_log.h"
#include "tests/support/syslog_capture.h"
#include "tests/unit/base/log_calls.h"

#include <cerrno>
#include <gtest/gtest.h>

namespace vesk {
namespace {
class LogToSystemLog : public ::testing::Test {
protected:
    void SetUp() override {
        LogToSyslog = 1;
        SyslogRecords().clear();
    }
    void TearDown() override {
        LogToSyslog = 0;
        LogLevel = 1;
    }
    // The one record since the last call.
    static std::string Taken() {
        EXPECT_EQ(SyslogRecords().size(), 1U);
        const std::string text = SyslogRecords().empty() ? "" : SyslogRecords()[0].text;
        SyslogRecords().clear();
        return text;
    }
};
} // namespace

TEST_F(LogToSystemLog, NothingGoesToStandardOutput) {
    CapturedLog output;
    LogToSyslog = 1;
    ReportError();
    EXPECT_EQ(output.Text(), "");
    EXPECT_EQ(SyslogRecords().size(), 1U);
}

TEST_F(LogToSystemLog, Level1HasSourceFileLineAndText) {
    const std::string error = Line(ReportError());
    EXPECT_EQ(Taken(), "veskcachepinfiletool.cpp:" + error + " Invalid input 7");
    const std::string notice = Line(ReportNotice());
    EXPECT_EQ(Taken(), "veskcachepinfiletool.cpp:" + notice + " Send bitmap OK");
    ReportVerbose();
    ReportDebug();
    EXPECT_TRUE(SyslogRecords().empty());
}

TEST_F(LogToSystemLog, LongErrorHasTheLineTwiceAndTheMarker) {
    LogLevel = 2;
    const std::string line = Line(ReportError());
    EXPECT_EQ(Taken(), "veskcachepinfiletool.cpp:" + line + " ReportError() [" + line +
                           "] : ***** Invalid input 7");
}

TEST_F(LogToSystemLog, LongNoticeVerboseAndDebugHaveOneForm) {
    LogLevel = 3;
    const std::string notice = Line(ReportNotice());
    EXPECT_EQ(Taken(), "veskcachepinfiletool.cpp:" + notice + " ReportNotice() [" + notice +
                           "] : Send bitmap OK");
    const std::string verbose = Line(ReportVerbose());
    EXPECT_EQ(Taken(), "veskcachepinfiletool.cpp:" + verbose + " ReportVerbose() [" + verbose +
                           "] : Get UUID = u");
    const std::string debug = Line(ReportDebug());
    EXPECT_EQ(Taken(), "veskcachepinfiletool.cpp:" + debug + " ReportDebug() [" + debug +
                           "] : Next read start = 0 bytes=1");
}

TEST_F(LogToSystemLog, DebugIsNotWrittenAtLevel2) {
    LogLevel = 2;
    ReportDebug();
    EXPECT_TRUE(SyslogRecords().empty());
}

TEST_F(LogToSystemLog, TraceHasTheLongForm) {
    LogLevel = 2;
    const std::string entry = Line(__LINE__ + 1);
    LogTraceEntry();
    EXPECT_EQ(Taken(), "veskcachepinfiletool.cpp:" + entry + " TestBody() [" + entry + "] : +++++");
    const std::string leave = Line(__LINE__ + 1);
    LogTraceExit();
    EXPECT_EQ(Taken(), "veskcachepinfiletool.cpp:" + leave + " TestBody() [" + leave + "] : -----");
}

TEST_F(LogToSystemLog, EveryClassHasErrorPriorityAndNoFacility) {
    for (const int level : {1, 2, 3}) {
        LogLevel = level;
        ReportError();
        ReportNotice();
        ReportVerbose();
        ReportDebug();
    }
    ASSERT_EQ(SyslogRecords().size(), 9U); // two, three and four
    for (const SyslogRecord &record : SyslogRecords()) {
        EXPECT_EQ(record.priority, 3);
    }
}

TEST_F(LogToSystemLog, ErrnoIsAsBefore) {
    for (const int level : {1, 2}) {
        LogLevel = level;
        errno = EXDEV;
        ReportError();
        EXPECT_EQ(errno, EXDEV);
    }
}

TEST_F(LogToSystemLog, LineFeedAtTheEndIsKept) {
    const std::string line = Line(__LINE__ + 1);
    LogError("Can't open bitmap file (%s) \n", "f");
    EXPECT_EQ(Taken(), "veskcachepinfiletool.cpp:" + line + " Can't open bitmap file (f) \n");
}
} // namespace vesk
