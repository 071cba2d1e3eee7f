#include "commands/commands.h"

#include "tests/unit/commands/volume_events_fixture.h"

namespace vesk {
TEST_F(VolumeEventsTest, UmountChangesNothing) {
    WriteWhole(bitmapFile_, "ab");
    CapturedLog log;
    EXPECT_EQ(HandleSpaceUmount(Volume()), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    FakeAppliance::caches.clear();
    EXPECT_EQ(HandleSpaceUmount(Volume()), 0);
    EXPECT_EQ(log.Messages(), Messages{"Space (" + volume_ + ") doesn't support pin"});
    EXPECT_EQ(ReadWhole(bitmapFile_), "ab");
    EXPECT_EQ(ReadWhole(config_), document_);
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(VolumeEventsTest, UmountOfAVolumeWithoutPinningIsANotice) {
    FakeAppliance::caches.clear();
    CapturedLog log(2);
    EXPECT_EQ(HandleSpaceUmount(Volume()), 0);
    EXPECT_EQ(MessagesOf(log, "HandleSpaceUmount"),
              Messages{"HandleSpaceUmount() [N] : Space (" + volume_ + ") doesn't support pin"});
}
} // namespace vesk
