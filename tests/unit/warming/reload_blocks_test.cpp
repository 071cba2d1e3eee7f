#include "warming/reload_blocks.h"

#include "tests/support/recorded_opens.h"
#include "tests/unit/warming/warming_fixture.h"

#include <cerrno>
#include <random>

namespace vesk {
using Events = std::vector<std::string>;

namespace {
struct ExpectedRead {
    uint64_t start, length; // bits
};

// Bit by bit, least significant first: what shall be read.
std::vector<ExpectedRead> RunsOf(const std::string &bytes) {
    std::vector<ExpectedRead> runs;
    bool open = false;
    for (size_t bit = 0; bit < bytes.size() * 8; ++bit) {
        const bool set = ((static_cast<unsigned char>(bytes[bit / 8]) >> (bit % 8)) & 1) != 0;
        if (set && !open) {
            runs.push_back({bit, 0});
        }
        if (set) {
            ++runs.back().length;
        }
        open = set;
    }
    return runs;
}

// The read calls for the runs: 64 KiB each.
Events ReadsOf(const std::vector<ExpectedRead> &runs) {
    Events reads;
    for (const ExpectedRead &run : runs) {
        for (uint64_t i = 0; i < run.length; ++i) {
            reads.push_back("read " + std::to_string((run.start + i) * 65536) + "+65536");
        }
    }
    return reads;
}

Messages RangeLinesOf(const std::vector<ExpectedRead> &runs) {
    Messages lines;
    for (const ExpectedRead &run : runs) {
        lines.push_back("ReadFdToNullByRange() [N]: Range's bitStart=" + std::to_string(run.start) +
                        " numBits=" + std::to_string(run.length) +
                        " (size = " + std::to_string(run.length * 65536) + " bytes)");
    }
    return lines;
}

// Bytes of 0, of all ones and mixed ones, in stretches of random length.
std::string RandomBitmap(std::mt19937 &random, size_t size) {
    std::string bytes;
    while (bytes.size() < size) {
        const size_t stretch = 1 + random() % 5;
        const unsigned kind = random() % 4;
        for (size_t i = 0; i < stretch && bytes.size() < size; ++i) {
            bytes += static_cast<char>(kind == 0   ? 0xFF
                                       : kind == 1 ? random()
                                       : kind == 2 ? 1U << random() % 8
                                                   : 0);
        }
    }
    return bytes;
}
} // namespace

class ReloadBlocksTest : public WarmingTest {
protected:
    WorkResult Reload(std::string bytes) {
        const PinBitmap bitmap{reinterpret_cast<unsigned char *>(&bytes[0]),
                               static_cast<uint32_t>(bytes.size())};
        return ReloadPinBlocksToCache(&bitmap, device_->Path().c_str(), "/volume1");
    }
};

TEST_F(ReloadBlocksTest, Bits3To5And9AreTwoRanges) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    CapturedLog log(2);
    EXPECT_EQ(Reload(std::string("\x38\x02", 2)), WorkResult::Done);
    EXPECT_EQ(device_->events, (Events{"read 196608+65536", "read 262144+65536",
                                       "read 327680+65536", "read 589824+65536"}));
    EXPECT_EQ(log.Messages(),
              (Messages{
                  "ReloadPinBlocksToCache() [N]: Start to read blocks",
                  "ReadFdToNullByRange() [N]: Range's bitStart=3 numBits=3 (size = 196608 bytes)",
                  "ReadFdToNull() [N]: offset byte = 196608 num bytes = 196608",
                  "ReadFdToNullByRange() [N]: Range's bitStart=9 numBits=1 (size = 65536 bytes)",
                  "ReadFdToNull() [N]: offset byte = 589824 num bytes = 65536",
              }));
}

TEST_F(ReloadBlocksTest, TheDeviceIsOpenedForDirectReads) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    const RecordedOpens opens;
    EXPECT_EQ(Reload("\x01"), WorkResult::Done);
    EXPECT_EQ(opens.FlagsOf(device_->Path()), std::vector<int>{O_RDONLY | O_DIRECT | O_CLOEXEC});
}

TEST_F(ReloadBlocksTest, AClearBitmapReadsNothing) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    for (const size_t size : {size_t{1}, size_t{2}, size_t{9}, size_t{10000}}) {
        CapturedLog log(2);
        EXPECT_EQ(Reload(std::string(size, '\0')), WorkResult::Done);
        EXPECT_EQ(device_->events, Events{});
        EXPECT_EQ(log.Messages(),
                  (Messages{
                      "ReloadPinBlocksToCache() [N]: Start to read blocks",
                      "ReloadPinBlocksToCache() [N]: No pin blocks, no need to reload",
                  }));
    }
}

TEST_F(ReloadBlocksTest, ABitmapOfNoBytesReadsNothing) {
    UseDevice(4096);
    SKIP_WITHOUT_DIRECT_READS();
    EXPECT_EQ(Reload(""), WorkResult::Done);
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(ReloadBlocksTest, TheLastBitIsReadAfterTheWalk) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    EXPECT_EQ(Reload(std::string("\x00\x80", 2)), WorkResult::Done);
    EXPECT_EQ(device_->events, Events{"read 983040+65536"});
}

TEST_F(ReloadBlocksTest, AFullBitmapIsOneRange) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    CapturedLog log(2);
    EXPECT_EQ(Reload("\xff\xff"), WorkResult::Done);
    EXPECT_EQ(device_->events.size(), 16U);
    EXPECT_EQ(MessagesOf(log, "ReadFdToNullByRange"),
              Messages{"ReadFdToNullByRange() [N]: Range's bitStart=0 numBits=16 (size = 1048576 "
                       "bytes)"});
}

TEST_F(ReloadBlocksTest, RandomBitmapsAreReadAsABitByBitWalkReadsThem) {
    UseDevice(8ULL << 30);
    SKIP_WITHOUT_DIRECT_READS();
    std::mt19937 random(20240607);
    for (int i = 0; i < 150; ++i) {
        std::string bytes = RandomBitmap(random, 1 + random() % 40);
        if (i % 10 == 0) { // with a long clear stretch, on both sides of what is looked at at once
            bytes += std::string(4090 + random() % 20, '\0') + RandomBitmap(random, 5);
        }
        const std::vector<ExpectedRead> runs = RunsOf(bytes);
        device_->events.clear();
        CapturedLog log(2);
        ASSERT_EQ(Reload(bytes), WorkResult::Done) << i << " " << Hex(bytes);
        ASSERT_EQ(device_->events, ReadsOf(runs)) << i << " " << Hex(bytes);
        ASSERT_EQ(MessagesOf(log, "ReadFdToNullByRange"), RangeLinesOf(runs));
    }
}

TEST_F(ReloadBlocksTest, APendingVolumeIsNotRead) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    SetPending();
    for (const char *bytes : {"\x01\x01", "\xff\xff", "\x80\x01"}) {
        CapturedLog log(2);
        EXPECT_EQ(Reload(bytes), WorkResult::Interrupted);
        EXPECT_EQ(log.Messages(),
                  (Messages{
                      "ReloadPinBlocksToCache() [N]: Start to read blocks",
                      "ReloadPinBlocksToCache() [N]: Interrupted due to space is pending",
                  }));
    }
    // Also where all bytes are equal, so that the walk sees no run begin or end.
    for (const size_t size : {size_t{2}, size_t{4096}, size_t{4097}, size_t{10000}}) {
        EXPECT_EQ(Reload(std::string(size, '\0')), WorkResult::Interrupted);
        EXPECT_EQ(Reload(std::string(size, '\xff')), WorkResult::Interrupted);
    }
    EXPECT_EQ(device_->events, Events{});
}

// The volume becomes pending at the n-th read call: the range being read is finished and nothing
// else is read.
TEST_F(ReloadBlocksTest, AVolumeThatTurnsPendingIsLeftAfterTheRangeBeingRead) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    for (const std::string &bytes : {std::string("\x38\x02", 2), std::string("\xff\x81", 2),
                                     std::string("\x01\x80", 2), std::string("\x55\x55", 2)}) {
        const std::vector<ExpectedRead> runs = RunsOf(bytes);
        const size_t calls = ReadsOf(runs).size();
        for (size_t call = 1; call <= calls; ++call) {
            std::vector<ExpectedRead> expected;
            uint64_t counted = 0;
            for (const ExpectedRead &run : runs) {
                if (counted < call) {
                    expected.push_back(run);
                    counted += run.length;
                }
            }
            ASSERT_EQ(ServiceStateInitialize(), 0);
            device_->events.clear();
            device_->onRead = [this, call] {
                if (device_->events.size() == call) {
                    SetPending();
                }
            };
            EXPECT_EQ(Reload(bytes), WorkResult::Interrupted) << Hex(bytes) << " " << call;
            EXPECT_EQ(device_->events, ReadsOf(expected)) << Hex(bytes) << " " << call;
        }
    }
}

TEST_F(ReloadBlocksTest, AnotherVolumesPendingStateDoesNotMatter) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    char other[] = "/volume10";
    ASSERT_EQ(ServiceAddPendingSpaceAtomic(other), 0);
    EXPECT_EQ(Reload("\x01"), WorkResult::Done);
    EXPECT_EQ(device_->events.size(), 1U);
}

TEST_F(ReloadBlocksTest, AFailingReadEndsTheWalk) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    FakeLibc::Fail("read", EIO, 2);
    CapturedLog log;
    EXPECT_EQ(Reload("\x15"), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Read block error (seek = 131072 num bytes = 65536",
                                  "Read range to cache failed",
                              }));
    EXPECT_EQ(device_->events.size(), 2U);
}

TEST_F(ReloadBlocksTest, AFailingLastRangeFails) {
    UseDevice(7 * 65536);
    SKIP_WITHOUT_DIRECT_READS();
    CapturedLog log(2);
    EXPECT_EQ(Reload("\x80"), WorkResult::Failed);
    EXPECT_EQ(LastOf(log.Messages()),
              "ReloadPinBlocksToCache() [N] : ***** Read range to cache failed");
}

TEST_F(ReloadBlocksTest, WithoutMemoryItFailsFirst) {
    UseDevice(4096);
    FakeLibc::Fail("aligned_alloc", ENOMEM);
    CapturedLog log;
    EXPECT_EQ(Reload("\x01"), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{"Can't allocate memory", ""}));
}

TEST_F(ReloadBlocksTest, WithoutADeviceItFails) {
    unsigned char byte = 1;
    const PinBitmap bitmap{&byte, 1};
    CapturedLog log;
    EXPECT_EQ(ReloadPinBlocksToCache(&bitmap, "/missing/device", "/volume1"), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), Messages{"Can't open file (/missing/device)"});
}
} // namespace vesk
