#include "flash_cache/cache_device.h"

#include "tests/support/fake_driver.h"
#include "tests/support/test_volume.h"

#include <gtest/gtest.h>

#include <sys/stat.h>

namespace vesk {
namespace {
TEST(CacheDeviceAsk, PinInterface) {
    for (const bool hasPinInterface : {true, false}) {
        const FakeDriver driver("driver", hasPinInterface);
        if (!driver.skipReason.empty()) {
            GTEST_SKIP() << driver.skipReason;
        }
        const CacheDeviceState state = CacheDeviceAsk(driver.devicePath);
        EXPECT_TRUE(state.isUp);
        EXPECT_EQ(state.supportsPin, hasPinInterface);
        EXPECT_FALSE(CacheDeviceAsk(driver.devicePath + "-other").isUp);
    }
}

TEST(CacheDeviceAsk, PlainBlockDevice) {
    const TestVolume volume("plain", kMakeExt4, kExt4Bytes);
    if (!volume.skipReason.empty()) {
        GTEST_SKIP() << volume.skipReason;
    }
    const CacheDeviceState state = CacheDeviceAsk(volume.device);
    EXPECT_TRUE(state.isUp);
    EXPECT_FALSE(state.supportsPin);
}

TEST(CacheDeviceAsk, PlainFile) {
    const TestFolder folder;
    const CacheDeviceState state = CacheDeviceAsk(folder.FileMake("cachedev", "text"));
    EXPECT_TRUE(state.isUp);
    EXPECT_FALSE(state.supportsPin);
}

TEST(CacheDeviceAsk, NoCacheDevice) {
    const TestFolder folder;
    const std::string fifo = folder.Path("fifo");
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    for (const std::string &path : {folder.Path(), fifo, std::string("/dev/null"),
                                    std::string("/nonexistent"), std::string()}) {
        const CacheDeviceState state = CacheDeviceAsk(path);
        EXPECT_FALSE(state.isUp) << path;
        EXPECT_FALSE(state.supportsPin) << path;
    }
}
} // namespace
} // namespace vesk
