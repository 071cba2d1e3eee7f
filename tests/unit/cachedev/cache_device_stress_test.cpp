// Everything at once: readers, writers, requests and snapshots, on a cache much smaller than the
// device. Meant for ThreadSanitizer as well.
#include "cachedev/cache_device.h"

#include "cachedev/pin_requests.h"
#include "tests/support/test_device.h"

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <cstring>
#include <random>
#include <thread>
#include <unistd.h>

namespace vesk {
namespace {
constexpr size_t kBytes = kBlockBytes;
constexpr size_t kBlocks = 40;
constexpr size_t kDeviceBytes = (kBlocks - 1) * kBytes + 8192; // the last block is partial
constexpr int kRounds = 300;

// A block's content is one version number, repeated. A writer announces a version before it writes
// it and confirms it afterwards; whoever reads must find one version throughout the block, no older
// than what was confirmed before and no newer than what was announced after.
struct Stress {
    TestDevice test{kDeviceBytes, 6};
    std::array<std::atomic<uint32_t>, kBlocks> announced{};
    std::array<std::atomic<uint32_t>, kBlocks> confirmed{};
    std::atomic<int> torn{0};
    std::atomic<int> stale{0};
    std::atomic<int> failed{0};
    std::atomic<bool> stop{false};

    Stress() {
        const std::string zeros(kDeviceBytes, '\0');
        if (CacheDeviceWrite(test.device, 0, zeros.data(), zeros.size()) < 0) {
            ++failed;
        }
    }
};

size_t BlockBytes(size_t block) {
    return std::min(kBytes, kDeviceBytes - block * kBytes);
}

void CheckBlock(Stress &stress, size_t block, const std::string &bytes, uint32_t oldest) {
    uint32_t version = 0;
    memcpy(&version, bytes.data(), sizeof version);
    for (size_t i = 0; i + sizeof version <= bytes.size(); i += sizeof version) {
        stress.torn += memcmp(&bytes[i], &version, sizeof version) != 0 ? 1 : 0;
    }
    stress.stale += version < oldest || version > stress.announced[block] ? 1 : 0;
}

void ReadOnce(Stress &stress, size_t first, size_t count) {
    std::array<uint32_t, kBlocks> oldest{};
    for (size_t i = 0; i < count; ++i) {
        oldest[i] = stress.confirmed[first + i];
    }
    const std::string bytes = TestRead(stress.test.device, first * kBytes, count * kBytes);
    for (size_t i = 0; i < count; ++i) {
        CheckBlock(stress, first + i, bytes.substr(i * kBytes, BlockBytes(first + i)), oldest[i]);
    }
}

void Reader(Stress &stress, unsigned seed) {
    std::mt19937 random(seed);
    for (int i = 0; i < kRounds; ++i) {
        const size_t first = random() % kBlocks;
        const size_t most = std::min<size_t>(kBlocks - first, random() % 8 == 0 ? 20 : 2);
        ReadOnce(stress, first, random() % most + 1);
    }
}

// Each writer has its own blocks: `part` of two.
void Writer(Stress &stress, size_t part) {
    std::mt19937 random(static_cast<unsigned>(part));
    for (int i = 0; i < kRounds; ++i) {
        const size_t block = random() % (kBlocks / 2) * 2 + part;
        const uint32_t version = ++stress.announced[block];
        std::string bytes(BlockBytes(block), '\0');
        for (size_t at = 0; at < bytes.size(); at += sizeof version) {
            memcpy(&bytes[at], &version, sizeof version);
        }
        if (CacheDeviceWrite(stress.test.device, block * kBytes, bytes.data(), bytes.size()) !=
            static_cast<int64_t>(bytes.size())) {
            ++stress.failed;
        }
        stress.confirmed[block] = version;
    }
}

void Requester(Stress &stress, unsigned seed) {
    std::mt19937 random(seed);
    std::vector<SectorRange> ranges(kRangeListRecords);
    // At least so often that each kind has had its turn, however busy the machine is.
    for (int i = 0; i < kRounds || !stress.stop; ++i) {
        std::vector<uint8_t> bitmap(kDeviceBytes >> kBitmapShift);
        for (uint8_t &byte : bitmap) {
            byte = static_cast<uint8_t>(1U << (random() % 16)); // every other one is 0
        }
        unsigned char descriptor[kDescriptorBytes64] = {};
        const uint64_t address = reinterpret_cast<uintptr_t>(bitmap.data());
        const bool is32bit = sizeof(void *) == 4;
        const auto length = static_cast<uint32_t>(bitmap.size() + (random() % 4 == 0 ? 1 : 0));
        memcpy(descriptor, &address, is32bit ? 4 : 8);
        memcpy(descriptor + (is32bit ? 4 : 8), &length, sizeof length);
        ranges[0] = {random() % (kDeviceBytes / kSectorBytes), random() % 2000};
        int32_t answer[2] = {};
        const struct {
            uint32_t number;
            const void *argument;
        } requests[] = {{kRequestSetBitmap, descriptor},  {kRequestUnpinRanges, ranges.data()},
                        {kRequestUnpinAll, nullptr},      {kRequestQueryAllUnpinned, answer},
                        {kRequestQueryBitmapSet, answer}, {kRequestSetBitmap, nullptr}};
        const auto &chosen = requests[random() % 6];
        PinRequest request = {};
        request.number = chosen.number;
        request.argument = reinterpret_cast<uintptr_t>(chosen.argument);
        request.caller = {getpid(), is32bit};
        request.data = answer;
        PinRequestHandle(stress.test.device, request);
    }
}

void Watcher(Stress &stress) {
    while (!stress.stop) {
        const CacheSnapshot snapshot = CacheDeviceSnapshot(stress.test.device);
        uint64_t pinned = 0;
        for (const BlockRun &run : snapshot.pinned) {
            pinned += run.count;
        }
        if (pinned != snapshot.pinnedBlocks || pinned > snapshot.cachedBlocks ||
            TestCached(stress.test.device).size() > snapshot.slots) {
            ++stress.failed;
        }
        std::this_thread::yield();
    }
}
} // namespace

TEST(CacheDeviceStressTest, NobodySeesTornOrStaleData) {
    Stress stress;
    std::vector<std::thread> endless;
    endless.emplace_back(Requester, std::ref(stress), 11);
    endless.emplace_back(Requester, std::ref(stress), 12);
    endless.emplace_back(Watcher, std::ref(stress));
    std::vector<std::thread> workers;
    for (unsigned seed = 1; seed <= 3; ++seed) {
        workers.emplace_back(Reader, std::ref(stress), seed);
    }
    for (size_t part = 0; part < 2; ++part) {
        workers.emplace_back(Writer, std::ref(stress), part);
    }
    for (std::thread &worker : workers) {
        worker.join();
    }
    stress.stop = true;
    for (std::thread &thread : endless) {
        thread.join();
    }
    EXPECT_EQ(stress.torn, 0);
    EXPECT_EQ(stress.stale, 0);
    EXPECT_EQ(stress.failed, 0);

    // Nothing is left in use, and what the slots hold is what the device holds.
    CacheDeviceUnpinAll(stress.test.device);
    for (size_t block = 0; block < kBlocks; ++block) {
        ReadOnce(stress, block, 1);
    }
    EXPECT_EQ(TestCached(stress.test.device),
              (std::vector<uint64_t>{kBlocks - 6, kBlocks - 5, kBlocks - 4, kBlocks - 3,
                                     kBlocks - 2, kBlocks - 1}));
    EXPECT_EQ(stress.torn + stress.stale, 0);
    const CacheSnapshot snapshot = CacheDeviceSnapshot(stress.test.device);
    EXPECT_EQ(snapshot.counters.hits, snapshot.counters.ssdReads);
    EXPECT_EQ(snapshot.counters.misses, snapshot.counters.backingReads);
    EXPECT_GT(snapshot.counters.hits, 0U);
    EXPECT_GT(snapshot.evictions, 0U);
    EXPECT_GT(snapshot.requests.refused, 0U);
    EXPECT_GT(snapshot.requests.setBitmap, 0U);
}
} // namespace vesk
