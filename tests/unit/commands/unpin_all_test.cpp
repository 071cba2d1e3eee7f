#include "commands/commands.h"

#include "tests/unit/commands/commands_fixture.h"

#include "request/tool_parameters.h"

namespace vesk {
class UnpinAllTest : public CommandsTest {
protected:
    static int Unpin(const char *mountPath, const char *cachePath) {
        ToolParameters parameters;
        parameters.mountPath = mountPath;
        parameters.cachePath = cachePath;
        return UnpinAllBlocks(&parameters);
    }
    const char *Device() const { return device_->Path().c_str(); }
};

TEST_F(UnpinAllTest, ByMountPath) {
    WriteWhole(bitmapFile_, "\x81\x01");
    CapturedLog log;
    EXPECT_EQ(Unpin(Volume(), nullptr), 0);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Start to unpin all blocks of volume (" + volume_ + ")",
                                  "Unpin all blocks of volume (" + volume_ + ") finish",
                              }));
    EXPECT_EQ(device_->events, Events{"unpin all"});
    EXPECT_EQ(Hex(ReadWhole(bitmapFile_)), "8101");
}

TEST_F(UnpinAllTest, ByCachePath) {
    FakeAppliance::spaces.clear();
    CapturedLog log;
    EXPECT_EQ(Unpin(nullptr, Device()), 0);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Start to unpin all blocks of cache (" + device_->Path() + ")",
                                  "Unpin all blocks of cache (" + device_->Path() + ") finish",
                              }));
    EXPECT_EQ(device_->events, Events{"unpin all"});
}

TEST_F(UnpinAllTest, TheMountPathWinsOverTheCachePath) {
    CapturedLog log(2);
    EXPECT_EQ(Unpin(Volume(), "/missing/device"), 0);
    EXPECT_EQ(MessagesOf(log, "UnpinAllBlocks"),
              (Messages{
                  "UnpinAllBlocks() [N] : Start to unpin all blocks of volume (" + volume_ + ")",
                  "UnpinAllBlocks() [N] : Unpin all blocks of volume (" + volume_ + ") finish",
              }));
}

TEST_F(UnpinAllTest, WithNeitherItFails) {
    CapturedLog log;
    EXPECT_EQ(Unpin(nullptr, nullptr), -1);
    EXPECT_EQ(log.Messages(), Messages{"One of --mount-path or --cache-path could be set"});
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(UnpinAllTest, AVolumeWithoutCacheFails) {
    FakeAppliance::caches.clear();
    CapturedLog log;
    EXPECT_EQ(Unpin(Volume(), Device()), -1); // the cache path is no second try
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Start to unpin all blocks of volume (" + volume_ + ")",
                                  "Can't get cache's ssd path",
                                  "Can't get cache path",
                                  "Can't get the cache path of volume (" + volume_ + ")",
                                  "Can't unpin all block of volume (" + volume_ + ")",
                              }));
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(UnpinAllTest, ADriverThatRefusesFailsBoth) {
    device_->failingRequest = 0xFED1;
    CapturedLog log(2);
    EXPECT_EQ(Unpin(Volume(), nullptr), -1);
    EXPECT_EQ(Unpin(nullptr, Device()), -1);
    EXPECT_EQ(MessagesOf(log, "UnpinAllBlocksByCachePath"),
              Messages(2,
                       "UnpinAllBlocksByCachePath() [N] : ***** Ioctl for unpin all cache blocks "
                       "failed"));
    EXPECT_EQ(MessagesOf(log, "UnpinAllBlocksByMouhtPath"), Messages{});
    EXPECT_EQ(
        MessagesOf(log, "UnpinAllBlocks"),
        (Messages{
            "UnpinAllBlocks() [N] : Start to unpin all blocks of volume (" + volume_ + ")",
            "UnpinAllBlocks() [N] : ***** Can't unpin all block of volume (" + volume_ + ")",
            "UnpinAllBlocks() [N] : Start to unpin all blocks of cache (" + device_->Path() + ")",
            "UnpinAllBlocks() [N] : ***** Can't unpin all block of cache (" + device_->Path() + ")",
        }));
}

TEST_F(UnpinAllTest, TheRequestCarriesNoArgument) {
    device_->failingRequest = 0xFED1;
    CapturedLog log;
    EXPECT_EQ(UnpinAllBlocksByCachePath(Device()), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Ioctl Error: Send ioctl 65233 Data ((nil)) size (0) to " +
                                      device_->Path() + ", ret=-1",
                                  "",
                                  "Ioctl for unpin all cache blocks failed",
                              }));
}

TEST_F(UnpinAllTest, AMissingDeviceFails) {
    CapturedLog log;
    EXPECT_EQ(UnpinAllBlocksByCachePath("/missing/device"), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Open device path (/missing/device) error",
                                  "",
                                  "Ioctl for unpin all cache blocks failed",
                              }));
}

TEST_F(UnpinAllTest, ANullPathIsAnIncorrectParameter) {
    CapturedLog log(2);
    EXPECT_EQ(UnpinAllBlocksByCachePath(nullptr), -1);
    EXPECT_EQ(log.Messages(),
              Messages{"UnpinAllBlocksByCachePath() [N] : ***** Incorrect parameter"});
}
} // namespace vesk
