#include "warming/warm_files.h"

#include "tests/support/recorded_opens.h"
#include "tests/unit/warming/warming_fixture.h"

#include "warming/read_range.h"

#include <cerrno>

namespace vesk {
using Events = std::vector<std::string>;

namespace {
FileToWarm MakeFile(const std::string &path, const std::vector<FileMappingEntry> &extents) {
    FileToWarm file{path, {}};
    file.table.entries = extents;
    return file;
}
} // namespace

class WarmFilesTest : public WarmingTest {
protected:
    void SetUp() override {
        WarmingTest::SetUp();
        UseDevice(8 << 20);
    }
    const FileToWarm a_ =
        MakeFile("/volume1/a", {FakeExtent(0, 10, 2048), FakeExtent(10, 8, 4096)});
    const FileToWarm b_ = MakeFile("/volume1/b", {FakeExtent(0, 8, 16)});
};

TEST_F(WarmFilesTest, EveryExtentOfEveryFileIsReadInOrder) {
    SKIP_WITHOUT_DIRECT_READS();
    CapturedLog log;
    EXPECT_EQ(ReadFilesToCache("/volume1", {a_, b_}), WorkResult::Done);
    EXPECT_EQ(device_->events,
              (Events{"read 1048576+5120", "read 2097152+4096", "read 8192+4096"}));
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(WarmFilesTest, AtLevel2EachStepIsLogged) {
    SKIP_WITHOUT_DIRECT_READS();
    CapturedLog log(2);
    EXPECT_EQ(ReadFilesToCache("/volume1", {b_}), WorkResult::Done);
    EXPECT_EQ(MessagesOf(log, "ReadMappingRangesToCache"),
              (Messages{
                  "ReadMappingRangesToCache() [N]: Mapping entry size = 1",
                  "ReadMappingRangesToCache() [N]: Read to null (disk start sector = 16 num "
                  "sectors = 8)",
              }));
    EXPECT_EQ(MessagesOf(log, "ReadFilesToCache"), Messages{});
}

TEST_F(WarmFilesTest, TheDeviceIsOpenedForDirectReads) {
    SKIP_WITHOUT_DIRECT_READS();
    const RecordedOpens opens;
    EXPECT_EQ(ReadFilesToCache("/volume1", {a_, b_}), WorkResult::Done);
    EXPECT_EQ(opens.FlagsOf(device_->Path()), std::vector<int>{O_RDONLY | O_DIRECT | O_CLOEXEC});
}

TEST_F(WarmFilesTest, NoFilesReadNothing) {
    SKIP_WITHOUT_DIRECT_READS();
    EXPECT_EQ(ReadFilesToCache("/volume1", {}), WorkResult::Done);
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(WarmFilesTest, UnwrittenExtentsAreSkipped) {
    SKIP_WITHOUT_DIRECT_READS();
    const FileToWarm file =
        MakeFile("/volume1/a", {FakeExtent(0, 8, 1024, 1), FakeExtent(8, 8, 2048, 0),
                                // Any other flag is data.
                                FakeExtent(16, 8, 3072, 2), FakeExtent(24, 8, 4096, 3)});
    CapturedLog log(2);
    EXPECT_EQ(ReadFilesToCache("/volume1", {file}), WorkResult::Done);
    EXPECT_EQ(device_->events,
              (Events{"read 1048576+4096", "read 1572864+4096", "read 2097152+4096"}));
    EXPECT_EQ(log.Count("ReadMappingRangesToCache() [N]: Skip uninitialized range (disk start "
                        "sector = 1024 num sectors = 8)"),
              1);
}

TEST_F(WarmFilesTest, AFileWithoutWrittenExtentsCausesNoRead) {
    SKIP_WITHOUT_DIRECT_READS();
    EXPECT_EQ(ReadFilesToCache("/volume1", {MakeFile("/volume1/a", {FakeExtent(0, 8, 64, 1)}),
                                            MakeFile("/volume1/b", {})}),
              WorkResult::Done);
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(WarmFilesTest, AFailingReadNamesTheFileOnce) {
    SKIP_WITHOUT_DIRECT_READS();
    const FileToWarm past = MakeFile("/volume1/past", {FakeExtent(0, 8, 16384)});
    CapturedLog log;
    EXPECT_EQ(ReadFilesToCache("/volume1", {b_, past, a_}), WorkResult::Failed);
    EXPECT_EQ(log.Messages(),
              (Messages{
                  "Read block error (seek = 8388608 num bytes = 4096",
                  "Read fd to null failed (disk start sector = 16384 num sectors = 8)",
                  "Can't read file (/volume1/past) to cache",
              }));
    EXPECT_EQ(device_->events, (Events{"read 8192+4096", "read 8388608+4096"}));
}

TEST_F(WarmFilesTest, ALongPathIsShownUpToItsFirst511Bytes) {
    SKIP_WITHOUT_DIRECT_READS();
    const std::string path = "/volume1/" + std::string(503, 'x');
    CapturedLog log;
    EXPECT_EQ(ReadFilesToCache("/volume1", {MakeFile(path, {FakeExtent(0, 8, 16384)})}),
              WorkResult::Failed);
    EXPECT_EQ(log.Messages().back(), "Can't read file (" + path.substr(0, 511) + ") to cache");
}

TEST_F(WarmFilesTest, FailuresNameTheirFunctions) {
    SKIP_WITHOUT_DIRECT_READS();
    FakeLibc::Fail("read", EIO);
    CapturedLog log(2);
    EXPECT_EQ(ReadFilesToCache("/volume1", {b_}), WorkResult::Failed);
    EXPECT_TRUE(log.Has("ReadMappingRangesToCache() [N] : ***** Read fd to null failed (disk start "
                        "sector = 16 num sectors = 8)"));
    EXPECT_TRUE(log.Has("ReadFilesToCache() [N] : ***** Can't read file (/volume1/b) to cache"));
}

TEST_F(WarmFilesTest, AFailingSeekFailsTheFile) {
    SKIP_WITHOUT_DIRECT_READS();
    FakeLibc::Fail("lseek", EIO);
    CapturedLog log;
    EXPECT_EQ(ReadFilesToCache("/volume1", {b_}), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't seek to 8192",
                                  "Read fd to null failed (disk start sector = 16 num sectors = 8)",
                                  "Can't read file (/volume1/b) to cache",
                              }));
}

TEST_F(WarmFilesTest, APendingVolumeIsNotRead) {
    SKIP_WITHOUT_DIRECT_READS();
    SetPending();
    CapturedLog log(2);
    EXPECT_EQ(ReadFilesToCache("/volume1", {a_}), WorkResult::Interrupted);
    EXPECT_EQ(device_->events, Events{});
    EXPECT_EQ(MessagesOf(log, "ReadFilesToCache"),
              Messages{"ReadFilesToCache() [N]: Space is pending, Interrupted"});
}

TEST_F(WarmFilesTest, APendingVolumeWithoutFilesIsDone) {
    SKIP_WITHOUT_DIRECT_READS();
    SetPending();
    EXPECT_EQ(ReadFilesToCache("/volume1", {}), WorkResult::Done);
}

TEST_F(WarmFilesTest, PendingInsideAFileEndsBeforeTheNextExtent) {
    SKIP_WITHOUT_DIRECT_READS();
    device_->onRead = [] { SetPending(); };
    CapturedLog log(2);
    EXPECT_EQ(ReadFilesToCache("/volume1", {a_, b_}), WorkResult::Interrupted);
    EXPECT_EQ(device_->events, Events{"read 1048576+5120"});
    EXPECT_TRUE(log.Has("ReadMappingRangesToCache() [N]: Space is pending, Interrupted"));
    EXPECT_EQ(MessagesOf(log, "ReadFilesToCache"), Messages{"ReadFilesToCache() [N]: Interrupted"});
}

TEST_F(WarmFilesTest, PendingInTheLastExtentEndsBeforeTheNextFile) {
    SKIP_WITHOUT_DIRECT_READS();
    device_->onRead = [] { SetPending(); };
    CapturedLog log(2);
    EXPECT_EQ(ReadFilesToCache("/volume1", {b_, a_}), WorkResult::Interrupted);
    EXPECT_EQ(device_->events, Events{"read 8192+4096"});
    EXPECT_EQ(MessagesOf(log, "ReadFilesToCache"),
              Messages{"ReadFilesToCache() [N]: Space is pending, Interrupted"});
}

TEST_F(WarmFilesTest, PendingInTheVeryLastReadIsDone) {
    SKIP_WITHOUT_DIRECT_READS();
    device_->onRead = [] { SetPending(); };
    EXPECT_EQ(ReadFilesToCache("/volume1", {b_}), WorkResult::Done);
}

TEST_F(WarmFilesTest, AnInterruptionIsSilentAtLevel1) {
    SKIP_WITHOUT_DIRECT_READS();
    SetPending();
    CapturedLog log;
    EXPECT_EQ(ReadFilesToCache("/volume1", {a_}), WorkResult::Interrupted);
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(WarmFilesTest, WithoutMemoryItFailsFirst) {
    FakeAppliance::spaces.clear();
    FakeLibc::Fail("aligned_alloc", ENOMEM);
    CapturedLog log;
    EXPECT_EQ(ReadFilesToCache("/volume1", {a_}), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{"Can't allocate memory", ""}));
}

TEST_F(WarmFilesTest, WithoutACachePathItFails) {
    FakeAppliance::caches[0].cachePathResult = 0;
    CapturedLog log;
    EXPECT_EQ(ReadFilesToCache("/volume1", {a_}), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't get cache path",
                                  "Can't get cache path",
                                  "Cant' get cache path from volume (/volume1)",
                              }));
}

TEST_F(WarmFilesTest, WithoutADeviceItFails) {
    FakeAppliance::caches[0].cachePath = "/missing/device";
    CapturedLog log(2);
    EXPECT_EQ(ReadFilesToCache("/volume1", {a_}), WorkResult::Failed);
    EXPECT_EQ(MessagesOf(log, "ReadFilesToCache"),
              Messages{"ReadFilesToCache() [N] : ***** Can't open file (/missing/device)"});
}

TEST_F(WarmFilesTest, AnExtentOf4GiBIsCutTo32Bits) {
    SKIP_WITHOUT_DIRECT_READS();
    EXPECT_EQ(ReadFilesToCache("/volume1", {MakeFile("/volume1/a", {FakeExtent(0, 8388616, 0)})}),
              WorkResult::Done);
    EXPECT_EQ(device_->events, Events{"read 0+4096"});
}
} // namespace vesk
