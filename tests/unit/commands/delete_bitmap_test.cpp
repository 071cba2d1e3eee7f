#include "commands/commands.h"

#include "tests/unit/commands/volume_events_fixture.h"

#include <cerrno>

namespace vesk {
TEST_F(VolumeEventsTest, DeleteBitmapDeletesTheFileAndNothingElse) {
    WriteWhole(bitmapFile_, "ab");
    CapturedLog log(2);
    EXPECT_EQ(DeleteBitmap(Volume()), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_FALSE(std::filesystem::exists(bitmapFile_));
    EXPECT_EQ(ReadWhole(config_), document_);
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(VolumeEventsTest, DeleteBitmapWithoutAFileSucceeds) {
    CapturedLog log;
    EXPECT_EQ(DeleteBitmap(Volume()), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    CapturedLog verbose(2);
    EXPECT_EQ(DeleteBitmap(Volume()), 0);
    EXPECT_EQ(verbose.Messages(),
              Messages{"DeleteBitmap() [N]: bitmap (" + bitmapFile_ + ") doesn't exist"});
}

TEST_F(VolumeEventsTest, DeleteBitmapOfAVolumeThatIsNoSpaceWorksToo) {
    FakeAppliance::spaces.clear();
    WriteWhole(bitmapFile_, "ab");
    EXPECT_EQ(DeleteBitmap(Volume()), 0);
    EXPECT_FALSE(std::filesystem::exists(bitmapFile_));
}

TEST_F(VolumeEventsTest, DeleteBitmapRemovesALinkAndNotItsTarget) {
    const std::string elsewhere = folder_.Path("elsewhere");
    std::filesystem::create_symlink(elsewhere, bitmapFile_);
    EXPECT_EQ(DeleteBitmap(Volume()), 0);
    EXPECT_FALSE(std::filesystem::is_symlink(bitmapFile_));
    WriteWhole(elsewhere, "ab");
    std::filesystem::create_symlink(elsewhere, bitmapFile_);
    EXPECT_EQ(DeleteBitmap(Volume()), 0);
    EXPECT_FALSE(std::filesystem::exists(bitmapFile_));
    EXPECT_EQ(ReadWhole(elsewhere), "ab");
}

TEST_F(VolumeEventsTest, DeleteBitmapWithoutMemoryForThePathFails) {
    WriteWhole(bitmapFile_, "ab");
    FakeLibc::Fail("strdup", ENOMEM);
    CapturedLog log(2);
    EXPECT_EQ(DeleteBitmap(Volume()), -1);
    EXPECT_EQ(log.Messages(), Messages{"DeleteBitmap() [N] : ***** Can't get bitmap path"});
    EXPECT_EQ(ReadWhole(bitmapFile_), "ab");
}

TEST_F(VolumeEventsTest, DeleteBitmapFailsOnWhatCannotBeUnlinked) {
    std::filesystem::create_directory(bitmapFile_);
    CapturedLog log;
    EXPECT_EQ(DeleteBitmap(Volume()), -1);
    EXPECT_EQ(log.Messages(), Messages{"Can't delete bitmap (" + bitmapFile_ + ")"});
}
} // namespace vesk
