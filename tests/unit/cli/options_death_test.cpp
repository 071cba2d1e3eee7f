// Options that end the process where they stand.
#include "cli/options.h"

#include "tests/support/captured_log.h"
#include "tests/unit/cli/options_fixture.h"

#include <csignal>
#include <gtest/gtest.h>

namespace vesk {
namespace {
using OptionsDeathTest = OptionsTest;

const ::testing::ExitedWithCode kSuccess(0);
const ::testing::KilledBySignal kAborted(SIGABRT);
} // namespace

TEST_F(OptionsDeathTest, ShortOptionThatNothingHandlesAbortsAfterItsMessage) {
    for (const char *option : {"-d", "-e"}) {
        SCOPED_TRACE(option);
        CapturedLog log;
        EXPECT_EXIT(Parse({option}), kAborted, "");
        EXPECT_EQ(log.Text(),
                  std::string("tool: Get unhandled option = ").append(option + 1).append("\n"));
    }
}

TEST_F(OptionsDeathTest, UnhandledOptionHasTheErrorMarkerInTheLongForm) {
    CapturedLog log(2);
    EXPECT_EXIT(Parse({"-d"}), kAborted, "");
    EXPECT_EQ(log.Messages(),
              std::vector<std::string>{"GetOptions() [N] : ***** Get unhandled option = d"});
}

TEST_F(OptionsDeathTest, OptionsBehindAnUnhandledOneAreNotLookedAt) {
    CapturedLog log;
    EXPECT_EXIT(Parse({"-de", "--help"}), kAborted, "");
    EXPECT_EQ(log.Text(), "tool: Get unhandled option = d\n");
}

TEST_F(OptionsDeathTest, HelpPrintsTheUsageAndEndsWithStatus0) {
    for (const char *option : {"--help", "-h"}) {
        SCOPED_TRACE(option);
        CapturedLog log;
        EXPECT_EXIT(Parse({option}), kSuccess, "");
        const std::vector<std::string> lines = log.Lines();
        ASSERT_EQ(lines.size(), 37U);
        EXPECT_EQ(lines.front(), "Usage:");
        EXPECT_EQ(lines.back(), "\t\ttool --set-bitmap --mount-path mount_path --start-sector "
                                "start_sector --num-sectors num_sectors");
    }
}

TEST_F(OptionsDeathTest, OptionsBehindHelpAreNotLookedAt) {
    CapturedLog log;
    EXPECT_EXIT(Parse({"--verbose", "--help", "-d", "--check-pin", "/no/such"}), kSuccess, "");
    EXPECT_EQ(log.Lines().at(0), "tool: Verbose mode is enable");
    EXPECT_EQ(log.Lines().at(1), "Usage:");
    EXPECT_EQ(log.Lines().size(), 38U);
}

TEST_F(OptionsDeathTest, HelpBehindAFailedCheckIsNotReached) {
    CapturedLog log;
    EXPECT_EQ(Parse({"--check-pin", "/no/such", "--help"}), -1);
    EXPECT_EQ(log.Text(), "tool: File (/no/such) doesn't exist\n");
}
} // namespace vesk
