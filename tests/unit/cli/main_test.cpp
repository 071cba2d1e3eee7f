// What main does around every command: the program's name, the log level and the exit status.
#include "tests/unit/cli/main_fixture.h"

#include "cli/options.h"
#include "tests/support/captured_log.h"

namespace vesk {
namespace {
std::string UsageText() {
    CapturedLog output;
    Usage();
    return output.Text();
}
} // namespace

TEST_F(MainTest, WithoutOptionsSaysInvalidInputInTheSystemLogPrintsTheUsageAndSucceeds) {
    const Outcome run = Tool({});
    EXPECT_EQ(run.status, 0);
    EXPECT_EQ(run.output, UsageText());
    EXPECT_EQ(run.systemLog, "veskcachepinfiletool.cpp:N Invalid input\n");
}

TEST_F(MainTest, WithStdoutSaysInvalidInputBehindTheProgramName) {
    const Outcome run = Tool({"--stdout"});
    EXPECT_EQ(run.status, 0);
    EXPECT_EQ(run.output, "tool: Invalid input\n" + UsageText());
    EXPECT_EQ(run.systemLog, "");
}

TEST_F(MainTest, VerboseErrorInTheSystemLogNamesMainAndHasTheMarker) {
    const Outcome run = Tool({"--verbose"});
    EXPECT_EQ(run.systemLog, "veskcachepinfiletool.cpp:N Verbose mode is enable\n"
                             "veskcachepinfiletool.cpp:N main() [N] : +++++\n"
                             "veskcachepinfiletool.cpp:N main() [N] : ***** Invalid input\n"
                             "veskcachepinfiletool.cpp:N main() [N] : -----\n");
    EXPECT_EQ(run.output, UsageText());
}

TEST_F(MainTest, VerboseErrorOnStandardOutputNamesMainAndHasTheMarker) {
    const Outcome run = Tool({"--verbose", "--stdout"});
    EXPECT_EQ(run.output, "tool: main() [N] : +++++\n"
                          "tool: main() [N] : ***** Invalid input\n" +
                              UsageText() + "tool: main() [N] : -----\n");
}

TEST_F(MainTest, DebugWinsOverVerbose) {
    EXPECT_EQ(Tool({"--debug"}).logLevel, "3");
    EXPECT_EQ(Tool({"--debug", "--verbose"}).logLevel, "3");
    EXPECT_EQ(Tool({"--verbose", "--debug"}).logLevel, "3");
    EXPECT_EQ(Tool({"--verbose"}).logLevel, "2");
    EXPECT_EQ(Tool({}).logLevel, "1");
}

TEST_F(MainTest, VerboseNamesTheRunWithLongFormsAndATrace) {
    const Outcome run = ToolWith(0, {"--verbose", "--send-bitmap", "--mount-path", "/volume1"});
    EXPECT_EQ(run.status, 0);
    EXPECT_EQ(run.output, "tool: Verbose mode is enable\n"
                          "tool: main() [N] : +++++\n"
                          "tool: main() [N] : Start to send bitmap for volume (/volume1)\n"
                          "[SendBitmap /volume1]\n"
                          "tool: main() [N] : Send bitmap OK\n"
                          "tool: main() [N] : -----\n");
}

TEST_F(MainTest, MessagesWhileOptionsAreParsedAreShort) {
    const Outcome run =
        Tool({"--stdout", "--verbose", "--debug", "--check-pin", "/no/such", "--config-path", "c"});
    EXPECT_EQ(run.status, 255);
    EXPECT_EQ(run.output, "tool: Verbose mode is enable\ntool: Debug mode is enable\n"
                          "tool: File (/no/such) doesn't exist\n" +
                              UsageText());
}

TEST_F(MainTest, FailedParsePrintsTheUsageAndEndsWith255WithoutATrace) {
    const Outcome run = Tool({"--verbose", "--send-bitmap"});
    EXPECT_EQ(run.status, 255);
    EXPECT_EQ(run.output, UsageText());
    EXPECT_EQ(run.systemLog, "veskcachepinfiletool.cpp:N Verbose mode is enable\n"
                             "veskcachepinfiletool.cpp:N Mount path must be set\n"
                             "veskcachepinfiletool.cpp:N Check parameter failed\n");
}

TEST_F(MainTest, HelpPrintsTheUsageAndSucceeds) {
    const Outcome run = Tool({"--help", "--send-bitmap"});
    EXPECT_EQ(run.status, 0);
    EXPECT_EQ(run.output, UsageText());
}

TEST_F(MainTest, ResultsGoToStandardOutputAlsoWhenMessagesGoToTheSystemLog) {
    FakeCommands::result = 1;
    const Outcome run = Tool({"--check-bitmap", "--mount-path", "/volume1"});
    EXPECT_EQ(run.output, "[CheckBitmapSet /volume1]\nYes\n");
    EXPECT_EQ(run.systemLog, "");
}
} // namespace vesk
