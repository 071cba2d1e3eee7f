#include "bitmap/space_bitmap.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/temp_dir.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <gtest/gtest.h>
#include <linux/fs.h>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
using Messages = std::vector<std::string>;

int callocsLeft = -1; // negative: memory never runs out

class SpaceBitmapTest : public LeakCheckedTest {
protected:
    // A volume whose top directory is `folder`, on a cache device of 100 bitmap bytes.
    void SetUp() override {
        LeakCheckedTest::SetUp();
        FakeApplianceOneVolume("/dev/null", folder.Path());
        SetDeviceBytes(100 << 19);
    }
    void TearDown() override {
        callocsLeft = -1;
        if (bitmap != nullptr) {
            CapturedLog log;
            BitmapFree(bitmap);
        }
        LeakCheckedTest::TearDown();
    }
    static void SetDeviceBytes(uint64_t bytes) {
        FakeLibc::onIoctl = [bytes](unsigned long request, void *data) {
            EXPECT_EQ(request, BLKGETSIZE64);
            *static_cast<uint64_t *>(data) = bytes;
            return 0;
        };
    }
    static void RefuseDeviceSize() {
        FakeLibc::onIoctl = [](unsigned long, void *) { return -1; };
    }
    // The messages of a load that gives this result.
    Messages Load(int expected, int level = 1) {
        CapturedLog log(level);
        EXPECT_EQ(BitmapAllocateAndInitialize("uuid-1", &bitmap, &sizeChanged), expected);
        callocsLeft = -1;
        return log.Messages();
    }
    std::string Content() const {
        return bitmap == nullptr
                   ? "(none)"
                   : std::string(reinterpret_cast<const char *>(bitmap->data), bitmap->size);
    }

    TempDir folder;
    const std::string path = folder.Path("veskcachepinfile.bitmap");
    PinBitmap *bitmap = nullptr;
    bool sizeChanged = true;
};
} // namespace

// Takes the place of the C library's. Of malloc and memset the compiler would make a call of
// calloc.
extern "C" void *calloc(size_t count, size_t size) noexcept {
    if (callocsLeft == 0) {
        return nullptr;
    }
    --callocsLeft;
    const size_t bytes = (count * size + 15) / 16 * 16;
    void *memory = aligned_alloc(16, bytes);
    return memory == nullptr ? nullptr : memset(memory, 0, bytes);
}

TEST_F(SpaceBitmapTest, NeededSizeIsTheDevicesDividedBy512KiB) {
    const struct {
        uint64_t device;
        uint64_t bitmap;
    } cases[] = {{0, 0},
                 {524287, 0},
                 {524288, 1},
                 {1048575, 1},
                 {1ULL << 44, 33554432}, // 16 TiB: 32 MiB
                 {UINT64_MAX, 35184372088831}};
    for (const auto &one : cases) {
        SetDeviceBytes(one.device);
        CapturedLog log;
        uint64_t size = 7;
        EXPECT_EQ(BitmapGetNeededSizeByte("/dev/null", &size), 0);
        EXPECT_EQ(size, one.bitmap);
        EXPECT_EQ(log.Text(), "");
    }
}

TEST_F(SpaceBitmapTest, NeededSizeTellsTheDevicesAtLevel2) {
    SetDeviceBytes(UINT64_MAX);
    CapturedLog log(2);
    uint64_t size = 0;
    EXPECT_EQ(BitmapGetNeededSizeByte("/dev/null", &size), 0);
    EXPECT_EQ(log.Messages(),
              Messages{"BitmapGetNeededSizeByte() [N]: Disk size = 18446744073709551615 byte"});
}

TEST_F(SpaceBitmapTest, NeededSizeOfNoDeviceIsAnError) {
    CapturedLog log(2);
    uint64_t size = 0;
    EXPECT_EQ(BitmapGetNeededSizeByte("/no/such", &size), -1);
    EXPECT_EQ(log.Messages(),
              (Messages{"DeviceGetSizeByte() [N] : ***** Can't open device (/no/such)",
                        "BitmapGetNeededSizeByte() [N] : ***** Can't get block device path"}));
}

TEST_F(SpaceBitmapTest, WithoutAFileIsAllZeroAndOfTheDevicesSize) {
    EXPECT_EQ(Load(0), Messages{});
    ASSERT_NE(bitmap, nullptr);
    EXPECT_EQ(Content(), std::string(100, '\0'));
    EXPECT_FALSE(sizeChanged);
}

TEST_F(SpaceBitmapTest, WithoutAFileSaysSoAtLevel2) {
    const Messages messages = Load(0, 2);
    ASSERT_GE(messages.size(), 3U);
    EXPECT_EQ(
        Messages(messages.end() - 3, messages.end()),
        (Messages{"BitmapGetNeededSizeByte() [N]: Disk size = 52428800 byte",
                  "BitmapAllocateAndInitialize() [N]: Allocate 100 bytes bitmap",
                  "BitmapAllocateAndInitialize() [N]: Bitmap files (" + path + ") doesn't exist"}));
}

TEST_F(SpaceBitmapTest, IsFilledFromAFileOfItsSize) {
    WriteWhole(path, std::string(100, '\x5A'));
    EXPECT_EQ(Load(0), Messages{});
    EXPECT_EQ(Content(), std::string(100, '\x5A'));
    EXPECT_FALSE(sizeChanged);
}

TEST_F(SpaceBitmapTest, SizesAreToldAtLevel2) {
    WriteWhole(path, std::string(100, '\x5A'));
    const Messages messages = Load(0, 2);
    EXPECT_EQ(messages.at(messages.size() - 3), "BitmapAllocateAndInitialize() [N]: Bitmap memory "
                                                "size = 100, file size = 100");
    EXPECT_EQ(LastOf(messages), "BitmapInitByFile() [N]: Read to memory finish");
}

TEST_F(SpaceBitmapTest, ShorterFileFillsTheStartAndTellsOfTheChange) {
    WriteWhole(path, std::string(60, '\x5A'));
    EXPECT_EQ(Load(0), Messages{"Bitmap size changed. Could be due to volume expansion"});
    EXPECT_EQ(Content(), std::string(60, '\x5A') + std::string(40, '\0'));
    EXPECT_TRUE(sizeChanged);
}

TEST_F(SpaceBitmapTest, ChangeOfSizeHasNoErrorMarker) {
    WriteWhole(path, "");
    const Messages messages = Load(0, 2);
    EXPECT_NE(std::find(messages.begin(), messages.end(),
                        "BitmapAllocateAndInitialize() [N] : Bitmap size changed. Could be due to "
                        "volume expansion"),
              messages.end());
    EXPECT_TRUE(sizeChanged);
    EXPECT_EQ(Content(), std::string(100, '\0'));
}

TEST_F(SpaceBitmapTest, LongerFileIsAnErrorAndTheRecordIsReleased) {
    WriteWhole(path, std::string(101, '\x5A'));
    EXPECT_EQ(Load(-1), Messages{"Incorrect bitmap size (100), file size (101)"});
    EXPECT_EQ(bitmap, nullptr);
    EXPECT_FALSE(sizeChanged);
    EXPECT_EQ(ReadWhole(path), std::string(101, '\x5A'));
}

TEST_F(SpaceBitmapTest, DeviceTooSmallForAByteHasAnEmptyBitmap) {
    SetDeviceBytes(524287);
    EXPECT_EQ(Load(0), Messages{});
    ASSERT_NE(bitmap, nullptr);
    EXPECT_NE(bitmap->data, nullptr);
    EXPECT_EQ(bitmap->size, 0U);
}

TEST_F(SpaceBitmapTest, UnknownSpaceIsAnErrorAndMakesNoRecord) {
    FakeAppliance::spaces.clear();
    EXPECT_EQ(Load(-1), (Messages{"Can't get reference path", "Can't get bitmap path"}));
    EXPECT_EQ(bitmap, nullptr);
    EXPECT_FALSE(sizeChanged);
}

TEST_F(SpaceBitmapTest, SpaceWithoutCacheIsAnErrorAndMakesNoRecord) {
    FakeAppliance::caches.clear();
    EXPECT_EQ(Load(-1), (Messages{"Can't get cache's ssd path", "Can't get cache path"}));
    EXPECT_EQ(bitmap, nullptr);
}

TEST_F(SpaceBitmapTest, NoMemoryForTheRecordIsAnError) {
    callocsLeft = 0;
    EXPECT_EQ(Load(-1), Messages{"Allocate bitmap data failed"});
    EXPECT_EQ(bitmap, nullptr);
}

TEST_F(SpaceBitmapTest, UnknownDeviceSizeIsAnErrorAndLeavesTheRecordToTheCaller) {
    RefuseDeviceSize();
    EXPECT_EQ(Load(-1),
              (Messages{"Can't get size of device (/dev/null)", "Can't get block device path",
                        "Can't get needed bitmap sizeof"}));
    ASSERT_NE(bitmap, nullptr);
    EXPECT_EQ(bitmap->data, nullptr);
    EXPECT_EQ(bitmap->size, 0U);
}

TEST_F(SpaceBitmapTest, NoMemoryForTheBytesIsAnErrorAndLeavesTheRecordToTheCaller) {
    callocsLeft = 1;
    EXPECT_EQ(Load(-1), Messages{"Can't allocate bitmap memory"});
    ASSERT_NE(bitmap, nullptr);
    EXPECT_EQ(bitmap->data, nullptr);
}

TEST_F(SpaceBitmapTest, FileThatCannotBeLookedUpIsNotTakenForAMissingOne) {
    const std::string content(100, '\x5A');
    WriteWhole(path, content);
    FakeLibc::Fail("stat", EIO);
    EXPECT_EQ(Load(0), Messages{});
    EXPECT_EQ(Content(), content);
}

TEST_F(SpaceBitmapTest, LinkThatPointsNowhereIsNotTakenForAMissingFile) {
    ASSERT_EQ(symlink("no", path.c_str()), 0);
    EXPECT_EQ(Load(-1), (Messages{"Bitmap size changed. Could be due to volume expansion",
                                  "Can't open bitmap file (" + path + ")", "",
                                  "Read bitmap file to bitmap memory error"}));
    EXPECT_EQ(bitmap, nullptr);
}

TEST_F(SpaceBitmapTest, FileThatVanishesBeforeItIsSizedIsAnError) {
    WriteWhole(path, std::string(100, '\x5A'));
    FakeLibc::Fail("stat", ENOENT, 2);
    EXPECT_EQ(Load(-1), (Messages{"Can't get file (" + path + ") stat result",
                                  "Get the size of file (" + path + ") error"}));
    EXPECT_EQ(bitmap, nullptr);
}

TEST_F(SpaceBitmapTest, FileThatVanishesBeforeItIsReadIsAnError) {
    WriteWhole(path, std::string(100, '\x5A'));
    FakeLibc::Fail("stat", ENOENT, 3);
    EXPECT_EQ(Load(-1), (Messages{"Can't get file (" + path + ") stat result",
                                  "Get the size of file (" + path + ") error",
                                  "Read bitmap file to bitmap memory error"}));
    EXPECT_EQ(bitmap, nullptr);
}

TEST_F(SpaceBitmapTest, FileThatCannotBeReadIsAnErrorAndTheRecordIsReleased) {
    WriteWhole(path, std::string(60, '\x5A'));
    FakeLibc::Fail("read", EIO);
    EXPECT_EQ(Load(-1), (Messages{"Bitmap size changed. Could be due to volume expansion",
                                  "Read bitmap file (" + path + ") error", "",
                                  "Read bitmap file to bitmap memory error"}));
    EXPECT_EQ(bitmap, nullptr);
    EXPECT_TRUE(sizeChanged);
}

TEST_F(SpaceBitmapTest, ErrorsCarryTheMarkerAndTheOperationsName) {
    WriteWhole(path, std::string(101, '\x5A'));
    EXPECT_EQ(LastOf(Load(-1, 2)),
              "BitmapAllocateAndInitialize() [N] : ***** Incorrect bitmap size "
              "(100), file size (101)");
}

TEST_F(SpaceBitmapTest, HolderReleasesTheBitmap) {
    CapturedLog log;
    EXPECT_EQ(Load(0), Messages{});
    { const BitmapHolder holder(bitmap); }
    bitmap = nullptr;
    { const BitmapHolder none; }
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceBitmapTest, VolumeIsOpenedWithAllThatBelongsToIt) {
    WriteWhole(path, std::string(60, '\x5A'));
    VolumeBitmap volume;
    CapturedLog log;
    ASSERT_EQ(VolumeBitmapOpen(folder.Path().c_str(), &volume, {"Caller", 1}), 0);
    EXPECT_STREQ(volume.uuid.get(), "uuid-1");
    EXPECT_STREQ(volume.cachePath.get(), "/dev/null");
    EXPECT_EQ(volume.bitmapPath.get(), path);
    EXPECT_EQ(volume.bitmap->size, 100U);
    EXPECT_EQ(volume.bitmap->data[59], 0x5A);
    EXPECT_TRUE(volume.sizeChanged);
    EXPECT_EQ(log.Messages(), Messages{"Bitmap size changed. Could be due to volume expansion"});
}

TEST_F(SpaceBitmapTest, VolumeNamesTheStepThatFailedAtTheCallersPlace) {
    const auto lastMessage = [this](bool loaded) {
        VolumeBitmap opened;
        CapturedLog log(2);
        EXPECT_EQ(VolumeBitmapOpen(folder.Path().c_str(), &opened, {"Caller", 1}), -1);
        EXPECT_EQ(opened.bitmap != nullptr, loaded);
        const std::string message = log.Messages().back();
        CapturedLog release;
        opened.bitmap.reset();
        EXPECT_EQ(release.Text(), loaded ? "tool: Warning: data is NULL for free\n" : "");
        return message;
    };
    RefuseDeviceSize();
    EXPECT_EQ(lastMessage(true), "Caller() [N] : ***** Allocate bitmap failed");
    FakeAppliance::onConfigLookup = [] { FakeAppliance::spaces.clear(); }; // meanwhile
    EXPECT_EQ(lastMessage(false), "Caller() [N] : ***** Can't get bitmap path");
    FakeApplianceOneVolume("/dev/null", folder.Path());
    FakeAppliance::caches[0].cachePathResult = 0;
    EXPECT_EQ(lastMessage(false), "Caller() [N] : ***** Can't get cache path");
    FakeAppliance::spaces[0].uuid = "";
    EXPECT_EQ(lastMessage(false), "Caller() [N] : ***** Can't get space uuid");
}

TEST_F(SpaceBitmapTest, BitmapIsWrittenUnlessThereIsNoPathAndSent) {
    ASSERT_EQ(Load(0), Messages{});
    memset(bitmap->data, 0x81, bitmap->size);
    int sent = 0;
    FakeLibc::onIoctl = [&sent](unsigned long, void *) { return ++sent > 2 ? -1 : 0; };
    CapturedLog log(2);
    EXPECT_EQ(BitmapWriteAndSend(bitmap, nullptr, "/dev/null", {"Caller", 1}), 0);
    struct stat status {};
    EXPECT_EQ(lstat(path.c_str(), &status), -1);
    EXPECT_EQ(sent, 1);
    EXPECT_EQ(BitmapWriteAndSend(bitmap, path.c_str(), "/dev/null", {"Caller", 1}), 0);
    EXPECT_EQ(ReadWhole(path), std::string(100, '\x81'));
    EXPECT_EQ(sent, 2);
    EXPECT_EQ(BitmapWriteAndSend(bitmap, path.c_str(), "/dev/null", {"Caller", 1}), -1);
    EXPECT_EQ(log.Messages().back(), "Caller() [N] : ***** Can't send bitmap to driver");
    EXPECT_EQ(BitmapWriteAndSend(bitmap, "/no/such", "/dev/null", {"Caller", 1}), -1);
    EXPECT_EQ(log.Messages().back(), "Caller() [N] : ***** Write bitmap failed");
    EXPECT_EQ(sent, 3);
}
} // namespace vesk
