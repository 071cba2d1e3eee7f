// Every command option: what it chooses, what it needs and what is said when that is missing.
#include "cli/options.h"

#include "tests/support/captured_log.h"
#include "tests/unit/cli/options_fixture.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
const Arguments kMount = {"--mount-path", "/volume1"};
const Arguments kConfig = {"--config-path", "/etc/pin.json"};
const Arguments kStart = {"--start-sector", "128"};
const Arguments kCount = {"--num-sectors", "256"};

struct CommandCase {
    const char *name;
    Arguments arguments; // the command option and all that it needs
    ToolCommand command;
};

class CommandOptionTest : public OptionsTest, public ::testing::WithParamInterface<CommandCase> {};

const CommandCase kCommandCases[] = {
    {"pinFiles", Arguments{"--pin-files", "/"} + kMount, kCommandPinFiles},
    {"unpinFiles", Arguments{"--unpin-files", "/;/dev"} + kMount, kCommandUnpinFiles},
    {"sendBitmap", Arguments{"--send-bitmap"} + kMount, kCommandSendBitmap},
    {"startService", Arguments{"--start-service"} + kConfig, kCommandStartService},
    {"handleMount", Arguments{"--handle-mount"} + kMount + kConfig, kCommandHandleMount},
    {"handleUmount", Arguments{"--handle-umount"} + kMount, kCommandHandleUmount},
    {"supportPin", Arguments{"--support-pin"} + kMount, kCommandSupportPin},
    {"checkBitmap", Arguments{"--check-bitmap"} + kMount, kCommandCheckBitmap},
    {"addPending", Arguments{"--add-pending"} + kMount, kCommandAddPendingSpace},
    {"removePending", Arguments{"--remove-pending"} + kMount, kCommandRemovePendingSpace},
    {"getUuid", Arguments{"--get-uuid"} + kMount, kCommandGetUUID},
    {"deleteBitmap", Arguments{"--delete-bitmap"} + kMount, kCommandDeleteBitmap},
    {"checkPin", Arguments{"--check-pin", "/"} + kConfig, kCommandCheckPin},
    {"reloadBlocks", Arguments{"--reload-blocks"} + kMount, kCommandReloadPinBlocks},
    {"unpinAllByMountPath", Arguments{"--unpin-all"} + kMount, kCommandUnpinAllBlocks},
    {"unpinAllByCachePath", {"--unpin-all", "--cache-path", "/no/such"}, kCommandUnpinAllBlocks},
    {"isAllUnpin", {"--is-all-unpin", "/"}, kCommandIsAllUnpin},
    {"setBitmap", Arguments{"--set-bitmap"} + kMount + kStart + kCount, kCommandSetBitmap},
    {"unsetBitmap", Arguments{"--unset-bitmap"} + kMount + kStart + kCount, kCommandUnsetBitmap},
    {"unpinRange", Arguments{"--unpin-range"} + kMount + kStart + kCount, kCommandUnpinRange},
    {"getBitmapSize", Arguments{"--get-bitmap-size-byte"} + kMount, kCommandGetBitmapSizeByte},
    {"none", {}, kCommandInvalid},
    // Short options that getopt_long knows, with or without a blank before the argument.
    {"shortPinFiles", {"-a", "/", "-j/volume1"}, kCommandPinFiles},
    {"shortUnpinFiles", {"-b/", "-j", "/volume1"}, kCommandUnpinFiles},
    {"shortStartService", {"-cf", "c"}, kCommandStartService},
    {"shortSendBitmap", {"-ij/volume1"}, kCommandSendBitmap},
    {"shortSupportPin", {"-kj/volume1"}, kCommandSupportPin},
    {"shortCheckBitmap", {"-mj/volume1"}, kCommandCheckBitmap},
    {"shortAddPending", {"-nj/volume1"}, kCommandAddPendingSpace},
    {"shortRemovePending", {"-oj/volume1"}, kCommandRemovePendingSpace},
    {"shortHandleMount", {"-pj/volume1", "-fc"}, kCommandHandleMount},
    {"shortHandleUmount", {"-qj/volume1"}, kCommandHandleUmount},
    {"shortDeleteBitmap", {"-sj/volume1"}, kCommandDeleteBitmap},
    {"shortCheckPin", {"-t/", "-fc"}, kCommandCheckPin},
    {"shortReloadBlocks", {"-uj/volume1"}, kCommandReloadPinBlocks},
    {"shortUnpinAll", {"-vj/volume1"}, kCommandUnpinAllBlocks},
    {"shortIsAllUnpin", {"-w/"}, kCommandIsAllUnpin},
};

// A command option with one of the things it needs left out.
struct MissingCase {
    const char *name;
    Arguments arguments;
    const char *message;
};

class MissingParameterTest : public OptionsTest,
                             public ::testing::WithParamInterface<MissingCase> {};

const char kNoMount[] = "tool: Mount path must be set\ntool: Check parameter failed\n";
const char kNoConfig[] = "tool: Config path must be set\ntool: Check parameter failed\n";
const char kNoStart[] = "tool: Start sector is not set\ntool: Check parameter failed\n";
const char kNoCount[] = "tool: Num of sectors is not set\ntool: Check parameter failed\n";

const MissingCase kMissingCases[] = {
    {"pinFiles", {"--pin-files", "/"}, kNoMount},
    {"unpinFiles", {"--unpin-files", "/"}, kNoMount},
    {"sendBitmap", {"--send-bitmap"}, kNoMount},
    {"startService", {"--start-service"}, kNoConfig},
    {"handleMountWithoutConfig", Arguments{"--handle-mount"} + kMount, kNoConfig},
    {"handleMountWithoutMount", Arguments{"--handle-mount"} + kConfig, kNoMount},
    {"handleUmount", {"--handle-umount"}, kNoMount},
    {"supportPin", {"--support-pin"}, kNoMount},
    {"checkBitmap", {"--check-bitmap"}, kNoMount},
    {"addPending", {"--add-pending"}, kNoMount},
    {"removePending", {"--remove-pending"}, kNoMount},
    {"getUuid", {"--get-uuid"}, kNoMount},
    {"deleteBitmap", {"--delete-bitmap"}, kNoMount},
    {"checkPin", {"--check-pin", "/"}, kNoConfig},
    {"reloadBlocks", {"--reload-blocks"}, kNoMount},
    {"setBitmapWithoutMount", Arguments{"--set-bitmap"} + kStart + kCount, kNoMount},
    {"setBitmapWithoutStart", Arguments{"--set-bitmap"} + kMount + kCount, kNoStart},
    {"setBitmapWithoutCount", Arguments{"--set-bitmap"} + kMount + kStart, kNoCount},
    {"unsetBitmapWithoutMount", Arguments{"--unset-bitmap"} + kStart + kCount, kNoMount},
    {"unsetBitmapWithoutStart", Arguments{"--unset-bitmap"} + kMount + kCount, kNoStart},
    {"unsetBitmapWithoutCount", Arguments{"--unset-bitmap"} + kMount + kStart, kNoCount},
    {"unpinRangeWithoutMount", Arguments{"--unpin-range"} + kStart + kCount, kNoMount},
    {"unpinRangeWithoutStart", Arguments{"--unpin-range"} + kMount + kCount, kNoStart},
    {"unpinRangeWithoutCount", Arguments{"--unpin-range"} + kMount + kStart, kNoCount},
    {"getBitmapSize", {"--get-bitmap-size-byte"}, kNoMount},
    {"pinFilesThatAreMissing", Arguments{"--pin-files", "/no/such"} + kMount,
     "tool: File (path /no/such) doesn't exist\n"
     "tool: Check file paths error\ntool: Check parameter failed\n"},
    {"unpinFilesThatAreNone", Arguments{"--unpin-files", ";"} + kMount,
     "tool: No availiable files in the file paths (;)\n"
     "tool: Check file paths error\ntool: Check parameter failed\n"},
    {"isAllUnpinOfNoSuchDevice",
     {"--is-all-unpin", "/no/such/dev"},
     "tool: Error: Cache path (/no/such/dev) doesn't exist\ntool: Check parameter failed\n"},
    {"unpinAllWithoutAnyPath",
     {"--unpin-all"},
     "tool: You must use --mount-path or --cache-path option!\n"},
    {"unpinAllWithBothPaths", Arguments{"--unpin-all", "--cache-path", "/"} + kMount,
     "tool: Only one of --mount-path or --cache-path can be set!\n"},
    {"checkPinOfNoSuchFile", Arguments{"--check-pin", "/no/such"} + kConfig,
     "tool: File (/no/such) doesn't exist\n"},
    {"spaceUuidWithoutCache",
     {"--space-uuid", "uuid-9"},
     "tool: Space UUID uuid-9 doesn't has cache\n"},
};

template <typename Case> std::string CaseName(const ::testing::TestParamInfo<Case> &info) {
    return info.param.name;
}
} // namespace

TEST_P(CommandOptionTest, ChoosesTheCommandWithoutAMessage) {
    CapturedLog log;
    EXPECT_EQ(Parse(GetParam().arguments), 0);
    EXPECT_EQ(parameters.command, GetParam().command);
    EXPECT_EQ(log.Text(), "");
}

INSTANTIATE_TEST_SUITE_P(All, CommandOptionTest, ::testing::ValuesIn(kCommandCases),
                         CaseName<CommandCase>);

TEST_P(MissingParameterTest, FailsWithItsMessage) {
    CapturedLog log;
    EXPECT_EQ(Parse(GetParam().arguments), -1);
    EXPECT_EQ(log.Text(), GetParam().message);
}

INSTANTIATE_TEST_SUITE_P(All, MissingParameterTest, ::testing::ValuesIn(kMissingCases),
                         CaseName<MissingCase>);
} // namespace vesk
