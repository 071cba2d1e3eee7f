#include "commands/commands.h"

#include "tests/unit/commands/commands_fixture.h"

#include <cerrno>

namespace vesk {
class ModifyBitmapTest : public CommandsTest {};

TEST_F(ModifyBitmapTest, SettingARangeWritesTheFileThenSendsTheBitmap) {
    CapturedLog log;
    EXPECT_EQ(SetBitmap(Volume(), 127, 2), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(device_->events, Events{"bitmap 0300 file 0300"}); // and nothing is read
}

TEST_F(ModifyBitmapTest, SettingWhatIsSetWritesAndSendsAgain) {
    WriteWhole(bitmapFile_, std::string("\x03\x00", 2));
    FakeLibc::Count("write");
    EXPECT_EQ(SetBitmap(Volume(), 0, 256), 0);
    EXPECT_EQ(FakeLibc::Calls("write"), 1);
    EXPECT_EQ(device_->events, Events{"bitmap 0300 file 0300"});
}

TEST_F(ModifyBitmapTest, ClearingARangeKeepsTheOthers) {
    WriteWhole(bitmapFile_, "\xff\xff");
    CapturedLog log;
    EXPECT_EQ(UnsetBitmap(Volume(), 128, 1024), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(device_->events, Events{"bitmap 01fe file 01fe"});
}

TEST_F(ModifyBitmapTest, AGrownVolumesBitmapIsWrittenWhole) {
    WriteWhole(bitmapFile_, "\x80");
    EXPECT_EQ(UnsetBitmap(Volume(), 0, 128), 0);
    EXPECT_EQ(device_->events, Events{"bitmap 8000 file 8000"});
}

TEST_F(ModifyBitmapTest, ARangePastTheEndChangesNothing) {
    EXPECT_EQ(SetBitmap(Volume(), 16 * 128, 128), 0);
    EXPECT_EQ(device_->events, Events{"bitmap 0000 file 0000"});
}

TEST_F(ModifyBitmapTest, AnUnknownOperationWritesAndSendsNothing) {
    WriteWhole(bitmapFile_, "\xff\xff");
    for (const int op : {2, -1}) {
        CapturedLog log(2);
        EXPECT_EQ(ModifyBitmap(Volume(), 0, 128, op), -1);
        EXPECT_EQ(MessagesOf(log, "ModifyBitmap"),
                  Messages{"ModifyBitmap() [N] : ***** Unknown bitmap op = " + std::to_string(op)});
    }
    EXPECT_EQ(Hex(ReadWhole(bitmapFile_)), "ffff");
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(ModifyBitmapTest, ModifyTakes1AsSetAnd0AsClear) {
    EXPECT_EQ(ModifyBitmap(Volume(), 0, 256, 1), 0);
    EXPECT_EQ(ModifyBitmap(Volume(), 0, 128, 0), 0);
    EXPECT_EQ(device_->events, (Events{"bitmap 0300 file 0300", "bitmap 0200 file 0200"}));
}

TEST_F(ModifyBitmapTest, WithoutTheSpaceItFails) {
    FakeAppliance::spaces.clear();
    CapturedLog log;
    EXPECT_EQ(SetBitmap(Volume(), 0, 128), -1);
    EXPECT_EQ(UnsetBitmap(Volume(), 0, 128), -1);
    EXPECT_EQ(log.Messages(),
              (Messages{
                  "Can't get space uuid", "Set bitmap failed", "Can't get space uuid",
                  "Set bitmap failed", // the clearing command says so too
              }));
}

TEST_F(ModifyBitmapTest, ASpaceThatHasGoneMeanwhileHasNoBitmapPath) {
    FakeAppliance::onConfigLookup = [] { FakeAppliance::spaces.clear(); };
    CapturedLog log(2);
    EXPECT_EQ(SetBitmap(Volume(), 0, 128), -1);
    EXPECT_EQ(MessagesOf(log, "ModifyBitmap"),
              Messages{"ModifyBitmap() [N] : ***** Can't get bitmap path"});
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(ModifyBitmapTest, FailuresNameTheirFunctions) {
    FakeAppliance::caches.clear();
    CapturedLog log(2);
    EXPECT_EQ(SetBitmap(Volume(), 0, 128), -1);
    EXPECT_EQ(UnsetBitmap(Volume(), 0, 128), -1);
    EXPECT_EQ(MessagesOf(log, "ModifyBitmap"),
              Messages(2, "ModifyBitmap() [N] : ***** Can't get cache path"));
    EXPECT_EQ(MessagesOf(log, "SetBitmap"), Messages{"SetBitmap() [N] : ***** Set bitmap failed"});
    EXPECT_EQ(MessagesOf(log, "UnsetBitmap"),
              Messages{"UnsetBitmap() [N] : ***** Set bitmap failed"});
}

TEST_F(ModifyBitmapTest, ABitmapFileThatIsTooLongFailsAndIsKept) {
    WriteWhole(bitmapFile_, "abc");
    CapturedLog log;
    EXPECT_EQ(SetBitmap(Volume(), 0, 128), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Incorrect bitmap size (2), file size (3)",
                                  "Allocate bitmap failed",
                                  "Set bitmap failed",
                              }));
    EXPECT_EQ(ReadWhole(bitmapFile_), "abc");
}

TEST_F(ModifyBitmapTest, ADeviceWithoutASizeFails) {
    FakeAppliance::caches[0].cachePath = "/missing/device";
    CapturedLog log;
    EXPECT_EQ(ModifyBitmap(Volume(), 0, 128, 1), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open device (/missing/device)",
                                  "Can't get block device path",
                                  "Can't get needed bitmap sizeof",
                                  "Allocate bitmap failed",
                                  "Warning: data is NULL for free",
                              }));
}

TEST_F(ModifyBitmapTest, ABitmapThatCannotBeWrittenIsNotSent) {
    FakeLibc::Fail("write", ENOSPC);
    CapturedLog log;
    EXPECT_EQ(UnsetBitmap(Volume(), 0, 128), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Write bitmap file (" + bitmapFile_ + ") error",
                                  "",
                                  "Write bitmap failed",
                                  "Set bitmap failed",
                              }));
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(ModifyBitmapTest, ADriverThatRefusesLeavesTheFileChanged) {
    device_->failingRequest = 0xFECF;
    CapturedLog log(2);
    EXPECT_EQ(SetBitmap(Volume(), 0, 128), -1);
    EXPECT_EQ(MessagesOf(log, "ModifyBitmap"),
              Messages{"ModifyBitmap() [N] : ***** Can't send bitmap to driver"});
    EXPECT_EQ(Hex(ReadWhole(bitmapFile_)), "0100");
}
} // namespace vesk
