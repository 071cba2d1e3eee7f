#include "warming/read_range.h"

#include "tests/unit/warming/warming_fixture.h"

#include "base/scoped_fd.h"

#include <cerrno>
#include <cstdint>
#include <fcntl.h>
#include <vector>

namespace vesk {
using Events = std::vector<std::string>;

class ReadRangeTest : public WarmingTest {
protected:
    // Reads from the device, with an ordinary descriptor and a buffer of this size.
    int Read(uint64_t offset, uint64_t count, size_t bufferSize = 65536) {
        const ScopedFd fd(open(device_->Path().c_str(), O_RDONLY));
        std::vector<char> buffer(bufferSize);
        return ReadFdToNull(fd.Get(), offset, count, buffer.data(), bufferSize);
    }
    int ReadBits(uint64_t startBit, uint64_t numBits) {
        const ScopedFd fd(open(device_->Path().c_str(), O_RDONLY));
        std::vector<char> buffer(65536);
        return ReadFdToNullByRange(fd.Get(), {startBit, numBits}, buffer.data(), buffer.size());
    }
};

TEST_F(ReadRangeTest, TheBufferIsAlignedForDirectReads) {
    const WarmBuffer buffer = WarmBufferAllocate();
    ASSERT_TRUE(buffer);
    EXPECT_EQ(reinterpret_cast<uintptr_t>(buffer.get()) % 4096, 0U);
    EXPECT_EQ(kWarmBufferBytes, 65536U);
}

TEST_F(ReadRangeTest, ASmallRangeIsOneRead) {
    UseDevice(4 << 20);
    CapturedLog log;
    EXPECT_EQ(Read(1048576, 5120), 0);
    EXPECT_EQ(device_->events, Events{"read 1048576+5120"});
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(ReadRangeTest, ALongRangeIsReadBufferByBuffer) {
    UseDevice(4 << 20);
    EXPECT_EQ(Read(512, 131072 + 7), 0);
    EXPECT_EQ(device_->events, (Events{"read 512+65536", "read 66048+65536", "read 131584+7"}));
    device_->events.clear();
    EXPECT_EQ(Read(0, 10, 4), 0);
    EXPECT_EQ(device_->events, (Events{"read 0+4", "read 4+4", "read 8+2"}));
}

TEST_F(ReadRangeTest, NothingToReadTouchesNothing) {
    UseDevice(65536);
    EXPECT_EQ(ReadFdToNull(-1, 0, 0, nullptr, 65536), 0);
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(ReadRangeTest, OnlyTheLow32BitsOfTheCountAreRead) {
    UseDevice(65536);
    EXPECT_EQ(Read(0, 1ULL << 32), 0);
    EXPECT_EQ(device_->events, Events{});
    CapturedLog log(2);
    EXPECT_EQ(Read(0, (1ULL << 32) + 512), 0);
    EXPECT_EQ(device_->events, Events{"read 0+512"});
    EXPECT_EQ(log.Messages(),
              Messages{"ReadFdToNull() [N]: offset byte = 0 num bytes = 4294967808"});
}

TEST_F(ReadRangeTest, AShortReadIsContinuedWhereItEnded) {
    UseDevice(65536);
    FakeLibc::Limit("read", 1000);
    EXPECT_EQ(Read(100, 4096), 0);
    EXPECT_EQ(device_->events, (Events{"read 100+4096", "read 1100+3096"}));
}

TEST_F(ReadRangeTest, OffsetsBeyond4GiBAreReached) {
    UseDevice((1ULL << 33) + 65536);
    EXPECT_EQ(Read(1ULL << 33, 65536), 0);
    EXPECT_EQ(device_->events, Events{"read 8589934592+65536"});
}

TEST_F(ReadRangeTest, AFailingSeekIsReportedWithItsOffset) {
    UseDevice(65536);
    CapturedLog log;
    FakeLibc::Fail("lseek", EIO);
    EXPECT_EQ(Read(4096, 512), -1);
    EXPECT_EQ(Read(UINT64_MAX, 512), -1); // no offset a descriptor can have
    EXPECT_EQ(log.Messages(), (Messages{"Can't seek to 4096", "Can't seek to -1"}));
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(ReadRangeTest, AFailingReadIsReportedWithAnOpenParenthesis) {
    UseDevice(1 << 20);
    CapturedLog log;
    FakeLibc::Fail("read", EIO, 2);
    EXPECT_EQ(Read(4096, 131072), -1);
    EXPECT_EQ(log.Messages(), Messages{"Read block error (seek = 69632 num bytes = 65536"});
}

TEST_F(ReadRangeTest, TheEndOfTheDeviceIsAnError) {
    UseDevice(5120);
    CapturedLog log(2);
    EXPECT_EQ(Read(0, 65536), -1);
    EXPECT_EQ(device_->events, (Events{"read 0+65536", "read 5120+60416"}));
    EXPECT_EQ(log.Messages(),
              (Messages{
                  "ReadFdToNull() [N]: offset byte = 0 num bytes = 65536",
                  "ReadFdToNull() [N] : ***** Read block error (seek = 5120 num bytes = 60416",
              }));
}

TEST_F(ReadRangeTest, ABlockRangeIs64KiBPerBit) {
    UseDevice(1 << 20);
    CapturedLog log(2);
    EXPECT_EQ(ReadBits(3, 3), 0);
    EXPECT_EQ(device_->events,
              (Events{"read 196608+65536", "read 262144+65536", "read 327680+65536"}));
    EXPECT_EQ(log.Messages(),
              (Messages{
                  "ReadFdToNullByRange() [N]: Range's bitStart=3 numBits=3 (size = 196608 bytes)",
                  "ReadFdToNull() [N]: offset byte = 196608 num bytes = 196608",
              }));
}

TEST_F(ReadRangeTest, ABlockRangeOf4GiBIsCutTo32Bits) {
    UseDevice(1 << 20);
    CapturedLog log(2);
    EXPECT_EQ(ReadBits(1, 65536), 0);
    EXPECT_EQ(device_->events, Events{});
    EXPECT_EQ(ReadBits(1, 65537), 0);
    EXPECT_EQ(device_->events, Events{"read 65536+65536"});
    EXPECT_EQ(
        log.Messages(),
        (Messages{
            "ReadFdToNullByRange() [N]: Range's bitStart=1 numBits=65536 (size = 4294967296 bytes)",
            "ReadFdToNull() [N]: offset byte = 65536 num bytes = 0",
            "ReadFdToNullByRange() [N]: Range's bitStart=1 numBits=65537 (size = 4295032832 bytes)",
            "ReadFdToNull() [N]: offset byte = 65536 num bytes = 65536",
        }));
}

TEST_F(ReadRangeTest, ABlockRangePastTheEndFails) {
    UseDevice(65536);
    CapturedLog log;
    EXPECT_EQ(ReadBits(1, 1), -1);
    EXPECT_EQ(log.Messages(), Messages{"Read block error (seek = 65536 num bytes = 65536"});
}
} // namespace vesk
