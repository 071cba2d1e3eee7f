#include "cachedev/cache_device.h"

#include "cachedev/cache_run.h"
#include "tests/support/test_device.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <string>

namespace vesk {
namespace {
// Bytes that may be 0.
template <size_t Size> std::string Bytes(const char (&bytes)[Size]) {
    return std::string(bytes, Size - 1);
}

size_t LengthFor(uint64_t deviceBytes) {
    CacheDevice device;
    device.images.deviceBytes = deviceBytes;
    device.images.slots = 1;
    CacheDeviceStart(device);
    return CacheDeviceCachedBits(device).size();
}
} // namespace

TEST(CacheDeviceCachedTest, EveryBlockHasItsBit) {
    EXPECT_EQ(LengthFor(512), 1U);
    EXPECT_EQ(LengthFor(8 * kBlockBytes), 1U);
    EXPECT_EQ(LengthFor(8 * kBlockBytes + 512), 2U);
    EXPECT_EQ(LengthFor(9 * kBlockBytes), 2U);
    EXPECT_EQ(LengthFor(16 * kBlockBytes), 2U);
    EXPECT_EQ(LengthFor(1000 * kBlockBytes), 125U);
    EXPECT_EQ(LengthFor(1000 * kBlockBytes + 512), 126U);
    EXPECT_EQ(LengthFor(uint64_t{1} << 40), size_t{1} << 21);
}

TEST(CacheDeviceCachedTest, FollowWhatIsCached) {
    TestDevice test(20 * kBlockBytes + 512, 4); // the last block, 20, is a partial one
    CacheDevice &device = test.device;
    EXPECT_EQ(CacheDeviceCachedBits(device), Bytes("\x00\x00\x00"));
    TestTouch(device, {0, 9, 20});
    EXPECT_EQ(CacheDeviceCachedBits(device), Bytes("\x01\x02\x10"));
    TestTouch(device, {7, 8}); // 0 gives way
    EXPECT_EQ(CacheDeviceCachedBits(device), Bytes("\x80\x03\x10"));
    CacheDeviceSetBitmap(device, {0x80, 0x00});
    TestTouch(device, {7}); // pinned from now on
    TestTouch(device, {0, 1, 2, 3, 4, 5, 6});
    EXPECT_EQ(CacheDeviceCachedBits(device), Bytes("\xF0\x00\x00"));
    CacheDeviceUnpinAll(device); // which takes nothing out
    EXPECT_EQ(CacheDeviceCachedBits(device), Bytes("\xF0\x00\x00"));
    EXPECT_EQ(CacheDeviceWrite(device, 12 * kBlockBytes, "x", 1), 1); // caches nothing
    std::filesystem::resize_file(test.ssdPath, 0);
    TestTouch(device, {5, 7}); // their slots are lost
    EXPECT_EQ(CacheDeviceCachedBits(device), Bytes("\x50\x00\x00"));
}

TEST(CacheDeviceCachedTest, ABlockIsCachedAsSoonAsItsSlotHoldsItsBytes) {
    TestDevice test(3 * kBlockBytes, 1);
    CacheDevice &device = test.device;
    TestTouch(device, {0});
    CacheRun load = CacheRunTakeForRead(device, 1, 1);
    EXPECT_EQ(CacheDeviceCachedBits(device), Bytes("\x00")); // block 0 has given way
    CacheRunPublish(device, load, 0);
    EXPECT_EQ(CacheDeviceCachedBits(device), Bytes("\x02"));
    CacheRunRelease(device, load);
    CacheRun hit = CacheRunTakeForRead(device, 1, 1);
    EXPECT_EQ(CacheDeviceCachedBits(device), Bytes("\x02")); // also while it is read
    CacheRunPublish(device, hit, 0);
    CacheRunRelease(device, hit);
}

TEST(CacheDeviceCachedTest, LookingChangesNothing) {
    TestDevice test(4 * kBlockBytes, 2);
    CacheDevice &device = test.device;
    TestTouch(device, {0, 1, 0});
    CacheDeviceCachedBits(device);
    const CacheSnapshot snapshot = CacheDeviceSnapshot(device);
    EXPECT_EQ(snapshot.counters.hits, 1U);
    EXPECT_EQ(snapshot.counters.misses, 2U);
    EXPECT_EQ(snapshot.counters.ssdReads, 1U);
    EXPECT_EQ(snapshot.counters.backingReads, 2U);
    EXPECT_EQ(snapshot.evictions, 0U);
    TestTouch(device, {2}); // 1 is still the one that was used least recently
    EXPECT_EQ(CacheDeviceCachedBits(device), Bytes("\x05"));
}
} // namespace vesk
