// What each command runs, prints, logs and ends with.
#include "cli/main_fixture.h"

#include <cerrno>

namespace {

const std::vector<std::string> mount = {"--mount-path", "/volume1"};

std::vector<std::string> operator+(std::vector<std::string> left,
                                   const std::vector<std::string> &right) {
    left.insert(left.end(), right.begin(), right.end());
    return left;
}

std::vector<std::string> Range(const char *command) {
    return std::vector<std::string>{command, "--start-sector", "128", "--num-sectors",
                                    "18446744073709551"} +
           mount;
}

struct CommandCase {
    const char *name;
    std::vector<std::string> arguments;
    int result; // of the operation behind the command
    const char *output;
    int status;
};

class MainCommandTest : public MainTest, public ::testing::WithParamInterface<CommandCase> {};

const CommandCase commandCases[] = {
    {"pinFilesOk", std::vector<std::string>{"--pin-files", "/;/dev"} + mount, 0,
     "tool: Send pin file request, files = /;/dev\n"
     "[PinFilesRequest /volume1 /;/dev]\n"
     "tool: Send pin file request OK\n",
     0},
    {"pinFilesFailed", std::vector<std::string>{"--pin-files", "/;/dev"} + mount, -1,
     "tool: Send pin file request, files = /;/dev\n"
     "[PinFilesRequest /volume1 /;/dev]\n"
     "tool: Pin files failed\n",
     255},
    {"unpinFilesOk", std::vector<std::string>{"--unpin-files", "/"} + mount, 0,
     "tool: Send unpin file request, files = /\n"
     "[UnpinFilesRequest /volume1 /]\n"
     "tool: Send unpin files request OK\n",
     0},
    {"unpinFilesFailed", std::vector<std::string>{"--unpin-files", "/"} + mount, -1,
     "tool: Send unpin file request, files = /\n"
     "[UnpinFilesRequest /volume1 /]\n"
     "tool: Unpin files failed\n",
     255},
    {"sendBitmapOk", std::vector<std::string>{"--send-bitmap"} + mount, 0,
     "tool: Start to send bitmap for volume (/volume1)\n"
     "[SendBitmap /volume1]\n"
     "tool: Send bitmap OK\n",
     0},
    {"sendBitmapFailed", std::vector<std::string>{"--send-bitmap"} + mount, -1,
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
    {"handleMountOkIsSilent",
     std::vector<std::string>{"--handle-mount", "--config-path", "c"} + mount, 0,
     "[HandleSpaceMount c /volume1]\n", 0},
    {"handleMountOkSpeaksWithVerbose",
     std::vector<std::string>{"--verbose", "--handle-mount", "--config-path", "c"} + mount, 0,
     "tool: Verbose mode is enable\n"
     "tool: main() [N] : +++++\n"
     "[HandleSpaceMount c /volume1]\n"
     "tool: main() [N]: Handle space (/volume1) mount OK\n"
     "tool: main() [N] : -----\n",
     0},
    {"handleMountFailed", std::vector<std::string>{"--handle-mount", "--config-path", "c"} + mount,
     -1,
     "[HandleSpaceMount c /volume1]\n"
     "tool: Handle space (/volume1) mount failed\n",
     255},
    {"handleUmountOkIsSilent", std::vector<std::string>{"--handle-umount"} + mount, 0,
     "[HandleSpaceUmount /volume1]\n", 0},
    {"handleUmountOkSpeaksWithVerbose",
     std::vector<std::string>{"--verbose", "--handle-umount"} + mount, 0,
     "tool: Verbose mode is enable\n"
     "tool: main() [N] : +++++\n"
     "[HandleSpaceUmount /volume1]\n"
     "tool: main() [N]: Handle space (/volume1) umount OK\n"
     "tool: main() [N] : -----\n",
     0},
    {"handleUmountFailed", std::vector<std::string>{"--handle-umount"} + mount, -1,
     "[HandleSpaceUmount /volume1]\n"
     "tool: Handle space (/volume1) umount failed\n",
     255},
    {"checkBitmapSet", std::vector<std::string>{"--check-bitmap"} + mount, 1,
     "[CheckBitmapSet /volume1]\nYes\n", 0},
    {"checkBitmapNotSet", std::vector<std::string>{"--check-bitmap"} + mount, 0,
     "[CheckBitmapSet /volume1]\nNo\n", 0},
    {"addPendingOk", std::vector<std::string>{"--add-pending"} + mount, 0,
     "[AddPendingSpaceRequest /volume1]\n"
     "tool: Set pending space OK\n",
     0},
    {"addPendingFailed", std::vector<std::string>{"--add-pending"} + mount, -1,
     "[AddPendingSpaceRequest /volume1]\n"
     "tool: Can't sent pending space\n",
     255},
    {"removePendingOk", std::vector<std::string>{"--remove-pending"} + mount, 0,
     "[RemovePendingSpaceRequest /volume1]\n"
     "tool: Set pending space OK\n",
     0},
    {"removePendingFailed", std::vector<std::string>{"--remove-pending"} + mount, -1,
     "[RemovePendingSpaceRequest /volume1]\n"
     "tool: Can't sent pending space\n",
     255},
    {"deleteBitmapOk", std::vector<std::string>{"--delete-bitmap"} + mount, 0,
     "[DeleteBitmap /volume1]\n"
     "tool: Delete bitmap on volume (/volume1) OK\n",
     0},
    {"deleteBitmapFailed", std::vector<std::string>{"--delete-bitmap"} + mount, -1,
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
    {"reloadOk", std::vector<std::string>{"--reload-blocks"} + mount, 0,
     "tool: Start to send reload block request\n"
     "[ReloadPinBlocksRequest /volume1]\n"
     "tool: Send reload block request OK\n",
     0},
    {"reloadFailed", std::vector<std::string>{"--reload-blocks"} + mount, -1,
     "tool: Start to send reload block request\n"
     "[ReloadPinBlocksRequest /volume1]\n"
     "tool: Reload blocks on volume (/volume1) failed\n",
     255},
    {"unpinAllOkLogsForItself", std::vector<std::string>{"--unpin-all"} + mount, 0,
     "[UnpinAllBlocks /volume1]\n", 0},
    {"unpinAllFailedLogsForItself", std::vector<std::string>{"--unpin-all"} + mount, -1,
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
    {"getBitmapSizeFailed", std::vector<std::string>{"--get-bitmap-size-byte"} + mount, -1,
     "[GetBitmapSizeByte /volume1]\n"
     "tool: Get bitmap size for volume (/volume1) failed\n",
     255},
};

} // namespace

TEST_P(MainCommandTest, RunsItsOperation) {
    const Outcome run = ToolWith(GetParam().result, GetParam().arguments);
    EXPECT_EQ(run.output, GetParam().output);
    EXPECT_EQ(run.status, GetParam().status);
    EXPECT_EQ(run.systemLog, "");
}

INSTANTIATE_TEST_SUITE_P(All, MainCommandTest, ::testing::ValuesIn(commandCases),
                         [](const auto &info) { return std::string(info.param.name); });

TEST_F(MainTest, BitmapSizeIsANumberAndALineFeed) {
    FakeCommands::bitmapSize = 18446744073709551615ULL;
    const Outcome run = Tool(std::vector<std::string>{"--get-bitmap-size-byte"} + mount);
    EXPECT_EQ(run.output, "[GetBitmapSizeByte /volume1]\n18446744073709551615\n");
    EXPECT_EQ(run.status, 0);
}

TEST_F(MainTest, SupportPinPrintsYesOrNoAndSucceeds) {
    FakeApplianceOneVolume("/dev/mapper/cachedev_0");
    Outcome run = ToolWith(0, std::vector<std::string>{"--support-pin"} + mount);
    EXPECT_EQ(run.output, "Yes\n");
    EXPECT_EQ(run.status, 0);
    FakeAppliance::caches[0].supportPin = 0;
    run = ToolWith(0, std::vector<std::string>{"--support-pin"} + mount);
    EXPECT_EQ(run.output, "No\n");
    EXPECT_EQ(run.status, 0);
}

TEST_F(MainTest, SupportPinOnAPathThatIsNoVolumePrintsNoAndSucceeds) {
    const Outcome run = Tool({"--support-pin", "--mount-path", "/home"});
    EXPECT_EQ(run.output, "No\n");
    EXPECT_EQ(run.status, 0);
    EXPECT_EQ(run.systemLog,
              "veskcachepinfiletool.cpp:N Can't get space uuid from mount path (/home)\n");
}

TEST_F(MainTest, GetUuidPrintsItAndSucceeds) {
    FakeApplianceOneVolume("/dev/mapper/cachedev_0");
    const Outcome run = ToolWith(0, std::vector<std::string>{"--get-uuid"} + mount);
    EXPECT_EQ(run.output, "uuid-1\n");
    EXPECT_EQ(run.status, 0);
}

TEST_F(MainTest, GetUuidOfNoVolumePrintsNothingAndSucceeds) {
    const Outcome run = ToolWith(0, std::vector<std::string>{"--get-uuid"} + mount);
    EXPECT_EQ(run.output, "");
    EXPECT_EQ(run.status, 0);
}

TEST_F(MainTest, IsAllUnpinPrintsTheDriversAnswer) {
    for (const int answer : {0, 1, -1, 2}) {
        FakeLibc::onIoctl = [answer](unsigned long request, void *data) {
            *static_cast<int *>(data) = answer;
            return request == 0x8004FED2 ? 0 : -1;
        };
        const Outcome run = ToolWith(0, {"--is-all-unpin", "/dev/null"});
        EXPECT_EQ(run.output, answer != 0 ? "Yes\n" : "No\n");
        EXPECT_EQ(run.status, 0);
    }
}

TEST_F(MainTest, IsAllUnpinOnACacheThatCannotTellSaysSoAndFails) {
    FakeLibc::onIoctl = [](unsigned long, void *) { return -1; };
    const Outcome run = Tool({"--is-all-unpin", "/dev/null"});
    EXPECT_EQ(run.output, "Get unpin information failed. (This cache doesn't support pin ?)\n");
    EXPECT_EQ(run.status, 255);
}

TEST_F(MainTest, UnpinRangeReportsTheRange) {
    FakeApplianceOneVolume("/dev/null");
    FakeLibc::onIoctl = [](unsigned long, void *) { return 0; };
    Outcome run = ToolWith(0, Range("--unpin-range"));
    EXPECT_EQ(run.output, "tool: Unpin range in cache (volume = /volume1) OK "
                          "(Start sector = 128 Num of sector = 18446744073709551)\n");
    EXPECT_EQ(run.status, 0);

    FakeAppliance::Reset();
    run = ToolWith(0, Range("--unpin-range"));
    EXPECT_EQ(run.status, 255);
    const std::string last = "tool: Unpin range in cache (volume = /volume1) failed "
                             "(Start sector = 128 Num of sector = 18446744073709551)\n";
    ASSERT_GE(run.output.size(), last.size());
    EXPECT_EQ(run.output.substr(run.output.size() - last.size()), last);
}
