#include "commands/commands.h"

#include "tests/support/unpin_ranges_fixture.h"

namespace vesk {
namespace {
using UnpinRangeTest = UnpinRangesTest;
} // namespace

TEST_F(UnpinRangeTest, SendsOneRecordToTheVolumesCache) {
    FakeApplianceOneVolume(kDevice);
    CapturedLog log;
    EXPECT_EQ(UnpinRange("/volume1", Range(7).startSector, Range(7).numSectors), 0);
    ASSERT_NO_FATAL_FAILURE(ExpectSent({Request(7, 8)}));
    EXPECT_EQ(log.Text(), "");
}

TEST_F(UnpinRangeTest, FailsWhereTheVolumeHasNoCache) {
    CapturedLog log;
    EXPECT_EQ(UnpinRange("/volume1", 0, 1), -1);
    EXPECT_EQ(log.Messages(), (Messages{"Can't get space uuid from reference path (/volume1)",
                                        "Can't get cache path of volume (/volume1)"}));
    ASSERT_NO_FATAL_FAILURE(ExpectSent({}));
}

TEST_F(UnpinRangeTest, FailsWhenTheDriverRefuses) {
    FakeApplianceOneVolume(kDevice);
    refused = 1;
    CapturedLog log(2);
    EXPECT_EQ(UnpinRange("/volume1", 0, 1), -1);
    const Messages messages = log.Messages();
    EXPECT_EQ(FirstOf(messages), "UnpinRange() [N] : +++++");
    EXPECT_EQ(messages.at(messages.size() - 2),
              "UnpinRange() [N] : ***** Send unpin inctl to driver failed");
    EXPECT_EQ(LastOf(messages), "UnpinRange() [N] : -----");
}

TEST_F(UnpinRangeTest, FailureMessageHasTheErrorMarker) {
    CapturedLog log(2);
    EXPECT_EQ(UnpinRange("/volume9", 0, 1), -1);
    EXPECT_TRUE(log.Has("UnpinRange() [N] : ***** Can't get cache path of volume (/volume9)"));
}
} // namespace vesk
