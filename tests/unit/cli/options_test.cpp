#include "cli/options.h"

#include "tests/support/captured_log.h"
#include "tests/support/syslog_capture.h"
#include "tests/unit/cli/options_fixture.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
const Arguments kMount = {"--mount-path", "/volume1"};
const Arguments kStart = {"--start-sector", "128"};
const Arguments kCount = {"--num-sectors", "256"};

std::string Stripped(std::string text) {
    StripTrailingSlash(&text[0]);
    return text.c_str();
}
} // namespace

TEST_F(OptionsTest, ParametersBeginUnset) {
    EXPECT_EQ(parameters.startSector, UINT64_MAX);
    EXPECT_EQ(parameters.numSectors, UINT64_MAX);
    EXPECT_EQ(parameters.checkPinFilePath, nullptr);
    EXPECT_EQ(parameters.files, nullptr);
    EXPECT_EQ(parameters.cachePath, nullptr);
    EXPECT_EQ(parameters.configPath, nullptr);
    EXPECT_EQ(parameters.spaceUuid, nullptr);
    EXPECT_EQ(parameters.mountPath, nullptr);
    EXPECT_EQ(parameters.debug, 0);
    EXPECT_EQ(parameters.verbose, 0);
    EXPECT_EQ(parameters.command, 0);
}

TEST_F(OptionsTest, TextsPointIntoTheArguments) {
    CapturedLog log;
    FakeApplianceOneVolume("/dev/mapper/cachedev_0");
    ASSERT_EQ(Parse({"--pin-files", "/;/dev", "--mount-path", "/volume1", "--config-path", "c",
                     "--cache-path", "d", "--space-uuid", "uuid-1"}),
              0);
    EXPECT_TRUE(IsArgument(parameters.files, 1));
    EXPECT_TRUE(IsArgument(parameters.mountPath, 3));
    EXPECT_TRUE(IsArgument(parameters.configPath, 5));
    EXPECT_TRUE(IsArgument(parameters.cachePath, 7));
    EXPECT_TRUE(IsArgument(parameters.spaceUuid, 9));

    ASSERT_EQ(Parse({"--check-pin", "/dev", "--config-path", "c"}), 0);
    EXPECT_TRUE(IsArgument(parameters.checkPinFilePath, 1));
    ASSERT_EQ(Parse({"--is-all-unpin", "/dev"}), 0);
    EXPECT_TRUE(IsArgument(parameters.cachePath, 1));
    EXPECT_EQ(log.Text(), "");
}

TEST_F(OptionsTest, SpaceUuidOptionIsShortG) {
    CapturedLog log;
    FakeApplianceOneVolume("/dev/mapper/cachedev_0");
    ASSERT_EQ(Parse({"-guuid-1"}), 0);
    EXPECT_STREQ(parameters.spaceUuid, "uuid-1");
}

TEST_F(OptionsTest, OneTrailingSlashOfTheMountPathIsRemoved) {
    CapturedLog log;
    ASSERT_EQ(Parse({"--support-pin", "--mount-path", "/volume1/"}), 0);
    EXPECT_STREQ(parameters.mountPath, "/volume1");
    ASSERT_EQ(Parse({"--support-pin", "--mount-path", "/volume1//"}), 0);
    EXPECT_STREQ(parameters.mountPath, "/volume1/");
    ASSERT_EQ(Parse({"--support-pin", "--mount-path", "/"}), 0);
    EXPECT_STREQ(parameters.mountPath, "/");
}

TEST_F(OptionsTest, SectorsAreDecimal) {
    CapturedLog log;
    const struct {
        const char *text;
        uint64_t value;
    } cases[] = {
        {"0", 0},
        {"12", 12},
        {" +7x", 7},
        {"010", 10},
        {"0x10", 0},
        {"abc", 0},
        {"", 0},
        {"-2", UINT64_MAX - 1},
        {"9223372036854775807", 9223372036854775807ULL},
        {"9999999999999999999999", 9223372036854775807ULL},
    };
    for (const auto &one : cases) {
        SCOPED_TRACE(one.text);
        ASSERT_EQ(Parse({"--start-sector", one.text}), 0);
        EXPECT_EQ(parameters.startSector, one.value);
        ASSERT_EQ(Parse({"--num-sectors", one.text}), 0);
        EXPECT_EQ(parameters.numSectors, one.value);
    }
}

TEST_F(OptionsTest, StartSector0IsSet) {
    CapturedLog log;
    EXPECT_EQ(Parse(Arguments{"--set-bitmap", "--start-sector", "0"} + kMount + kCount), 0);
    EXPECT_EQ(parameters.startSector, 0U);
}

TEST_F(OptionsTest, SectorMinus1CountsAsNotSet) {
    CapturedLog log;
    EXPECT_EQ(Parse(Arguments{"--set-bitmap", "--start-sector", "-1"} + kMount + kCount), -1);
    EXPECT_TRUE(log.Has("Start sector is not set"));
    EXPECT_EQ(Parse(Arguments{"--set-bitmap", "--num-sectors", "-1"} + kMount + kStart), -1);
    EXPECT_TRUE(log.Has("Num of sectors is not set"));
}

TEST_F(OptionsTest, LastCommandWinsButAllRequirementsStay) {
    CapturedLog log;
    const Arguments both = {"--pin-files", "a", "--start-service", "--config-path", "c"};
    EXPECT_EQ(Parse(both), -1);
    EXPECT_EQ(parameters.command, kCommandStartService);
    EXPECT_EQ(log.Text(), "tool: Mount path must be set\ntool: Check parameter failed\n");
    EXPECT_EQ(Parse(both + kMount), -1);
    EXPECT_TRUE(log.Has("File (path a) doesn't exist"));
    EXPECT_EQ(Parse({"--pin-files", "/", "--start-service", "--config-path", "c", "--mount-path",
                     "/volume1"}),
              0);
    EXPECT_EQ(parameters.command, kCommandStartService);
}

TEST_F(OptionsTest, LastValueOfAnOptionWins) {
    CapturedLog log;
    ASSERT_EQ(Parse({"--config-path", "a", "--config-path", "b", "--start-service"}), 0);
    EXPECT_STREQ(parameters.configPath, "b");
}

TEST_F(OptionsTest, UnpinAllConflictIsOnlyCheckedForThatCommand) {
    CapturedLog log;
    EXPECT_EQ(Parse(Arguments{"--unpin-all", "--cache-path", "/", "--support-pin"} + kMount), 0);
    EXPECT_EQ(parameters.command, kCommandSupportPin);
}

TEST_F(OptionsTest, VerboseAndDebugAreFlagsWithANotice) {
    CapturedLog log;
    ASSERT_EQ(Parse({"--verbose", "--debug"}), 0);
    EXPECT_EQ(parameters.verbose, 1);
    EXPECT_EQ(parameters.debug, 1);
    EXPECT_EQ(log.Text(), "tool: Verbose mode is enable\ntool: Debug mode is enable\n");
    EXPECT_EQ(LogLevel, 1);
    ASSERT_EQ(Parse({"-y"}), 0);
    EXPECT_EQ(parameters.verbose, 1);
    EXPECT_EQ(parameters.debug, 0);
    ASSERT_EQ(Parse({"-z"}), 0);
    EXPECT_EQ(parameters.verbose, 0);
    EXPECT_EQ(parameters.debug, 1);
}

TEST_F(OptionsTest, MessagesOfTheParserAreShortEvenBehindVerbose) {
    CapturedLog log;
    EXPECT_EQ(Parse({"--verbose", "--debug", "--check-pin", "/no/such"}), -1);
    EXPECT_EQ(LastOf(log.Lines()), "tool: File (/no/such) doesn't exist");
}

TEST_F(OptionsTest, StdoutTakesEffectWhereItStands) {
    CapturedLog log;
    LogToSyslog = 1;
    SyslogRecords().clear();
    ASSERT_EQ(Parse({"--verbose", "--stdout", "--debug"}), 0);
    EXPECT_EQ(LogToSyslog, 0);
    ASSERT_EQ(SyslogRecords().size(), 1U);
    EXPECT_NE(SyslogRecords()[0].text.find(" Verbose mode is enable"), std::string::npos);
    EXPECT_EQ(log.Text(), "tool: Debug mode is enable\n");
    LogToSyslog = 1;
    ASSERT_EQ(Parse({"-l"}), 0);
    EXPECT_EQ(LogToSyslog, 0);
}

TEST_F(OptionsTest, PositionalArgumentsAreIgnored) {
    CapturedLog log;
    ASSERT_EQ(Parse({"one", "--support-pin", "two", "--mount-path", "/volume1", "three"}), 0);
    EXPECT_EQ(parameters.command, kCommandSupportPin);
    EXPECT_STREQ(parameters.mountPath, "/volume1");
    EXPECT_EQ(log.Text(), "");
}

TEST_F(OptionsTest, OptionsBehindTwoDashesAreIgnored) {
    CapturedLog log;
    ASSERT_EQ(Parse({"--verbose", "--", "--support-pin"}), 0);
    EXPECT_EQ(parameters.command, kCommandInvalid);
}

TEST_F(OptionsTest, UnknownOptionsAreComplainedAboutOnStandardErrorAndSkipped) {
    // 'r' and 'x' exist in their long form only, as do the options that work on sectors.
    for (const char *unknown : {"--no-such", "-r", "-x", "-A", "-0", "--unpin"}) {
        SCOPED_TRACE(unknown);
        CapturedLog log;
        ::testing::internal::CaptureStderr();
        EXPECT_EQ(Parse({unknown, "--support-pin", "--mount-path", "/volume1"}), 0);
        EXPECT_NE(::testing::internal::GetCapturedStderr().find("tool: "), std::string::npos);
        EXPECT_EQ(parameters.command, kCommandSupportPin);
        EXPECT_EQ(log.Text(), "");
    }
}

TEST_F(OptionsTest, MissingArgumentIsNoFailureButLeavesTheParameterUnset) {
    CapturedLog log;
    ::testing::internal::CaptureStderr();
    EXPECT_EQ(Parse({"--config-path"}), 0);
    EXPECT_NE(::testing::internal::GetCapturedStderr().find("requires an argument"),
              std::string::npos);
    EXPECT_EQ(parameters.configPath, nullptr);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(OptionsTest, UniqueBeginningOfALongOptionWillDo) {
    CapturedLog log;
    ASSERT_EQ(Parse({"--support", "--mount", "/volume1"}), 0);
    EXPECT_EQ(parameters.command, kCommandSupportPin);
}

TEST_F(OptionsTest, FailedCheckEndsTheParseAtOnce) {
    CapturedLog log;
    EXPECT_EQ(Parse({"--space-uuid", "uuid-9", "--verbose"}), -1);
    EXPECT_EQ(parameters.spaceUuid, nullptr);
    EXPECT_EQ(parameters.verbose, 0);
    EXPECT_EQ(Parse({"--check-pin", "/no/such", "--verbose"}), -1);
    EXPECT_EQ(parameters.checkPinFilePath, nullptr);
    EXPECT_EQ(parameters.verbose, 0);
}

TEST_F(OptionsTest, LongFormNamesTheOperationAndItsFunction) {
    CapturedLog log(2);
    EXPECT_EQ(Parse({"--pin-files", "/"}), -1);
    EXPECT_EQ(log.Messages(),
              (std::vector<std::string>{"GetOptions() [N]: operation = pinFiles",
                                        "CheckParameter() [N] : ***** Mount path must be set",
                                        "GetOptions() [N] : ***** Check parameter failed"}));
}

TEST(ToolCommandToString, NamesTheCommandsInOrder) {
    const char *const names[] = {
        "invalid",      "pinFiles",        "unpinFiles",         "sendBitmap",
        "startService", "handleMount",     "handleUmount",       "supportPin",
        "checkBitmap",  "addPendingSpace", "removePendingSpace", "getUUID",
        "deleteBitmap", "checkPin",        "reloadPinBlocks",    "unpinAllBlocks"};
    for (int command = 0; command < 16; ++command) {
        EXPECT_STREQ(ToolCommandToString(command), names[command]);
    }
}

TEST(ToolCommandToString, IsShiftedByOneFromIsAllUnpinOn) {
    EXPECT_STREQ(ToolCommandToString(kCommandIsAllUnpin), "setBitmap");
    EXPECT_STREQ(ToolCommandToString(kCommandSetBitmap), "unsetBitmap");
    EXPECT_STREQ(ToolCommandToString(kCommandUnsetBitmap), "unpinRange");
    EXPECT_STREQ(ToolCommandToString(kCommandUnpinRange), "get-bitmap-size-byte");
    EXPECT_STREQ(ToolCommandToString(kCommandGetBitmapSizeByte), "pin-files");
}

TEST(StripTrailingSlash, TakesOneSlashOffTheEnd) {
    EXPECT_EQ(Stripped("/volume1/"), "/volume1");
    EXPECT_EQ(Stripped("/volume1//"), "/volume1/");
    EXPECT_EQ(Stripped("//"), "/");
    EXPECT_EQ(Stripped("a/"), "a");
}

TEST(StripTrailingSlash, LeavesEverythingElseAlone) {
    EXPECT_EQ(Stripped("/volume1"), "/volume1");
    EXPECT_EQ(Stripped("/"), "/");
    EXPECT_EQ(Stripped(""), "");
    StripTrailingSlash(nullptr);
}
} // namespace vesk
