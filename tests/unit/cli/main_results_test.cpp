// What commands print for scripts, and the exit status that goes with it. The driver and the
// appliance answer as the test says.
#include "tests/unit/cli/main_fixture.h"

#include <json/value.h>
#include <new>

namespace vesk {
TEST_F(MainTest, BitmapSizeIsANumberAndALineFeed) {
    FakeCommands::bitmapSize = 18446744073709551615ULL;
    const Outcome run = Tool(Arguments{"--get-bitmap-size-byte"} + kMount);
    EXPECT_EQ(run.output, "[GetBitmapSizeByte /volume1]\n18446744073709551615\n");
    EXPECT_EQ(run.status, 0);
}

TEST_F(MainTest, SupportPinPrintsYesOrNoAndSucceeds) {
    FakeApplianceOneVolume("/dev/mapper/cachedev_0");
    Outcome run = ToolWith(0, Arguments{"--support-pin"} + kMount);
    EXPECT_EQ(run.output, "Yes\n");
    EXPECT_EQ(run.status, 0);
    FakeAppliance::caches[0].supportPin = 0;
    run = ToolWith(0, Arguments{"--support-pin"} + kMount);
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
    const Outcome run = ToolWith(0, Arguments{"--get-uuid"} + kMount);
    EXPECT_EQ(run.output, "uuid-1\n");
    EXPECT_EQ(run.status, 0);
}

TEST_F(MainTest, GetUuidOfNoVolumePrintsNothingAndSucceeds) {
    const Outcome run = ToolWith(0, Arguments{"--get-uuid"} + kMount);
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

TEST_F(MainTest, MemoryThatRunsOutIsAnErrorAndEndsWith255) {
    FakeCommands::onOperation = [] { throw std::bad_alloc(); };
    Outcome run = ToolWith(0, Arguments{"--check-bitmap"} + kMount); // otherwise always 0
    EXPECT_EQ(run.output, "[CheckBitmapSet /volume1]\ntool: Out of memory\n");
    EXPECT_EQ(run.status, 255);
    run = ToolWith(0, {"--check-pin", "/", "--config-path", "c"});
    EXPECT_EQ(run.output, "[CheckFileIsPin c /]\ntool: Out of memory\n");
    EXPECT_EQ(run.status, 255);
}

TEST_F(MainTest, MemoryThatTheJsonLibraryMissesIsTheSame) {
    FakeCommands::onOperation = [] { throw Json::RuntimeError("no room"); };
    const Outcome run = ToolWith(0, {"--check-pin", "/", "--config-path", "c"});
    EXPECT_EQ(run.output, "[CheckFileIsPin c /]\ntool: Out of memory\n");
    EXPECT_EQ(run.status, 255);
}

TEST_F(MainTest, MemoryThatRunsOutWhileOptionsAreParsedIsTheSame) {
    FakeAppliance::onConfigLookup = [] { throw std::bad_alloc(); };
    const Outcome run = ToolWith(0, {"--space-uuid", "uuid-1"});
    EXPECT_EQ(run.output, "tool: Out of memory\n");
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
} // namespace vesk
