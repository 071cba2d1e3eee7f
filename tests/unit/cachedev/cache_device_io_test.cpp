// Reads and writes: what they return, what they leave in the cache, and what happens when an image
// fails.
#include "cachedev/cache_device.h"

#include "tests/support/test_device.h"
#include "tests/support/thread_state.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <filesystem>
#include <functional>
#include <random>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

namespace vesk {
namespace {
using Blocks = std::vector<uint64_t>;

int64_t Write(CacheDevice &device, uint64_t offset, const std::string &bytes) {
    return CacheDeviceWrite(device, offset, bytes.data(), bytes.size());
}

// Ends a test's process with all its threads.
[[noreturn]] void EndProcess() {
    const bool failed = testing::Test::HasFailure();
    fflush(stdout);
    _exit(failed ? 1 : 0);
}

// Runs a part of a test in a process of its own, which calls EndProcess; its exit status.
int StatusOfProcess(const std::function<void()> &body) {
    fflush(stdout);
    const pid_t child = fork();
    if (child == 0) {
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        body();
    }
    int status = -1; // of no process, where there is none
    EXPECT_EQ(waitpid(child, &status, 0), child);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

// Every cached block's slot holds the block's bytes of the backing image.
void ExpectSlotsAgree(TestDevice &test) {
    const std::string backing = ReadWhole(test.backingPath);
    const std::string ssd = ReadWhole(test.ssdPath);
    const std::vector<CacheSlot> &slots = test.device.cache.slots;
    for (size_t slot = 0; slot < slots.size(); ++slot) {
        if (slots[slot].block == kNoBlock) {
            continue;
        }
        const auto start = static_cast<size_t>(slots[slot].block * kBlockBytes);
        const std::string block = backing.substr(start, kBlockBytes);
        EXPECT_EQ(ssd.compare(static_cast<size_t>(slot * kBlockBytes), block.size(), block), 0)
            << "block " << slots[slot].block << " in slot " << slot;
    }
}
} // namespace

TEST(CacheDeviceReadTest, AnyOffsetAndSizeGivesTheBackingBytes) {
    TestDevice test(5 * kBlockBytes + 1536, 3);
    const uint64_t end = 5 * kBlockBytes + 1536;
    for (const uint64_t offset : {uint64_t{0}, uint64_t{1}, kBlockBytes - 1, kBlockBytes,
                                  2 * kBlockBytes + 700, end - 1536, end - 1}) {
        for (const uint64_t size :
             {uint64_t{1}, uint64_t{511}, kBlockBytes, kBlockBytes + 1, 3 * kBlockBytes, end}) {
            const auto expected = static_cast<size_t>(std::min(size, end - offset));
            // Twice: as misses and, as far as it fits, as hits.
            for (int i = 0; i < 2; ++i) {
                EXPECT_EQ(TestRead(test.device, offset, static_cast<size_t>(size)),
                          TestBytes(offset, expected))
                    << offset << " " << size;
            }
        }
    }
    ExpectSlotsAgree(test);
}

TEST(CacheDeviceReadTest, NothingPastTheEnd) {
    TestDevice test(kBlockBytes, 1);
    EXPECT_EQ(TestReadResult(test.device, kBlockBytes, 1), 0);
    EXPECT_EQ(TestReadResult(test.device, UINT64_MAX, 10), 0);
    EXPECT_EQ(TestReadResult(test.device, 0, 0), 0);
    EXPECT_EQ(TestReadResult(test.device, kBlockBytes - 3, 100), 3);
    EXPECT_EQ(CacheDeviceSnapshot(test.device).counters.misses, 1U);
}

TEST(CacheDeviceReadTest, HitsComeFromTheSsdImage) {
    TestDevice test(4 * kBlockBytes, 2);
    TestTouch(test.device, {3});
    const std::string marked(100, 'S');
    std::string ssd = ReadWhole(test.ssdPath);
    EXPECT_EQ(ssd.substr(0, kBlockBytes), TestBytes(3 * kBlockBytes, kBlockBytes));
    ssd.replace(50, marked.size(), marked);
    WriteWhole(test.ssdPath, ssd);
    EXPECT_EQ(TestRead(test.device, 3 * kBlockBytes + 50, 100), marked);
    const CacheCounters counters = CacheDeviceSnapshot(test.device).counters;
    EXPECT_EQ(counters.hits, 1U);
    EXPECT_EQ(counters.ssdReads, 1U);
    EXPECT_EQ(counters.misses, 1U);
    EXPECT_EQ(counters.backingReads, 1U);
}

TEST(CacheDeviceReadTest, TheLeastRecentlyReadBlockGivesWay) {
    TestDevice test(8 * kBlockBytes, 3);
    TestTouch(test.device, {0, 1, 2, 0, 3});
    EXPECT_EQ(TestCached(test.device), (Blocks{0, 2, 3}));
    TestTouch(test.device, {4});
    EXPECT_EQ(TestCached(test.device), (Blocks{0, 3, 4}));
    EXPECT_EQ(CacheDeviceSnapshot(test.device).evictions, 2U);
}

TEST(CacheDeviceReadTest, ABigReadIsLikeReadingItsBlocksInOrder) {
    TestDevice test(64 * kBlockBytes, 4);
    TestTouch(test.device, {10, 40});
    // Longer than one run, longer than the cache, with blocks in it that are cached and are evicted
    // before their turn comes.
    EXPECT_EQ(TestRead(test.device, 5, 50 * kBlockBytes), TestBytes(5, 50 * kBlockBytes));
    EXPECT_EQ(TestCached(test.device), (Blocks{47, 48, 49, 50}));
    ExpectSlotsAgree(test);
    const CacheCounters counters = CacheDeviceSnapshot(test.device).counters;
    EXPECT_EQ(counters.hits + counters.misses, 2U + 51U);
    EXPECT_EQ(counters.hits, counters.ssdReads);
    EXPECT_EQ(counters.misses, counters.backingReads);
}

TEST(CacheDeviceReadTest, MixedHitsAndMisses) {
    TestDevice test(12 * kBlockBytes, 12);
    TestTouch(test.device, {7, 2, 3, 5}); // slots 0..3, not in the order of the blocks
    EXPECT_EQ(TestRead(test.device, 100, 10 * kBlockBytes), TestBytes(100, 10 * kBlockBytes));
    EXPECT_EQ(TestRead(test.device, 100, 10 * kBlockBytes), TestBytes(100, 10 * kBlockBytes));
    const CacheCounters counters = CacheDeviceSnapshot(test.device).counters;
    EXPECT_EQ(counters.misses, 4U + 7U);
    EXPECT_EQ(counters.hits, 4U + 11U);
    ExpectSlotsAgree(test);
}

TEST(CacheDeviceWriteTest, WritesThroughAndUpdatesWhatIsCached) {
    TestDevice test(6 * kBlockBytes + 512, 6);
    TestTouch(test.device, {4, 1, 6}); // among them the partial block at the end
    std::string expected = TestBytes(0, 6 * kBlockBytes + 512);
    struct {
        size_t offset;
        size_t size;
    } const writes[] = {{kBlockBytes + 10, 20},
                        {kBlockBytes - 5, 10},
                        {0, 6 * kBlockBytes + 512},
                        {3 * kBlockBytes + 1, 2 * kBlockBytes},
                        {6 * kBlockBytes, 512}};
    char fill = 'a';
    for (const auto &write : writes) {
        const std::string bytes(write.size, fill++);
        ASSERT_EQ(Write(test.device, write.offset, bytes), static_cast<int64_t>(write.size));
        expected.replace(write.offset, write.size, bytes);
        EXPECT_EQ(ReadWhole(test.backingPath), expected);
        ExpectSlotsAgree(test);
    }
    EXPECT_EQ(TestCached(test.device), (Blocks{1, 4, 6})); // a write caches nothing
    EXPECT_EQ(TestRead(test.device, 0, expected.size()), expected);
    EXPECT_EQ(CacheDeviceSnapshot(test.device).counters.writes, 1U + 2U + 7U + 3U + 1U);
}

TEST(CacheDeviceWriteTest, TheDeviceEndsWhereItEnds) {
    TestDevice test(kBlockBytes + 512, 1);
    EXPECT_EQ(Write(test.device, kBlockBytes + 512, "x"), -ENOSPC);
    EXPECT_EQ(Write(test.device, UINT64_MAX, "x"), -ENOSPC);
    EXPECT_EQ(Write(test.device, kBlockBytes + 509, "abcdef"), 3);
    EXPECT_EQ(Write(test.device, 5, ""), 0);
    EXPECT_EQ(TestRead(test.device, kBlockBytes + 509, 10), "abc");
    EXPECT_EQ(ReadWhole(test.backingPath).size(), kBlockBytes + 512);
}

TEST(CacheDeviceWriteTest, AWriteCountsAsUse) {
    TestDevice test(8 * kBlockBytes, 2);
    TestTouch(test.device, {0, 1});
    Write(test.device, 0, "x");
    TestTouch(test.device, {2});
    EXPECT_EQ(TestCached(test.device), (Blocks{0, 2}));
}

TEST(CacheDeviceFailureTest, ALostSsdImageCostsOnlyTheCache) {
    TestDevice test(4 * kBlockBytes, 4);
    TestTouch(test.device, {0, 1});
    std::filesystem::resize_file(test.ssdPath, 0);
    EXPECT_EQ(TestRead(test.device, 10, 2 * kBlockBytes), TestBytes(10, 2 * kBlockBytes));
    EXPECT_TRUE(TestCached(test.device).empty());
    const CacheCounters counters = CacheDeviceSnapshot(test.device).counters;
    EXPECT_EQ(counters.ssdReads, 0U);
    EXPECT_EQ(counters.backingReads, 2U + 3U);
    // And it works again when the image is whole again.
    std::filesystem::resize_file(test.ssdPath, 4 * kBlockBytes);
    EXPECT_EQ(TestRead(test.device, 0, 4 * kBlockBytes), TestBytes(0, 4 * kBlockBytes));
    EXPECT_EQ(TestCached(test.device).size(), 4U);
    ExpectSlotsAgree(test);
}

TEST(CacheDeviceFailureTest, ALostBackingImageIsAnError) {
    TestDevice test(4 * kBlockBytes, 4);
    TestTouch(test.device, {0});
    std::filesystem::resize_file(test.backingPath, kBlockBytes);
    EXPECT_EQ(TestReadResult(test.device, 2 * kBlockBytes, 10), -EIO);
    EXPECT_EQ(TestReadResult(test.device, 0, 2 * kBlockBytes), -EIO);
    EXPECT_EQ(TestRead(test.device, 5, 10), TestBytes(5, 10)); // still cached
    EXPECT_EQ(TestCached(test.device), (Blocks{0}));
}

TEST(CacheDeviceFaultTest, OrderedReadFailures) {
    TestDevice test(4 * kBlockBytes, 4);
    test.device.settings.faults.failRead = {{1000, EIO}, {2 * kBlockBytes, ENODATA}};
    EXPECT_EQ(TestReadResult(test.device, 0, 1000), 1000);
    EXPECT_EQ(TestReadResult(test.device, 0, 1001), -EIO);
    EXPECT_EQ(TestReadResult(test.device, 1000, 1), -EIO);
    EXPECT_EQ(TestReadResult(test.device, 1001, 10), 10);
    EXPECT_EQ(TestReadResult(test.device, 1001, 2 * kBlockBytes), -ENODATA);
    EXPECT_EQ(Write(test.device, 1000, "x"), 1);
}

TEST(CacheDeviceFaultTest, AnOrderedEarlyEnd) {
    TestDevice test(4 * kBlockBytes, 4);
    test.device.settings.faults.shortAt = kBlockBytes + 10;
    EXPECT_EQ(TestRead(test.device, kBlockBytes, 100), TestBytes(kBlockBytes, 10));
    EXPECT_EQ(TestReadResult(test.device, kBlockBytes + 10, 100), 0);
    EXPECT_EQ(TestReadResult(test.device, 2 * kBlockBytes, 100), 0);
    EXPECT_EQ(CacheDeviceSnapshot(test.device).deviceBytes, 4 * kBlockBytes);
}

TEST(CacheDeviceDelayTest, EveryMissedBlockIsDelayed) {
    using Clock = std::chrono::steady_clock;
    TestDevice test(8 * kBlockBytes, 8);
    constexpr std::chrono::milliseconds kDelay(100);
    test.device.settings.missDelayMs = kDelay.count();
    const auto start = Clock::now();
    EXPECT_EQ(TestReadResult(test.device, 2 * kBlockBytes, 2 * kBlockBytes), 2 * kBlockBytes);
    EXPECT_GE(Clock::now() - start, 2 * kDelay);
}

TEST(CacheDeviceDelayTest, OnlyMissesAreDelayedAndNobodyElseWaits) {
    TestDevice test(8 * kBlockBytes, 8);
    TestTouch(test.device, {0});
    test.device.settings.missDelayMs = 3600 * 1000; // whoever waits for it hangs
    EXPECT_EQ(StatusOfProcess([&test] {
                  std::atomic<pid_t> missing{0};
                  std::thread misses([&] {
                      missing = static_cast<pid_t>(syscall(SYS_gettid));
                      TestReadResult(test.device, 2 * kBlockBytes, 2 * kBlockBytes);
                  });
                  while (missing == 0 || !ThreadSleeps(getpid(), missing)) {
                      std::this_thread::yield();
                  }
                  // While that one sleeps: hits, writes, requests and pictures of other blocks.
                  for (int i = 0; i < 50; ++i) {
                      TestTouch(test.device, {0});
                      EXPECT_EQ(Write(test.device, 7 * kBlockBytes, "x"), 1);
                      CacheDeviceSetBitmap(test.device, {1});
                      CacheDeviceSnapshot(test.device);
                      CacheDeviceCachedBits(test.device);
                  }
                  EndProcess();
              }),
              0);
}

TEST(CacheDeviceRandomTest, AgreesWithAPlainFile) {
    constexpr size_t kBytes = 23 * kBlockBytes + 3 * kSectorBytes;
    for (const uint32_t slots : {1U, 5U, 24U}) {
        TestDevice test(kBytes, slots);
        std::string expected = TestBytes(0, kBytes);
        std::mt19937 random(slots);
        for (int i = 0; i < 1500; ++i) {
            const size_t offset = random() % kBytes;
            const uint64_t most = random() % 4 == 0 ? 20 * kBlockBytes : 2 * kBlockBytes;
            const auto size =
                static_cast<size_t>(std::min<uint64_t>(random() % most + 1, kBytes - offset));
            switch (random() % 5) {
            case 0: {
                const std::string bytes(size, static_cast<char>(random()));
                ASSERT_EQ(Write(test.device, offset, bytes), static_cast<int64_t>(size));
                expected.replace(offset, size, bytes);
                break;
            }
            case 1:
                CacheDeviceSetBitmap(test.device, TestBitmap(test.device, {random() % 16}));
                break;
            case 2:
                EXPECT_EQ(CacheDeviceUnpinRanges(test.device, {{random() % 1000, 500}}), 0);
                break;
            default:
                ASSERT_TRUE(TestRead(test.device, offset, size) == expected.substr(offset, size));
            }
        }
        EXPECT_TRUE(ReadWhole(test.backingPath) == expected);
        ExpectSlotsAgree(test);
        const CacheSnapshot snapshot = CacheDeviceSnapshot(test.device);
        EXPECT_EQ(snapshot.cachedBlocks, slots);
        EXPECT_EQ(snapshot.counters.hits, snapshot.counters.ssdReads);
        EXPECT_EQ(snapshot.counters.misses, snapshot.counters.backingReads);
    }
}
} // namespace vesk
