// What the command line's parser is made of: the check of required parameters, the command names
// and the mount path's trailing slash.
#include "cli/options.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"

#include <gtest/gtest.h>

namespace vesk {

namespace {

class CheckParameterTest : public LeakCheckedTest {
protected:
    // The messages of one check at level 1; empty: it passed.
    std::string Check() {
        CapturedLog log;
        const int result = CheckParameter(&required, &parameters);
        EXPECT_EQ(result, log.Text().empty() ? 0 : -1);
        return log.Text();
    }
    RequiredParameters required;
    ToolParameters parameters;
};

std::string Stripped(std::string text) {
    StripTrailingSlash(&text[0]);
    return text.c_str();
}

} // namespace

TEST_F(CheckParameterTest, PassesWhenNothingIsRequired) {
    EXPECT_EQ(Check(), "");
}

TEST_F(CheckParameterTest, StopsAtTheFirstFailureInThisOrder) {
    required = {1, 1, 1, 1, 1, 1, 1};
    EXPECT_EQ(Check(), "tool: Error: Cache path is not set\n");
    parameters.cachePath = "/no/such";
    EXPECT_EQ(Check(), "tool: Error: Cache path (/no/such) doesn't exist\n");
    parameters.cachePath = "/";
    EXPECT_EQ(Check(), "tool: Space UUID must be set\n");
    parameters.spaceUuid = "uuid-1";
    EXPECT_EQ(Check(), "tool: Config path must be set\n");
    parameters.configPath = "/no/such";
    EXPECT_EQ(Check(), "tool: Mount path must be set\n");
    parameters.mountPath = "/no/such";
    EXPECT_EQ(Check(), "tool: The file paths should not be NULL\ntool: Check file paths error\n");
    parameters.files = "/;/dev";
    EXPECT_EQ(Check(), "tool: Start sector is not set\n");
    parameters.startSector = 0;
    EXPECT_EQ(Check(), "tool: Num of sectors is not set\n");
    parameters.numSectors = 0;
    EXPECT_EQ(Check(), "");
}

TEST_F(CheckParameterTest, LogsInItsOwnName) {
    required.spaceUuid = 1;
    CapturedLog log(2);
    EXPECT_EQ(CheckParameter(&required, &parameters), -1);
    EXPECT_EQ(log.Messages(),
              std::vector<std::string>{"CheckParameter() [N] : ***** Space UUID must be set"});
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
