// The daemon's file of the cached blocks, through the kernel.
#include "bitmap/bit_runs.h"
#include "cachedev/driver_requests.h"
#include "tests/support/test_device.h"
#include "tests/unit/cachedev/private_world.h"
#include "tests/unit/cachedev/test_daemon.h"

#include <gtest/gtest.h>

#include <atomic>
#include <filesystem>
#include <set>
#include <string>
#include <sys/stat.h>
#include <thread>

namespace vesk {
namespace {
// What the file shows now, in hexadecimal digits.
std::string CachedText() {
    static const char kDigits[] = "0123456789abcdef";
    std::string text;
    for (const char character : ReadWhole(kDaemonCached)) {
        const auto byte = static_cast<unsigned char>(character);
        text += {kDigits[byte >> 4], kDigits[byte & 15]};
    }
    return text;
}

void Touch(const ScopedFd &device, const std::vector<uint64_t> &blocks) {
    for (const uint64_t block : blocks) {
        EXPECT_EQ(TestReadAt(device.Get(), block * kBlockBytes, 1),
                  TestBytes(block * kBlockBytes, 1));
    }
}

uint64_t CountBits(const std::string &bytes) {
    uint64_t count = 0;
    for (const BitRun &run :
         BitRunsOf(reinterpret_cast<const unsigned char *>(bytes.data()), bytes.size())) {
        count += run.count;
    }
    return count;
}
} // namespace

TEST(CachedevCachedFileTest, FollowsWhatTheDeviceHolds) {
    RunInPrivateWorld([] {
        // The last block, 20, is a partial one. A pin bitmap of this device ends with block 15.
        ASSERT_NO_FATAL_FAILURE(DaemonStartFresh(20 * kBlockBytes + 512, 4));
        const ScopedFd device = TestOpen(kDaemonDevice);
        EXPECT_EQ(CachedText(), "000000");
        Touch(device, {0, 9, 20});
        EXPECT_EQ(CachedText(), "010210");
        // One gives way. Which one hangs on the daemon's threads: a block is in use until its
        // thread has gone on after the answer.
        Touch(device, {1, 2});
        const std::string cached = ReadWhole(kDaemonCached);
        EXPECT_EQ(CountBits(cached), 4U);
        EXPECT_EQ(cached.at(0) & 0x04, 0x04);
        EXPECT_EQ(DaemonSetBitmap({0x00, 0x02}), 0);
        Touch(device, {9}); // pinned from now on
        EXPECT_TRUE(TestReadAt(device.Get(), 0, 21 * kBlockBytes) ==
                    TestBytes(0, 20 * kBlockBytes + 512));
        EXPECT_EQ(CachedText(), "00021c");
        EXPECT_EQ(pwrite(device.Get(), "x", 1, 5 * 65536), 1); // caches nothing
        EXPECT_EQ(DaemonRequest(kRequestUnpinAll, nullptr), 0);
        EXPECT_EQ(CachedText(), "00021c");
        std::filesystem::resize_file(kDaemonSsd, 0);
        Touch(device, {9, 20}); // their slots are lost
        EXPECT_EQ(CachedText(), "00000c");
        EXPECT_EQ(DaemonStateText("cachedBlocks"), "2");
        EXPECT_EQ(DaemonStop(), 0);
    });
}

TEST(CachedevCachedFileTest, AnOpenFileShowsItsMomentAndChangesNothing) {
    RunInPrivateWorld([] {
        ASSERT_NO_FATAL_FAILURE(DaemonStartFresh(20 * kBlockBytes, 2));
        const ScopedFd device = TestOpen(kDaemonDevice);
        struct stat status = {};
        ASSERT_EQ(stat(kDaemonCached, &status), 0);
        EXPECT_EQ(status.st_size, 3);
        Touch(device, {3, 19});
        const Json::Value state = DaemonState();
        const ScopedFd cached = TestOpen(kDaemonCached, O_RDONLY);
        ASSERT_EQ(fstat(cached.Get(), &status), 0);
        EXPECT_EQ(status.st_size, 3);
        EXPECT_EQ(TestReadAt(cached.Get(), 0, 4096), std::string("\x08\x00\x08", 3));
        EXPECT_EQ(TestReadAt(cached.Get(), 2, 1), "\x08");
        EXPECT_EQ(TestReadAt(cached.Get(), 3, 1), "");
        EXPECT_EQ(DaemonState(), state);
        Touch(device, {4});
        EXPECT_EQ(TestReadAt(cached.Get(), 0, 4096), std::string("\x08\x00\x08", 3));
        EXPECT_EQ(CachedText(), "100008");
        EXPECT_EQ(DaemonStop(), 0);
    });
}

TEST(CachedevCachedFileTest, IsWholeWhileBlocksComeAndGo) {
    RunInPrivateWorld([] {
        ASSERT_NO_FATAL_FAILURE(DaemonStartFresh(256 * kBlockBytes, 16));
        std::atomic<bool> stop{false};
        std::thread reader([&stop] {
            const ScopedFd device = TestOpen(kDaemonDevice);
            for (uint64_t i = 0; !stop; ++i) {
                TestReadAt(device.Get(), i * 37 % 250 * kBlockBytes, 6 * kBlockBytes);
            }
        });
        std::set<std::string> seen;
        while (seen.size() < 50) {
            const std::string bytes = ReadWhole(kDaemonCached);
            EXPECT_EQ(bytes.size(), 32U);
            EXPECT_LE(CountBits(bytes), 16U);
            seen.insert(bytes);
        }
        stop = true;
        reader.join();
        EXPECT_EQ(CountBits(ReadWhole(kDaemonCached)), 16U);
        EXPECT_EQ(DaemonStop(), 0);
    });
}
} // namespace vesk
