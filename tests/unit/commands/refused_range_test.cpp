// What the commands that change a range say when it cannot be changed, which is never so outside
// this test (refused_range.h).
#include "tests/unit/commands/commands_fixture.h"

#include "driver/pin_interface.h"

namespace vesk {
extern "C" {
int SetBitmapRefused(const char *mountPath, uint64_t startSector, uint64_t numSectors);
int UnsetBitmapRefused(const char *mountPath, uint64_t startSector, uint64_t numSectors);
int RefuseBitmapOperation(PinBitmap *bitmap, uint64_t startSector, uint64_t numSectors, int op);

int RefuseBitmapOperation(PinBitmap * /*bitmap*/, uint64_t /*startSector*/, uint64_t /*numSectors*/,
                          int /*op*/) {
    return -1;
}
}

class RefusedRangeTest : public CommandsTest {
protected:
    void ExpectNothingDone() const {
        EXPECT_FALSE(std::filesystem::exists(bitmapFile_));
        EXPECT_EQ(device_->events, Events{});
    }
};

TEST_F(RefusedRangeTest, SettingFailsWithTheMessagesOfBoth) {
    CapturedLog log(2);
    EXPECT_EQ(SetBitmapRefused(Volume(), 0, 128), -1);
    EXPECT_EQ(MessagesOf(log, "ModifyBitmap"),
              Messages{"ModifyBitmap() [N] : ***** Can't get bitmap to file"});
    EXPECT_EQ(LastOf(log.Messages()), "SetBitmap() [N] : ***** Set bitmap failed");
    ExpectNothingDone();
}

TEST_F(RefusedRangeTest, ClearingFailsWithTheMessagesOfBoth) {
    CapturedLog log(2);
    EXPECT_EQ(UnsetBitmapRefused(Volume(), 0, 128), -1);
    EXPECT_EQ(MessagesOf(log, "ModifyBitmap"),
              Messages{"ModifyBitmap() [N] : ***** Can't unset bitmap to file"});
    EXPECT_EQ(LastOf(log.Messages()), "UnsetBitmap() [N] : ***** Set bitmap failed");
    ExpectNothingDone();
}
} // namespace vesk
