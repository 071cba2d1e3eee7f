#include "commands/commands.h"

#include "tests/unit/commands/commands_fixture.h"

#include <cerrno>

namespace vesk {
class SendBitmapTest : public CommandsTest {};

TEST_F(SendBitmapTest, SendBitmapSendsTheStoredBitmapAsItIs) {
    WriteWhole(bitmapFile_, "\x81\x01");
    FakeLibc::Count("write");
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(FakeLibc::Calls("write"), 0);
    EXPECT_EQ(device_->events, (Events{"query", "bitmap 8101 file 8101"}));
}

TEST_F(SendBitmapTest, SendBitmapWritesABitmapWhoseSizeHasChangedBackFirst) {
    WriteWhole(bitmapFile_, "\x81");
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), 0);
    EXPECT_EQ(log.Messages(), Messages{"Bitmap size changed. Could be due to volume expansion"});
    EXPECT_EQ(device_->events, (Events{"query", "bitmap 8100 file 8100"}));
}

TEST_F(SendBitmapTest, SendBitmapSendsNothingToADriverThatHoldsOne) {
    WriteWhole(bitmapFile_, "\x81\x01");
    device_->bitmapSet = -1;
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), 0);
    EXPECT_EQ(log.Messages(), Messages{"Bitmap is already set"});
    EXPECT_EQ(device_->events, Events{"query"});
}

TEST_F(SendBitmapTest, SendBitmapWithoutABitmapFileSucceeds) {
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), 0);
    EXPECT_EQ(log.Messages(), Messages{"Bitmap file (" + bitmapFile_ +
                                       ") doesn't exist. No need to update to driver"});
    EXPECT_EQ(device_->events, Events{"query"});
    EXPECT_FALSE(std::filesystem::exists(bitmapFile_));
}

TEST_F(SendBitmapTest, SendBitmapRefusesALinkEvenWhereItPointsNowhere) {
    std::filesystem::create_symlink("no", bitmapFile_);
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(LastOf(log.Messages()), "Allocate bitmap failed");
    EXPECT_EQ(device_->events, Events{"query"});
}

TEST_F(SendBitmapTest, SendBitmapsGoodEndsAreNotices) {
    CapturedLog log(2);
    SendBitmap(Volume());
    device_->bitmapSet = 1;
    SendBitmap(Volume());
    EXPECT_EQ(MessagesOf(log, "SendBitmap"), (Messages{
                                                 "SendBitmap() [N] : Bitmap file (" + bitmapFile_ +
                                                     ") doesn't exist. No need to update to driver",
                                                 "SendBitmap() [N] : Bitmap is already set",
                                             }));
}

TEST_F(SendBitmapTest, SendBitmapOfAVolumeWithoutPinningFails) {
    FakeAppliance::caches[0].state = 2;
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(log.Messages(), Messages{"Volume (" + volume_ + ") doesn't support pin"});
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(SendBitmapTest, SendBitmapOfASpaceThatHasGoneMeanwhileFails) {
    FakeAppliance::onConfigLookup = [] { FakeAppliance::spaces.clear(); };
    CapturedLog log(2);
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(MessagesOf(log, "SendBitmap"),
              Messages{"SendBitmap() [N] : ***** Can't get space uuid from reference path (" +
                       volume_ + ")"});
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(SendBitmapTest, SendBitmapWithoutACachePathFails) {
    FakeAppliance::caches[0].cachePathResult = 0;
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(log.Messages(), (Messages{"Can't get cache path", "Can't get cache path"}));
}

TEST_F(SendBitmapTest, SendBitmapWithoutAnAnswerOfTheDriverFails) {
    device_->failingRequest = 0x8004FECF;
    WriteWhole(bitmapFile_, "\x81\x01");
    CapturedLog log(2);
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(MessagesOf(log, "SendBitmap"),
              Messages{"SendBitmap() [N] : ***** Can't get cache's bitmap status"});
    EXPECT_EQ(device_->events, Events{"query"});
}

TEST_F(SendBitmapTest, SendBitmapOfAVolumeThatHasGoneMeanwhileFails) {
    device_->onQuery = [] { FakeAppliance::enumResult = -1; };
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't enum spaces",
                                  "Can't get reference path",
                                  "Can't get bitmap path",
                              }));
}

TEST_F(SendBitmapTest, SendBitmapOfAFileThatIsTooLongFails) {
    WriteWhole(bitmapFile_, "abc");
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Incorrect bitmap size (2), file size (3)",
                                  "Allocate bitmap failed",
                              }));
    EXPECT_EQ(ReadWhole(bitmapFile_), "abc");
}

TEST_F(SendBitmapTest, SendBitmapToADeviceThatHasGoneMeanwhileFails) {
    WriteWhole(bitmapFile_, "\x81\x01");
    device_->onQuery = [] { FakeAppliance::caches[0].cachePath = "/missing/device"; };
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open device (/missing/device)",
                                  "Can't get block device path",
                                  "Can't get needed bitmap sizeof",
                                  "Allocate bitmap failed",
                                  "Warning: data is NULL for free",
                              }));
}

TEST_F(SendBitmapTest, SendBitmapThatCannotBeWrittenBackIsNotSent) {
    WriteWhole(bitmapFile_, "\x81");
    FakeLibc::Fail("write", ENOSPC);
    CapturedLog log(2);
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(MessagesOf(log, "SendBitmap"),
              Messages{"SendBitmap() [N] : ***** Write bitmap failed"});
    EXPECT_EQ(device_->events, Events{"query"});
}

TEST_F(SendBitmapTest, SendBitmapThatTheDriverRefusesFails) {
    WriteWhole(bitmapFile_, "\x81\x01");
    device_->failingRequest = 0xFECF;
    CapturedLog log(2);
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(MessagesOf(log, "SendBitmap"),
              Messages{"SendBitmap() [N] : ***** Can't send bitmap to driver"});
}
} // namespace vesk
