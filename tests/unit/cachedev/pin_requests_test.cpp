#include "cachedev/pin_requests.h"

#include "tests/support/test_device.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <sys/mman.h>
#include <unistd.h>

namespace vesk {
namespace {
using Blocks = std::vector<uint64_t>;

constexpr bool kIs32Bit = sizeof(void *) == 4;

// The requests as this process itself would send them.
struct PinRequestsTest : testing::Test {
    TestDevice test{64 * kBlockBytes, 8};
    CacheDevice &device = test.device;
    std::vector<SectorRange> ranges = std::vector<SectorRange>(kRangeListRecords);

    void SetUp() override {
        if (!TestHasCallerMemory()) {
            GTEST_SKIP() << "needs process_vm_readv";
        }
    }

    int Send(uint32_t number, const void *argument, void *data = nullptr, bool is32bit = kIs32Bit) {
        PinRequest request = {};
        request.number = number;
        request.argument = reinterpret_cast<uintptr_t>(argument);
        request.caller = {getpid(), is32bit};
        request.data = data;
        return PinRequestHandle(device, request);
    }

    int SendBitmap(const void *bytes, uint32_t length) {
        unsigned char descriptor[kDescriptorBytes64] = {};
        const uint64_t address = reinterpret_cast<uintptr_t>(bytes);
        memcpy(descriptor, &address, kIs32Bit ? 4 : 8);
        memcpy(descriptor + (kIs32Bit ? 4 : 8), &length, sizeof length);
        return Send(kRequestSetBitmap, descriptor);
    }

    int SendBlocks(const Blocks &blocks) {
        const std::vector<uint8_t> bitmap = TestBitmap(device, blocks);
        return SendBitmap(bitmap.data(), static_cast<uint32_t>(bitmap.size()));
    }

    int SendRanges() { return Send(kRequestUnpinRanges, ranges.data()); }

    int Query(uint32_t number) {
        int32_t answer = -1;
        const int result = Send(number, nullptr, &answer);
        return result != 0 ? result : answer;
    }

    RequestCounters Counts() { return CacheDeviceSnapshot(device).requests; }
};
} // namespace

TEST_F(PinRequestsTest, TheNumbersAreTheDrivers) {
    EXPECT_EQ(kRequestSetBitmap, 65231U);
    EXPECT_EQ(kRequestQueryBitmapSet, 2147811023U);
    EXPECT_EQ(kRequestUnpinRanges, 65232U);
    EXPECT_EQ(kRequestUnpinAll, 65233U);
    EXPECT_EQ(kRequestQueryAllUnpinned, 2147811026U);
}

TEST_F(PinRequestsTest, SetsTheBitmap) {
    EXPECT_EQ(Query(kRequestQueryBitmapSet), 0);
    EXPECT_EQ(SendBlocks({0, 9, 63}), 0);
    EXPECT_EQ(Query(kRequestQueryBitmapSet), 1);
    EXPECT_EQ(Query(kRequestQueryAllUnpinned), 1);
    TestTouch(device, {0, 1, 9, 63});
    EXPECT_EQ(TestPinned(device), (Blocks{0, 9, 63}));
    EXPECT_EQ(Query(kRequestQueryAllUnpinned), 0);
}

TEST_F(PinRequestsTest, RefusesABitmapOfAnotherLength) {
    const std::vector<uint8_t> bitmap(64, 0xFF);
    ASSERT_EQ(SendBlocks({5}), 0);
    for (const uint32_t length : {0U, 7U, 9U, 64U, UINT32_MAX}) {
        EXPECT_EQ(SendBitmap(bitmap.data(), length), -EINVAL) << length;
    }
    TestTouch(device, {4, 5});
    EXPECT_EQ(TestPinned(device), (Blocks{5}));
    EXPECT_EQ(Counts().refused, 5U);
    EXPECT_EQ(Counts().setBitmap, 6U);
}

TEST_F(PinRequestsTest, RefusesMemoryThatIsNotThere) {
    EXPECT_EQ(Send(kRequestSetBitmap, nullptr), -EFAULT);
    EXPECT_EQ(SendBitmap(nullptr, 8), -EFAULT);
    // The last bytes are missing.
    const auto page = static_cast<size_t>(sysconf(_SC_PAGESIZE));
    void *const pages =
        mmap(nullptr, 2 * page, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    ASSERT_NE(pages, MAP_FAILED);
    char *const end = static_cast<char *>(pages) + page;
    ASSERT_EQ(munmap(end, page), 0);
    EXPECT_EQ(SendBitmap(end - 7, 8), -EFAULT);
    EXPECT_EQ(SendBitmap(end - 8, 8), 0);
    CacheDeviceUnpinAll(device);
    EXPECT_EQ(Send(kRequestSetBitmap, end - 4), -EFAULT);
    EXPECT_EQ(Send(kRequestUnpinRanges, nullptr), -EFAULT);
    EXPECT_EQ(Send(kRequestUnpinRanges, end - 1000), -EFAULT);
    EXPECT_EQ(Query(kRequestQueryBitmapSet), 0);
    munmap(pages, page);
}

TEST_F(PinRequestsTest, A32BitDescriptorIsReadAsSuch) {
    // With its 4-byte address the bitmap cannot be reached in a 64-bit test, but the length is
    // seen: the refusal tells that the fields were taken from where they are.
    const uint32_t words[2] = {16, 8};
    EXPECT_EQ(Send(kRequestSetBitmap, words, nullptr, true), -EFAULT);
    const uint32_t other[2] = {16, 9};
    EXPECT_EQ(Send(kRequestSetBitmap, other, nullptr, true), -EINVAL);
    // Where low memory can be had it works throughout.
    void *const low = mmap(nullptr, 4096, PROT_READ | PROT_WRITE,
                           MAP_PRIVATE | MAP_ANONYMOUS
#ifdef MAP_32BIT
                               | MAP_32BIT
#endif
                           ,
                           -1, 0);
    if (low == MAP_FAILED || reinterpret_cast<uintptr_t>(low) > UINT32_MAX) {
        GTEST_SKIP() << "no memory below 4 GiB";
    }
    memset(low, 0x81, 8);
    const uint32_t good[2] = {static_cast<uint32_t>(reinterpret_cast<uintptr_t>(low)), 8};
    EXPECT_EQ(Send(kRequestSetBitmap, good, nullptr, true), 0);
    TestTouch(device, {0, 1, 7, 8});
    EXPECT_EQ(TestPinned(device), (Blocks{0, 7, 8}));
    munmap(low, 4096);
}

TEST_F(PinRequestsTest, UnpinsRangesUpToTheZeroRecord) {
    ASSERT_EQ(SendBlocks({1, 2, 3, 4}), 0);
    TestTouch(device, {1, 2, 3, 4});
    ranges[0] = {1 * kBlockSectors, 1};
    ranges[1] = {2 * kBlockSectors, 0}; // releases nothing and ends nothing
    ranges[2] = {3 * kBlockSectors, 1};
    ranges[4] = {4 * kBlockSectors, 1}; // behind the end
    EXPECT_EQ(SendRanges(), 0);
    EXPECT_EQ(TestPinned(device), (Blocks{2, 4}));
    EXPECT_EQ(CacheDeviceSnapshot(device).lastUnpin.size(), 3U);
}

TEST_F(PinRequestsTest, AFullListNeedsNoZeroRecord) {
    ASSERT_EQ(SendBlocks({1, 2}), 0);
    TestTouch(device, {1, 2});
    for (SectorRange &range : ranges) {
        range = {kBlockSectors, 1};
    }
    ranges.back() = {2 * kBlockSectors, 1};
    EXPECT_EQ(SendRanges(), 0);
    EXPECT_TRUE(TestPinned(device).empty());
    EXPECT_EQ(CacheDeviceSnapshot(device).lastUnpin.size(), kRangeListRecords);
}

TEST_F(PinRequestsTest, AnEmptyListIsAccepted) {
    ranges[1] = {0, 1};
    EXPECT_EQ(SendRanges(), 0);
    EXPECT_TRUE(CacheDeviceSnapshot(device).lastUnpin.empty());
}

TEST_F(PinRequestsTest, OneRangePastTheEndRefusesTheList) {
    ASSERT_EQ(SendBlocks({1}), 0);
    TestTouch(device, {1});
    ranges[0] = {kBlockSectors, 1};
    ranges[1] = {UINT64_MAX, UINT64_MAX};
    EXPECT_EQ(SendRanges(), -EINVAL);
    EXPECT_EQ(TestPinned(device), (Blocks{1}));
    EXPECT_EQ(Counts().refused, 1U);
}

TEST_F(PinRequestsTest, UnpinsAll) {
    ASSERT_EQ(SendBlocks({1, 40}), 0);
    TestTouch(device, {1, 40});
    EXPECT_EQ(Send(kRequestUnpinAll, nullptr), 0);
    EXPECT_TRUE(TestPinned(device).empty());
    EXPECT_EQ(Query(kRequestQueryBitmapSet), 0);
    EXPECT_EQ(Query(kRequestQueryAllUnpinned), 1);
}

TEST_F(PinRequestsTest, TellsTheSizeInBothEncodings) {
    uint64_t size = 0;
    EXPECT_EQ(Send(kRequestGetSize64Bit, nullptr, &size), 0);
    EXPECT_EQ(size, 64 * kBlockBytes);
    uint64_t callers = UINT64_MAX; // written directly, all 8 bytes
    uint32_t buffer = 0;
    EXPECT_EQ(Send(kRequestGetSize32Bit, &callers, &buffer), 0);
    EXPECT_EQ(callers, 64 * kBlockBytes);
    EXPECT_EQ(memcmp(&buffer, &callers, sizeof buffer), 0);
    EXPECT_EQ(Send(kRequestGetSize32Bit, nullptr, &buffer), -EFAULT);
}

TEST_F(PinRequestsTest, OtherNumbersAreUnknown) {
    int32_t answer = 0;
    for (const uint32_t number :
         {0U, 0xFED2U, 0x8004FED0U, 0x8004FED1U, 0xC004FECFU, 0x0000FECEU, 0x1260U, UINT32_MAX}) {
        EXPECT_EQ(Send(number, &answer, &answer), -ENOTTY) << number;
    }
    EXPECT_EQ(Counts().refused, 8U);
}

TEST_F(PinRequestsTest, OrderedFailuresChangeNothing) {
    ASSERT_EQ(SendBlocks({1}), 0);
    TestTouch(device, {1});
    device.settings.faults.failRequest = {{kRequestSetBitmap, EIO},
                                          {kRequestUnpinAll, EBUSY},
                                          {kRequestUnpinRanges, ENOMEM},
                                          {kRequestQueryAllUnpinned, EPERM}};
    ranges[0] = {kBlockSectors, 1};
    EXPECT_EQ(SendBlocks({2}), -EIO);
    EXPECT_EQ(Send(kRequestUnpinAll, nullptr), -EBUSY);
    EXPECT_EQ(SendRanges(), -ENOMEM);
    EXPECT_EQ(Query(kRequestQueryAllUnpinned), -EPERM);
    EXPECT_EQ(Query(kRequestQueryBitmapSet), 1);
    TestTouch(device, {2});
    EXPECT_EQ(TestPinned(device), (Blocks{1}));
    EXPECT_EQ(Counts().refused, 4U);
}

TEST_F(PinRequestsTest, CountsByKind) {
    uint64_t size = 0;
    SendBlocks({});
    Query(kRequestQueryBitmapSet);
    Query(kRequestQueryBitmapSet);
    SendRanges();
    Send(kRequestUnpinAll, nullptr);
    Query(kRequestQueryAllUnpinned);
    Send(kRequestGetSize64Bit, nullptr, &size);
    const RequestCounters counts = Counts();
    EXPECT_EQ(counts.setBitmap, 1U);
    EXPECT_EQ(counts.queryBitmapSet, 2U);
    EXPECT_EQ(counts.unpinRanges, 1U);
    EXPECT_EQ(counts.unpinAll, 1U);
    EXPECT_EQ(counts.queryAllUnpinned, 1U);
    EXPECT_EQ(counts.getSize, 1U);
    EXPECT_EQ(counts.refused, 0U);
}
} // namespace vesk
