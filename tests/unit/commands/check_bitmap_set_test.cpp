#include "commands/commands.h"

#include "tests/unit/commands/commands_fixture.h"

namespace vesk {
class CheckBitmapSetTest : public CommandsTest {};

TEST_F(CheckBitmapSetTest, CheckBitmapAnswersTheDriversState) {
    for (const int state : {0, 1, 7, -1}) {
        device_->bitmapSet = state;
        CapturedLog log;
        EXPECT_EQ(CheckBitmapSet(Volume()), state);
        EXPECT_EQ(log.Messages(), Messages{});
    }
    EXPECT_EQ(device_->events, Events(4, "query"));
    CapturedLog log(2);
    CheckBitmapSet(Volume());
    EXPECT_EQ(MessagesOf(log, "CheckBitmapSet"),
              Messages{"CheckBitmapSet() [N]: Bitmap set state = -1"});
}

TEST_F(CheckBitmapSetTest, CheckBitmapOfAVolumeWithoutPinningIs0) {
    FakeAppliance::caches[0].supportPin = 0;
    CapturedLog log(2);
    EXPECT_EQ(CheckBitmapSet(Volume()), 0);
    EXPECT_EQ(MessagesOf(log, "CheckBitmapSet"),
              (Messages{
                  "CheckBitmapSet() [N]: Volume (" + volume_ + ") doesn't support pin",
                  "CheckBitmapSet() [N]: Bitmap set state = 0",
              }));
    EXPECT_EQ(device_->events, Events{});
    CapturedLog quiet;
    EXPECT_EQ(CheckBitmapSet(Volume()), 0);
    EXPECT_EQ(quiet.Messages(), Messages{});
}

TEST_F(CheckBitmapSetTest, CheckBitmapWithoutACachePathIs0) {
    FakeAppliance::caches[0].cachePathResult = 0;
    CapturedLog log(2);
    EXPECT_EQ(CheckBitmapSet(Volume()), 0);
    EXPECT_EQ(MessagesOf(log, "CheckBitmapSet"),
              (Messages{
                  "CheckBitmapSet() [N] : ***** Can't get cache path",
                  "CheckBitmapSet() [N]: Bitmap set state = 0",
              }));
}

TEST_F(CheckBitmapSetTest, CheckBitmapThatTheDriverRefusesIs0) {
    device_->bitmapSet = 1;
    device_->failingRequest = 0x8004FECF;
    CapturedLog log(2);
    EXPECT_EQ(CheckBitmapSet(Volume()), 0);
    EXPECT_EQ(MessagesOf(log, "CheckBitmapSet"),
              (Messages{
                  "CheckBitmapSet() [N] : ***** Can't get cache's bitmap status",
                  "CheckBitmapSet() [N]: Bitmap set state = 0",
              }));
}
} // namespace vesk
