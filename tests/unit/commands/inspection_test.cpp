#include "commands/inspection.h"

#include "tests/unit/commands/commands_fixture.h"

#include <cerrno>

class InspectionTest : public CommandsTest {};

TEST_F(InspectionTest, CheckBitmapAnswersTheDriversState) {
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

TEST_F(InspectionTest, CheckBitmapOfAVolumeWithoutPinningIs0) {
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

TEST_F(InspectionTest, CheckBitmapWithoutACachePathIs0) {
    FakeAppliance::caches[0].cachePathResult = 0;
    CapturedLog log(2);
    EXPECT_EQ(CheckBitmapSet(Volume()), 0);
    EXPECT_EQ(MessagesOf(log, "CheckBitmapSet"),
              (Messages{
                  "CheckBitmapSet() [N] : ***** Can't get cache path",
                  "CheckBitmapSet() [N]: Bitmap set state = 0",
              }));
}

TEST_F(InspectionTest, CheckBitmapThatTheDriverRefusesIs0) {
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

TEST_F(InspectionTest, SendBitmapSendsTheStoredBitmapAsItIs) {
    WriteWhole(bitmapFile_, "\x81\x01");
    FakeLibc::Count("write");
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(FakeLibc::Calls("write"), 0);
    EXPECT_EQ(device_->events, (Events{"query", "bitmap 8101 file 8101"}));
}

TEST_F(InspectionTest, SendBitmapWritesABitmapWhoseSizeHasChangedBackFirst) {
    WriteWhole(bitmapFile_, "\x81");
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), 0);
    EXPECT_EQ(log.Messages(), Messages{"Bitmap size changed. Could be due to volume expansion"});
    EXPECT_EQ(device_->events, (Events{"query", "bitmap 8100 file 8100"}));
}

TEST_F(InspectionTest, SendBitmapSendsNothingToADriverThatHoldsOne) {
    WriteWhole(bitmapFile_, "\x81\x01");
    device_->bitmapSet = -1;
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), 0);
    EXPECT_EQ(log.Messages(), Messages{"Bitmap is already set"});
    EXPECT_EQ(device_->events, Events{"query"});
}

TEST_F(InspectionTest, SendBitmapWithoutABitmapFileSucceeds) {
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), 0);
    EXPECT_EQ(log.Messages(), Messages{"Bitmap file (" + bitmapFile_ +
                                       ") doesn't exist. No need to update to driver"});
    EXPECT_EQ(device_->events, Events{"query"});
    EXPECT_FALSE(std::filesystem::exists(bitmapFile_));
}

TEST_F(InspectionTest, SendBitmapsGoodEndsAreNotices) {
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

TEST_F(InspectionTest, SendBitmapOfAVolumeWithoutPinningFails) {
    FakeAppliance::caches[0].state = 2;
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(log.Messages(), Messages{"Volume (" + volume_ + ") doesn't support pin"});
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(InspectionTest, SendBitmapWithoutACachePathFails) {
    FakeAppliance::caches[0].cachePathResult = 0;
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(log.Messages(), (Messages{"Can't get cache path", "Can't get cache path"}));
}

TEST_F(InspectionTest, SendBitmapWithoutAnAnswerOfTheDriverFails) {
    device_->failingRequest = 0x8004FECF;
    WriteWhole(bitmapFile_, "\x81\x01");
    CapturedLog log(2);
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(MessagesOf(log, "SendBitmap"),
              Messages{"SendBitmap() [N] : ***** Can't get cache's bitmap status"});
    EXPECT_EQ(device_->events, Events{"query"});
}

TEST_F(InspectionTest, SendBitmapOfAVolumeThatHasGoneMeanwhileFails) {
    device_->onQuery = [] { FakeAppliance::enumResult = -1; };
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't enum spaces",
                                  "Can't get reference path",
                                  "Can't get bitmap path",
                              }));
}

TEST_F(InspectionTest, SendBitmapOfAFileThatIsTooLongFails) {
    WriteWhole(bitmapFile_, "abc");
    CapturedLog log;
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Incorrect bitmap size (2), file size (3)",
                                  "Allocate bitmap failed",
                              }));
    EXPECT_EQ(ReadWhole(bitmapFile_), "abc");
}

TEST_F(InspectionTest, SendBitmapToADeviceThatHasGoneMeanwhileFails) {
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

TEST_F(InspectionTest, SendBitmapThatCannotBeWrittenBackIsNotSent) {
    WriteWhole(bitmapFile_, "\x81");
    FakeLibc::Fail("write", ENOSPC);
    CapturedLog log(2);
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(MessagesOf(log, "SendBitmap"),
              Messages{"SendBitmap() [N] : ***** Write bitmap failed"});
    EXPECT_EQ(device_->events, Events{"query"});
}

TEST_F(InspectionTest, SendBitmapThatTheDriverRefusesFails) {
    WriteWhole(bitmapFile_, "\x81\x01");
    device_->failingRequest = 0xFECF;
    CapturedLog log(2);
    EXPECT_EQ(SendBitmap(Volume()), -1);
    EXPECT_EQ(MessagesOf(log, "SendBitmap"),
              Messages{"SendBitmap() [N] : ***** Can't send bitmap to driver"});
}
