// What each command runs, logs and ends with.
#include "tests/unit/cli/main_fixture.h"

namespace vesk {
namespace {
struct CommandCase {
    const char *name;
    Arguments arguments;
    int result; // of the operation behind the command
    const char *output;
    int status;
};

// Without it the test's description has the bytes of the pointers in it.
void PrintTo(const CommandCase &one, std::ostream *out) {
    *out << one.name;
}

class MainCommandTest : public MainTest, public ::testing::WithParamInterface<CommandCase> {};

const CommandCase kCommandCases[] = {
    {"pinFilesOk", Arguments{"--pin-files", "/;/dev"} + kMount, 0,
     "tool: Send pin file request, files = /;/dev\n"
     "[PinFilesRequest /volume1 /;/dev]\n"
     "tool: Send pin file request OK\n",
     0},
    {"pinFilesFailed", Arguments{"--pin-files", "/;/dev"} + kMount, -1,
     "tool: Send pin file request, files = /;/dev\n"
     "[PinFilesRequest /volume1 /;/dev]\n"
     "tool: Pin files failed\n",
     255},
    {"unpinFilesOk", Arguments{"--unpin-files", "/"} + kMount, 0,
     "tool: Send unpin file request, files = /\n"
     "[UnpinFilesRequest /volume1 /]\n"
     "tool: Send unpin files request OK\n",
     0},
    {"unpinFilesFailed", Arguments{"--unpin-files", "/"} + kMount, -1,
     "tool: Send unpin file request, files = /\n"
     "[UnpinFilesRequest /volume1 /]\n"
     "tool: Unpin files failed\n",
     255},
    {"sendBitmapOk", Arguments{"--send-bitmap"} + kMount, 0,
     "tool: Start to send bitmap for volume (/volume1)\n"
     "[SendBitmap /volume1]\n"
     "tool: Send bitmap OK\n",
     0},
    {"sendBitmapFailed", Arguments{"--send-bitmap"} + kMount, -1,
     "tool: Start to send bitmap for volume (/volume1)\n"
     "[SendBitmap /volume1]\n"
     "tool: Send bitmap to space (/volume1) failed\n",
     255},
    {"startServiceEnded",
     {"--start-service", "--config-path", "c"},
     0,
     "tool: Service starts (Build time: 2018-06-08-15:24)\n"
     "[StartService c]\n",
     0},
    {"startServiceFailed",
     {"--start-service", "--config-path", "c"},
     -1,
     "tool: Service starts (Build time: 2018-06-08-15:24)\n"
     "[StartService c]\n"
     "tool: Can't start service\n",
     255},
    {"handleMountOkIsSilent", Arguments{"--handle-mount", "--config-path", "c"} + kMount, 0,
     "[HandleSpaceMount c /volume1]\n", 0},
    {"handleMountOkSpeaksWithVerbose",
     Arguments{"--verbose", "--handle-mount", "--config-path", "c"} + kMount, 0,
     "tool: Verbose mode is enable\n"
     "tool: main() [N] : +++++\n"
     "[HandleSpaceMount c /volume1]\n"
     "tool: main() [N]: Handle space (/volume1) mount OK\n"
     "tool: main() [N] : -----\n",
     0},
    {"handleMountFailed", Arguments{"--handle-mount", "--config-path", "c"} + kMount, -1,
     "[HandleSpaceMount c /volume1]\n"
     "tool: Handle space (/volume1) mount failed\n",
     255},
    {"handleUmountOkIsSilent", Arguments{"--handle-umount"} + kMount, 0,
     "[HandleSpaceUmount /volume1]\n", 0},
    {"handleUmountOkSpeaksWithVerbose", Arguments{"--verbose", "--handle-umount"} + kMount, 0,
     "tool: Verbose mode is enable\n"
     "tool: main() [N] : +++++\n"
     "[HandleSpaceUmount /volume1]\n"
     "tool: main() [N]: Handle space (/volume1) umount OK\n"
     "tool: main() [N] : -----\n",
     0},
    {"handleUmountFailed", Arguments{"--handle-umount"} + kMount, -1,
     "[HandleSpaceUmount /volume1]\n"
     "tool: Handle space (/volume1) umount failed\n",
     255},
    {"checkBitmapSet", Arguments{"--check-bitmap"} + kMount, 1, "[CheckBitmapSet /volume1]\nYes\n",
     0},
    {"checkBitmapNotSet", Arguments{"--check-bitmap"} + kMount, 0,
     "[CheckBitmapSet /volume1]\nNo\n", 0},
    {"addPendingOk", Arguments{"--add-pending"} + kMount, 0,
     "[AddPendingSpaceRequest /volume1]\n"
     "tool: Set pending space OK\n",
     0},
    {"addPendingFailed", Arguments{"--add-pending"} + kMount, -1,
     "[AddPendingSpaceRequest /volume1]\n"
     "tool: Can't sent pending space\n",
     255},
    {"removePendingOk", Arguments{"--remove-pending"} + kMount, 0,
     "[RemovePendingSpaceRequest /volume1]\n"
     "tool: Set pending space OK\n",
     0},
    {"removePendingFailed", Arguments{"--remove-pending"} + kMount, -1,
     "[RemovePendingSpaceRequest /volume1]\n"
     "tool: Can't sent pending space\n",
     255},
    {"deleteBitmapOk", Arguments{"--delete-bitmap"} + kMount, 0,
     "[DeleteBitmap /volume1]\n"
     "tool: Delete bitmap on volume (/volume1) OK\n",
     0},
    {"deleteBitmapFailed", Arguments{"--delete-bitmap"} + kMount, -1,
     "[DeleteBitmap /volume1]\n"
     "tool: Delete bitmap on volume (/volume1) failed\n",
     255},
    {"checkPinPinned",
     {"--check-pin", "/", "--config-path", "c"},
     0,
     "[CheckFileIsPin c /]\nYes\n",
     0},
    {"checkPinNotPinned",
     {"--check-pin", "/", "--config-path", "c"},
     1,
     "[CheckFileIsPin c /]\nNo\n",
     0},
    {"checkPinErrorStillSucceeds",
     {"--check-pin", "/", "--config-path", "c"},
     2,
     "[CheckFileIsPin c /]\nError\n",
     0},
    {"checkPinOtherPrintsNothing",
     {"--check-pin", "/", "--config-path", "c"},
     3,
     "[CheckFileIsPin c /]\n",
     0},
    {"reloadOk", Arguments{"--reload-blocks"} + kMount, 0,
     "tool: Start to send reload block request\n"
     "[ReloadPinBlocksRequest /volume1]\n"
     "tool: Send reload block request OK\n",
     0},
    {"reloadFailed", Arguments{"--reload-blocks"} + kMount, -1,
     "tool: Start to send reload block request\n"
     "[ReloadPinBlocksRequest /volume1]\n"
     "tool: Reload blocks on volume (/volume1) failed\n",
     255},
    {"unpinAllOkLogsForItself", Arguments{"--unpin-all"} + kMount, 0, "[UnpinAllBlocks /volume1]\n",
     0},
    {"unpinAllFailedLogsForItself", Arguments{"--unpin-all"} + kMount, -1,
     "[UnpinAllBlocks /volume1]\n", 255},
    {"setBitmapOk", Range("--set-bitmap"), 0,
     "[SetBitmap /volume1 128 18446744073709551]\n"
     "tool: Set bitmap on volume (/volume1) OK "
     "(Start sector = 128 Num of sector = 18446744073709551)\n",
     0},
    {"setBitmapFailed", Range("--set-bitmap"), -1,
     "[SetBitmap /volume1 128 18446744073709551]\n"
     "tool: Set bitmap on volume (/volume1) failed "
     "(Start sector = 128 Num of sector = 18446744073709551)\n",
     255},
    {"unsetBitmapOk", Range("--unset-bitmap"), 0,
     "[UnsetBitmap /volume1 128 18446744073709551]\n"
     "tool: Unset bitmap on volume (/volume1) OK "
     "(Start sector = 128 Num of sector = 18446744073709551)\n",
     0},
    {"unsetBitmapFailed", Range("--unset-bitmap"), -1,
     "[UnsetBitmap /volume1 128 18446744073709551]\n"
     "tool: Unset bitmap on volume (/volume1) failed "
     "(Start sector = 128 Num of sector = 18446744073709551)\n",
     255},
    {"getBitmapSizeFailed", Arguments{"--get-bitmap-size-byte"} + kMount, -1,
     "[GetBitmapSizeByte /volume1]\n"
     "tool: Get bitmap size for volume (/volume1) failed\n",
     255},
};

std::string CaseName(const ::testing::TestParamInfo<CommandCase> &info) {
    return info.param.name;
}
} // namespace

TEST_P(MainCommandTest, RunsItsOperation) {
    const Outcome run = ToolWith(GetParam().result, GetParam().arguments);
    EXPECT_EQ(run.output, GetParam().output);
    EXPECT_EQ(run.status, GetParam().status);
    EXPECT_EQ(run.systemLog, "");
}

INSTANTIATE_TEST_SUITE_P(All, MainCommandTest, ::testing::ValuesIn(kCommandCases), CaseName);
} // namespace vesk
