#include "warming/read_file.h"

#include "tests/support/recorded_opens.h"
#include "tests/unit/warming/warming_fixture.h"

#include <cerrno>
#include <regex>

namespace vesk {
using Events = std::vector<std::string>;

namespace {
// The messages with the time of day taken out.
Messages WithoutTimes(const Messages &messages) {
    static const std::regex time("sec=[0-9]+ msec=[0-9]+ usec=[0-9]+");
    Messages result;
    for (const std::string &message : messages) {
        result.push_back(std::regex_replace(message, time, "T"));
    }
    return result;
}
} // namespace

class ReadFileTest : public WarmingTest {
protected:
    WorkResult Read(uint64_t lastSector) {
        return FileReadToCache("/volume1", device_->Path().c_str(), lastSector);
    }
};

TEST_F(ReadFileTest, TheFileIsReadUpToTheLastSector) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    CapturedLog log;
    EXPECT_EQ(Read(255), WorkResult::Done); // 128 KiB
    EXPECT_EQ(device_->events, (Events{"read 0+65536", "read 65536+65536"}));
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(ReadFileTest, TheFileIsOpenedForDirectReads) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    const RecordedOpens opens;
    EXPECT_EQ(Read(0), WorkResult::Done);
    EXPECT_EQ(opens.FlagsOf(device_->Path()), std::vector<int>{O_RDONLY | O_DIRECT | O_CLOEXEC});
}

TEST_F(ReadFileTest, APartOfAChunkCostsAWholeOne) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    EXPECT_EQ(Read(0), WorkResult::Done);
    EXPECT_EQ(device_->events, Events{"read 0+65536"});
    device_->events.clear();
    EXPECT_EQ(Read(128), WorkResult::Done);
    EXPECT_EQ(device_->events, (Events{"read 0+65536", "read 65536+65536"}));
}

TEST_F(ReadFileTest, AtLevel2BeginAndEndAreLogged) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    CapturedLog log(2);
    EXPECT_EQ(Read(127), WorkResult::Done);
    const std::string &path = device_->Path();
    EXPECT_EQ(WithoutTimes(log.Messages()),
              (Messages{
                  "FileReadToCache() [N]: Read file (" + path +
                      ") to cache. last read sector = 127 bytes to read = 65536",
                  "FileReadToCache() [N]: Read file (" + path + ") start, Time=T",
                  "FileReadToCache() [N]: Total Read bytes (65536) >= byte to read (65536), break",
                  "FileReadToCache() [N]: Read file (" + path + ") finish, Time=T Num read=65536",
              }));
}

TEST_F(ReadFileTest, TheEndOfTheFileIsSuccess) {
    UseDevice(65536 + 4096);
    SKIP_WITHOUT_DIRECT_READS();
    CapturedLog log(2);
    EXPECT_EQ(Read(1000), WorkResult::Done);
    EXPECT_EQ(device_->events, (Events{"read 0+65536", "read 65536+65536", "read 69632+65536"}));
    EXPECT_EQ(LastOf(WithoutTimes(log.Messages())), "FileReadToCache() [N]: Read file (" +
                                                        device_->Path() +
                                                        ") finish, Time=T Num read=69632");
}

TEST_F(ReadFileTest, AFileThatHasGoneIsSkipped) {
    CapturedLog log;
    EXPECT_EQ(FileReadToCache("/volume1", "/missing/file", 7), WorkResult::Done);
    EXPECT_EQ(log.Messages(),
              Messages{"File (/missing/file) doesn't exist (might due to be renamed), skip it"});
    CapturedLog verbose(2);
    EXPECT_EQ(FileReadToCache("/volume1", "/missing/file", 7), WorkResult::Done);
    EXPECT_EQ(LastOf(verbose.Messages()),
              "FileReadToCache() [N] : File (/missing/file) doesn't exist (might due to be "
              "renamed), skip it");
}

TEST_F(ReadFileTest, AFailingReadFails) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    FakeLibc::Fail("read", EIO, 2);
    CapturedLog log;
    EXPECT_EQ(Read(2000), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), Messages{"Read error"});
}

TEST_F(ReadFileTest, WithoutMemoryItFails) {
    FakeLibc::Fail("aligned_alloc", ENOMEM);
    CapturedLog log;
    EXPECT_EQ(FileReadToCache("/volume1", "/missing/file", 7), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{"Can't allocate memory", ""}));
}

TEST_F(ReadFileTest, APendingVolumeInterruptsAfterAChunk) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    SetPending();
    CapturedLog log;
    EXPECT_EQ(Read(2000), WorkResult::Interrupted);
    EXPECT_EQ(device_->events, Events{"read 0+65536"});
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(ReadFileTest, WhatIsReadWholeIsDoneEvenOnAPendingVolume) {
    UseDevice(1 << 20);
    SKIP_WITHOUT_DIRECT_READS();
    SetPending();
    EXPECT_EQ(Read(127), WorkResult::Done);
}
} // namespace vesk
