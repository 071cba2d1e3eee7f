// Every command option: what it chooses, what it needs and what is said when that is missing.
#include "cli/options.h"

#include "tests/support/captured_log.h"
#include "tests/unit/cli/options_fixture.h"

#include <gtest/gtest.h>

namespace {

const Arguments mount = {"--mount-path", "/volume1"};
const Arguments config = {"--config-path", "/etc/pin.json"};
const Arguments start = {"--start-sector", "128"};
const Arguments count = {"--num-sectors", "256"};

struct CommandCase {
    const char *name;
    Arguments arguments; // the command option and all that it needs
    ToolCommand command;
};

class CommandOptionTest : public OptionsTest, public ::testing::WithParamInterface<CommandCase> {};

const CommandCase commandCases[] = {
    {"pinFiles", Arguments{"--pin-files", "/"} + mount, commandPinFiles},
    {"unpinFiles", Arguments{"--unpin-files", "/;/dev"} + mount, commandUnpinFiles},
    {"sendBitmap", Arguments{"--send-bitmap"} + mount, commandSendBitmap},
    {"startService", Arguments{"--start-service"} + config, commandStartService},
    {"handleMount", Arguments{"--handle-mount"} + mount + config, commandHandleMount},
    {"handleUmount", Arguments{"--handle-umount"} + mount, commandHandleUmount},
    {"supportPin", Arguments{"--support-pin"} + mount, commandSupportPin},
    {"checkBitmap", Arguments{"--check-bitmap"} + mount, commandCheckBitmap},
    {"addPending", Arguments{"--add-pending"} + mount, commandAddPendingSpace},
    {"removePending", Arguments{"--remove-pending"} + mount, commandRemovePendingSpace},
    {"getUuid", Arguments{"--get-uuid"} + mount, commandGetUUID},
    {"deleteBitmap", Arguments{"--delete-bitmap"} + mount, commandDeleteBitmap},
    {"checkPin", Arguments{"--check-pin", "/"} + config, commandCheckPin},
    {"reloadBlocks", Arguments{"--reload-blocks"} + mount, commandReloadPinBlocks},
    {"unpinAllByMountPath", Arguments{"--unpin-all"} + mount, commandUnpinAllBlocks},
    {"unpinAllByCachePath", {"--unpin-all", "--cache-path", "/no/such"}, commandUnpinAllBlocks},
    {"isAllUnpin", {"--is-all-unpin", "/"}, commandIsAllUnpin},
    {"setBitmap", Arguments{"--set-bitmap"} + mount + start + count, commandSetBitmap},
    {"unsetBitmap", Arguments{"--unset-bitmap"} + mount + start + count, commandUnsetBitmap},
    {"unpinRange", Arguments{"--unpin-range"} + mount + start + count, commandUnpinRange},
    {"getBitmapSize", Arguments{"--get-bitmap-size-byte"} + mount, commandGetBitmapSizeByte},
    {"none", {}, commandInvalid},
    // Short options that getopt_long knows, with or without a blank before the argument.
    {"shortPinFiles", {"-a", "/", "-j/volume1"}, commandPinFiles},
    {"shortUnpinFiles", {"-b/", "-j", "/volume1"}, commandUnpinFiles},
    {"shortStartService", {"-cf", "c"}, commandStartService},
    {"shortSendBitmap", {"-ij/volume1"}, commandSendBitmap},
    {"shortSupportPin", {"-kj/volume1"}, commandSupportPin},
    {"shortCheckBitmap", {"-mj/volume1"}, commandCheckBitmap},
    {"shortAddPending", {"-nj/volume1"}, commandAddPendingSpace},
    {"shortRemovePending", {"-oj/volume1"}, commandRemovePendingSpace},
    {"shortHandleMount", {"-pj/volume1", "-fc"}, commandHandleMount},
    {"shortHandleUmount", {"-qj/volume1"}, commandHandleUmount},
    {"shortDeleteBitmap", {"-sj/volume1"}, commandDeleteBitmap},
    {"shortCheckPin", {"-t/", "-fc"}, commandCheckPin},
    {"shortReloadBlocks", {"-uj/volume1"}, commandReloadPinBlocks},
    {"shortUnpinAll", {"-vj/volume1"}, commandUnpinAllBlocks},
    {"shortIsAllUnpin", {"-w/"}, commandIsAllUnpin},
};

// A command option with one of the things it needs left out.
struct MissingCase {
    const char *name;
    Arguments arguments;
    const char *message;
};

class MissingParameterTest : public OptionsTest,
                             public ::testing::WithParamInterface<MissingCase> {};

const char noMount[] = "tool: Mount path must be set\ntool: Check parameter failed\n";
const char noConfig[] = "tool: Config path must be set\ntool: Check parameter failed\n";
const char noStart[] = "tool: Start sector is not set\ntool: Check parameter failed\n";
const char noCount[] = "tool: Num of sectors is not set\ntool: Check parameter failed\n";

const MissingCase missingCases[] = {
    {"pinFiles", {"--pin-files", "/"}, noMount},
    {"unpinFiles", {"--unpin-files", "/"}, noMount},
    {"sendBitmap", {"--send-bitmap"}, noMount},
    {"startService", {"--start-service"}, noConfig},
    {"handleMountWithoutConfig", Arguments{"--handle-mount"} + mount, noConfig},
    {"handleMountWithoutMount", Arguments{"--handle-mount"} + config, noMount},
    {"handleUmount", {"--handle-umount"}, noMount},
    {"supportPin", {"--support-pin"}, noMount},
    {"checkBitmap", {"--check-bitmap"}, noMount},
    {"addPending", {"--add-pending"}, noMount},
    {"removePending", {"--remove-pending"}, noMount},
    {"getUuid", {"--get-uuid"}, noMount},
    {"deleteBitmap", {"--delete-bitmap"}, noMount},
    {"checkPin", {"--check-pin", "/"}, noConfig},
    {"reloadBlocks", {"--reload-blocks"}, noMount},
    {"setBitmapWithoutMount", Arguments{"--set-bitmap"} + start + count, noMount},
    {"setBitmapWithoutStart", Arguments{"--set-bitmap"} + mount + count, noStart},
    {"setBitmapWithoutCount", Arguments{"--set-bitmap"} + mount + start, noCount},
    {"unsetBitmapWithoutMount", Arguments{"--unset-bitmap"} + start + count, noMount},
    {"unsetBitmapWithoutStart", Arguments{"--unset-bitmap"} + mount + count, noStart},
    {"unsetBitmapWithoutCount", Arguments{"--unset-bitmap"} + mount + start, noCount},
    {"unpinRangeWithoutMount", Arguments{"--unpin-range"} + start + count, noMount},
    {"unpinRangeWithoutStart", Arguments{"--unpin-range"} + mount + count, noStart},
    {"unpinRangeWithoutCount", Arguments{"--unpin-range"} + mount + start, noCount},
    {"getBitmapSize", {"--get-bitmap-size-byte"}, noMount},
    {"pinFilesThatAreMissing", Arguments{"--pin-files", "/no/such"} + mount,
     "tool: File (path /no/such) doesn't exist\n"
     "tool: Check file paths error\ntool: Check parameter failed\n"},
    {"unpinFilesThatAreNone", Arguments{"--unpin-files", ";"} + mount,
     "tool: No availiable files in the file paths (;)\n"
     "tool: Check file paths error\ntool: Check parameter failed\n"},
    {"isAllUnpinOfNoSuchDevice",
     {"--is-all-unpin", "/no/such/dev"},
     "tool: Error: Cache path (/no/such/dev) doesn't exist\ntool: Check parameter failed\n"},
    {"unpinAllWithoutAnyPath",
     {"--unpin-all"},
     "tool: You must use --mount-path or --cache-path option!\n"},
    {"unpinAllWithBothPaths", Arguments{"--unpin-all", "--cache-path", "/"} + mount,
     "tool: Only one of --mount-path or --cache-path can be set!\n"},
    {"checkPinOfNoSuchFile", Arguments{"--check-pin", "/no/such"} + config,
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

INSTANTIATE_TEST_SUITE_P(All, CommandOptionTest, ::testing::ValuesIn(commandCases),
                         CaseName<CommandCase>);

TEST_P(MissingParameterTest, FailsWithItsMessage) {
    CapturedLog log;
    EXPECT_EQ(Parse(GetParam().arguments), -1);
    EXPECT_EQ(log.Text(), GetParam().message);
}

INSTANTIATE_TEST_SUITE_P(All, MissingParameterTest, ::testing::ValuesIn(missingCases),
                         CaseName<MissingCase>);
