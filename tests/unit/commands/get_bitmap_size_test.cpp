#include "commands/commands.h"

#include "tests/unit/commands/commands_fixture.h"

namespace vesk {
class GetBitmapSizeTest : public CommandsTest {};

TEST_F(GetBitmapSizeTest, TheBitmapSizeIsThatOfTheCacheDevice) {
    CapturedLog log;
    uint64_t size = 0;
    EXPECT_EQ(GetBitmapSizeByte(Volume(), &size), 0);
    EXPECT_EQ(size, 2U);
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(GetBitmapSizeTest, TheBitmapSizeNeedsACache) {
    FakeAppliance::caches.clear();
    uint64_t size = 0;
    CapturedLog log(2);
    EXPECT_EQ(GetBitmapSizeByte(Volume(), &size), -1);
    EXPECT_EQ(MessagesOf(log, "GetBitmapSizeByte"),
              Messages{"GetBitmapSizeByte() [N] : ***** Get cache path from mount path (" +
                       volume_ + ") failed"});
}

TEST_F(GetBitmapSizeTest, TheBitmapSizeNeedsTheDevice) {
    FakeAppliance::caches[0].cachePath = "/missing/device";
    uint64_t size = 0;
    CapturedLog log;
    EXPECT_EQ(GetBitmapSizeByte(Volume(), &size), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open device (/missing/device)",
                                  "Can't get block device path",
                                  "Get bitmap size for cache (/missing/device) failed",
                              }));
}
} // namespace vesk
