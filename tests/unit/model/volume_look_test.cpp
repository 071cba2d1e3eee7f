#include "model/volume_look.h"

#include "tests/support/private_world.h"
#include "tests/unit/model/volume_fixture.h"

#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
// Also by the real user, whom access() asks for.
class WhollyOrdinaryUser {
public:
    WhollyOrdinaryUser() { EXPECT_EQ(setresuid(65534, 65534, 0), 0); }
    ~WhollyOrdinaryUser() { EXPECT_EQ(setresuid(0, 0, 0), 0); }
    WhollyOrdinaryUser(const WhollyOrdinaryUser &) = delete;
    WhollyOrdinaryUser &operator=(const WhollyOrdinaryUser &) = delete;
};

class VolumeLookTest : public VolumeTest {
protected:
    Volume Look(const std::string &uuid = "uuid-1") {
        errors_ = {};
        return VolumeLook({mountPath_, "/dev/space1", uuid}, &errors_);
    }
    LookErrors errors_;
};
} // namespace

TEST_F(VolumeLookTest, AVolumeIsSeenWithAllThatBelongsToIt) {
    WriteWhole(BitmapPath(), std::string("\x81\x00\xFF", 3));
    WriteWhole(device_ + ".json", R"({"slots": 4096, "pinnedBlocks": 9})");
    WriteWhole(device_ + ".cached", std::string("\x03\x00\x00", 3));
    const Volume volume = Look();
    EXPECT_EQ(volume.mountPath, mountPath_);
    EXPECT_TRUE(volume.isMounted);
    EXPECT_TRUE(volume.hasCache);
    EXPECT_EQ(volume.uuid, "uuid-1");
    EXPECT_EQ(volume.cacheDevice, device_);
    EXPECT_EQ(volume.ssd, ssd_);
    EXPECT_EQ(volume.deviceBytes, 1900544U);
    EXPECT_EQ(volume.ssdBlocks, 4096U);
    EXPECT_EQ(volume.supportsPin, true);
    EXPECT_EQ(volume.driverHasBitmap, true);
    EXPECT_EQ(volume.allUnpinned, false);
    EXPECT_EQ(volume.bitmapBytes, 3U);
    EXPECT_EQ(volume.bitmapBytesNeeded, 3U);
    EXPECT_EQ(volume.blocksHeld, 9U);
    EXPECT_EQ(volume.held, false);
    EXPECT_EQ(volume.marked, (BlockSet{0x81, 0x00, 0xFF}));
    EXPECT_EQ(volume.resident, (BlockSet{0x03, 0x00, 0x00}));
    EXPECT_EQ(TextsOf(errors_), Texts{});
}

TEST_F(VolumeLookTest, TheDriversAnswersAreYesForAnyWordButZero) {
    bitmapSet_ = 0;
    allUnpinned_ = -1;
    const Volume volume = Look();
    EXPECT_EQ(volume.driverHasBitmap, false);
    EXPECT_EQ(volume.allUnpinned, true);
}

TEST_F(VolumeLookTest, WithoutABitmapFileNothingIsMarked) {
    const Volume volume = Look();
    EXPECT_EQ(volume.bitmapBytes, std::nullopt);
    EXPECT_EQ(volume.marked, (BlockSet{0, 0, 0}));
    EXPECT_EQ(TextsOf(errors_), Texts{});
}

TEST_F(VolumeLookTest, ABitmapOfAnotherLengthIsTakenAsFarAsItGoes) {
    WriteWhole(BitmapPath(), "\x81");
    Volume volume = Look();
    EXPECT_EQ(volume.bitmapBytes, 1U);
    EXPECT_EQ(volume.marked, (BlockSet{0x81, 0, 0}));
    EXPECT_EQ(TextsOf(errors_), Texts{});
    WriteWhole(BitmapPath(), "abcd");
    volume = Look();
    EXPECT_EQ(volume.bitmapBytes, 4U);
    EXPECT_EQ(volume.marked, (BlockSet{'a', 'b', 'c'}));
    EXPECT_EQ(TextsOf(errors_),
              Texts{BitmapPath() +
                    ": longer than the cache device's bitmap: nothing can be pinned or unpinned"});
}

TEST_F(VolumeLookTest, WhatIsNoBitmapFileLeavesTheMarksUnknown) {
    const std::string outside = folder_.FileMake("outside", "\xFF");
    ASSERT_EQ(symlink(outside.c_str(), BitmapPath().c_str()), 0);
    EXPECT_EQ(Look().marked, std::nullopt);
    EXPECT_EQ(TextsOf(errors_),
              (Texts{BitmapPath() + ": Can't open bitmap file (" + BitmapPath() + ")", "unknown"}));
    unlink(BitmapPath().c_str());
    ASSERT_EQ(mkfifo(BitmapPath().c_str(), 0600), 0);
    EXPECT_EQ(Look().marked, std::nullopt);
    EXPECT_TRUE(errors_.isUnknown);
    unlink(BitmapPath().c_str());
    std::filesystem::create_directory(BitmapPath());
    EXPECT_EQ(Look().marked, std::nullopt);
    EXPECT_TRUE(errors_.isUnknown);
}

TEST_F(VolumeLookTest, TheSsdsSizeIsTheDevicesOwnWordOrThatOfItsFile) {
    EXPECT_EQ(Look().ssdBlocks, 5U); // whole ones
    FakeAppliance::caches[0].ssdPath = "/dev/null";
    EXPECT_EQ(Look().ssdBlocks, 29U); // a device's, as it is answered here
    FakeAppliance::caches[0].ssdPath = folder_.Path("gone");
    EXPECT_EQ(Look().ssdBlocks, std::nullopt);
    EXPECT_EQ(TextsOf(errors_), Texts{});
    FakeAppliance::caches[0].ssdPath = "/dev/null";
    refused_ = {BLKGETSIZE64};
    EXPECT_EQ(Look().ssdBlocks, std::nullopt);
    EXPECT_EQ(TextsOf(errors_),
              (Texts{device_ + ": Can't get size of device (" + device_ + ")", "unknown"}));
}

TEST_F(VolumeLookTest, AVolumeWithoutACacheIsNotAskedForMore) {
    FakeAppliance::caches.clear();
    const Volume volume = Look();
    EXPECT_FALSE(volume.hasCache);
    EXPECT_EQ(volume.uuid, "uuid-1");
    EXPECT_EQ(volume.ssd, std::nullopt);
    EXPECT_EQ(volume.held, std::nullopt);
    EXPECT_EQ(volume.marked, std::nullopt);
    EXPECT_EQ(TextsOf(errors_), Texts{});
}

TEST_F(VolumeLookTest, AListOfCachesThatCannotBeReadIsNotTakenForANo) {
    FakeAppliance::configResult = -1;
    const Volume volume = Look();
    EXPECT_TRUE(volume.hasCache);
    EXPECT_EQ(volume.ssd, std::nullopt);
    EXPECT_EQ(volume.supportsPin, std::nullopt);
    EXPECT_EQ(volume.marked, std::nullopt);
    EXPECT_EQ(TextsOf(errors_), (Texts{mountPath_ + ": Fail to get SSD cache config", "unknown"}));
}

TEST_F(VolumeLookTest, ACacheWithoutAnSsdIsToldOf) {
    FakeAppliance::caches[0].noSsdPath = true;
    const Volume volume = Look();
    EXPECT_TRUE(volume.hasCache);
    EXPECT_EQ(volume.marked, std::nullopt);
    EXPECT_EQ(TextsOf(errors_),
              (Texts{mountPath_ + ": the list of caches names no SSD of its cache", "unknown"}));
}

TEST_F(VolumeLookTest, ACacheWhoseDeviceIsNotThereIsToldOf) {
    FakeAppliance::caches[0].cachePathResult = 0;
    const Volume volume = Look();
    EXPECT_TRUE(volume.hasCache);
    EXPECT_EQ(volume.ssd, ssd_);
    EXPECT_EQ(volume.cacheDevice, std::nullopt);
    EXPECT_EQ(volume.ssdBlocks, std::nullopt);
    EXPECT_EQ(TextsOf(errors_), (Texts{mountPath_ + ": Can't get cache path", "unknown"}));
}

TEST_F(VolumeLookTest, ADeviceThatIsGoneLeavesNumbersUnknownAndNothingMarked) {
    WriteWhole(BitmapPath(), "\x81");
    std::filesystem::remove(device_);
    const Volume volume = Look();
    EXPECT_EQ(volume.deviceBytes, std::nullopt);
    EXPECT_EQ(volume.bitmapBytesNeeded, std::nullopt);
    EXPECT_EQ(volume.bitmapBytes, 1U);
    EXPECT_EQ(volume.marked, std::nullopt);
    EXPECT_EQ(volume.driverHasBitmap, std::nullopt);
    EXPECT_EQ(volume.supportsPin, true);
    EXPECT_EQ(
        TextsOf(errors_),
        (Texts{device_ + ": Can't open device (" + device_ + ")",
               device_ + ": Open device path (" + device_ + ") error: Ioctl error", "unknown"}));
}

TEST_F(VolumeLookTest, ADriverThatRefusesAQuestionLeavesThatAnswerUnknown) {
    refused_ = {kPinIoctlQueryBitmapSet};
    Volume volume = Look();
    EXPECT_EQ(volume.driverHasBitmap, std::nullopt);
    EXPECT_EQ(volume.allUnpinned, false);
    EXPECT_EQ(volume.deviceBytes, deviceBytes_);
    ASSERT_EQ(errors_.list.size(), 1U);
    EXPECT_EQ(errors_.list[0].path, device_);
    EXPECT_EQ(errors_.list[0].text.compare(0, 12, "Ioctl Error:"), 0) << errors_.list[0].text;
    EXPECT_TRUE(errors_.isUnknown);
    refused_ = {kPinIoctlQueryAllUnpinned};
    volume = Look();
    EXPECT_EQ(volume.driverHasBitmap, true);
    EXPECT_EQ(volume.allUnpinned, std::nullopt);
    EXPECT_TRUE(errors_.isUnknown);
}

TEST_F(VolumeLookTest, ACacheThatCannotPinIsNotAskedForPins) {
    FakeAppliance::caches[0].supportPin = 0;
    refused_ = {kPinIoctlQueryBitmapSet, kPinIoctlQueryAllUnpinned};
    const Volume volume = Look();
    EXPECT_EQ(volume.supportsPin, false);
    EXPECT_EQ(volume.driverHasBitmap, std::nullopt);
    EXPECT_EQ(volume.allUnpinned, std::nullopt);
    EXPECT_EQ(volume.deviceBytes, deviceBytes_);
    EXPECT_EQ(TextsOf(errors_), Texts{});
}

TEST_F(VolumeLookTest, WhoMayNotOpenTheDeviceIsToldSoOnceAndKeepsTheRest) {
    if (geteuid() != 0) {
        GTEST_SKIP() << "acting for another user needs root";
    }
    WriteWhole(BitmapPath(), "\x81");
    WriteWhole(device_ + ".json", R"({"slots": 4096})");
    chmod(folder_.Path().c_str(), 0755);
    chmod(device_.c_str(), 0600);
    const WhollyOrdinaryUser user;
    const Volume volume = Look();
    EXPECT_EQ(volume.supportsPin, std::nullopt);
    EXPECT_EQ(volume.deviceBytes, std::nullopt);
    EXPECT_EQ(volume.driverHasBitmap, std::nullopt);
    EXPECT_EQ(volume.ssdBlocks, 4096U);
    EXPECT_EQ(volume.bitmapBytes, 1U);
    EXPECT_EQ(volume.marked, std::nullopt);
    EXPECT_EQ(TextsOf(errors_), (Texts{device_ + ": Permission denied", "unknown"}));
}

TEST_F(VolumeLookTest, WithoutAUuidThereIsNoCacheUnlessItMayNotBeRead) {
    errors_ = {};
    const std::string space = folder_.FileMake("space", "");
    Volume volume = VolumeLook({mountPath_, space, ""}, &errors_);
    EXPECT_FALSE(volume.hasCache);
    EXPECT_EQ(volume.uuid, std::nullopt);
    EXPECT_TRUE(volume.isMounted);
    volume = VolumeLook({mountPath_, folder_.Path("gone"), ""}, &errors_);
    EXPECT_FALSE(volume.hasCache);
    EXPECT_EQ(TextsOf(errors_),
              (Texts{mountPath_ + ": its UUID cannot be read from " + space,
                     mountPath_ + ": its UUID cannot be read from " + folder_.Path("gone")}));
    if (geteuid() != 0) {
        GTEST_SKIP() << "acting for another user needs root";
    }
    chmod(folder_.Path().c_str(), 0755);
    chmod(space.c_str(), 0600);
    const WhollyOrdinaryUser user;
    errors_ = {};
    volume = VolumeLook({mountPath_, space, ""}, &errors_);
    EXPECT_TRUE(volume.hasCache);
    EXPECT_EQ(TextsOf(errors_),
              (Texts{mountPath_ + ": its UUID cannot be read from " + space, "unknown"}));
}

TEST(VolumePathTest, LiesBelowTheMountPath) {
    EXPECT_EQ(VolumePath("/volume1", "a/b"), "/volume1/a/b");
    EXPECT_EQ(VolumePath("/volume1", ""), "/volume1");
    EXPECT_EQ(VolumePath("/", "a/b"), "/a/b");
    EXPECT_EQ(VolumePath("/", ""), "/");
}

TEST_F(VolumeLookTest, AHeldVolumeHasANote) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    EXPECT_EQ(VolumeHoldNote("uuid-1"), "/run/veskpin/uuid-1.hold");
    std::filesystem::create_directories("/run/veskpin");
    WriteWhole(VolumeHoldNote("uuid-2"), "");
    EXPECT_EQ(Look().held, false);
    WriteWhole(VolumeHoldNote("uuid-1"), "");
    EXPECT_EQ(Look().held, true);
    std::filesystem::remove_all("/run/veskpin");
    WriteWhole("/run/veskpin", ""); // no folder: no note
    EXPECT_EQ(Look().held, false);
    std::filesystem::remove("/run/veskpin");
}

TEST_F(VolumeLookTest, ANoteThatCannotBeLookedForLeavesItUnknown) {
    FakeLibc::Count("stat");
    EXPECT_EQ(Look().held, false);
    const int last = FakeLibc::Calls("stat");
    FakeLibc::Fail("stat", EIO, last);
    EXPECT_EQ(Look().held, std::nullopt);
    EXPECT_EQ(TextsOf(errors_), (Texts{"/run/veskpin/uuid-1.hold: Input/output error", "unknown"}));
}

TEST_F(VolumeLookTest, WhatWasLoggedBeforeIsNobodysCause) {
    LogError("an older failure");
    FakeAppliance::caches[0].cachePathResult = 0;
    Look();
    EXPECT_EQ(TextsOf(errors_), (Texts{mountPath_ + ": Can't get cache path", "unknown"}));
    EXPECT_EQ(LookLogTake("none"), "none");
}

TEST_F(VolumeLookTest, ACacheThatDoesNotTellItsStateIsNoCacheThatCannotPin) {
    FakeCache &cache = FakeAppliance::caches[0];
    const auto expectUnknown = [this] {
        const Volume volume = Look();
        EXPECT_EQ(volume.supportsPin, std::nullopt);
        EXPECT_EQ(volume.deviceBytes, deviceBytes_);
        EXPECT_EQ(TextsOf(errors_),
                  (Texts{device_ + ": the cache does not tell its state", "unknown"}));
    };
    cache.state = 0;
    expectUnknown();
    cache.state = 1;
    cache.statResult = -1;
    expectUnknown();
    cache.statResult = 1;
    cache.supportPin = 0; // and the driver answers all the same
    expectUnknown();
}

TEST_F(VolumeLookTest, ABitmapFileWhoseSizeCannotBeHadIsToldOf) {
    WriteWhole(BitmapPath(), "\x81");
    FakeLibc::Count("stat");
    Look();
    const int calls = FakeLibc::Calls("stat");
    bool isTold = false;
    for (int i = 1; i <= calls; ++i) {
        FakeLibc::Fail("stat", EIO, i);
        const Volume volume = Look();
        isTold = isTold || (!errors_.list.empty() && !volume.bitmapBytes);
        EXPECT_TRUE(volume.bitmapBytes || !errors_.list.empty()) << i;
        EXPECT_TRUE(volume.marked == BlockSet({0x81, 0, 0}) || errors_.isUnknown) << i;
    }
    EXPECT_TRUE(isTold);
}

// Memory that runs out at any of the texts: an exception or an answer that is told as unknown, and
// never a "no".
TEST_F(VolumeLookTest, ALackOfMemoryIsNeverANo) {
    FakeLibc::Count("strdup");
    Look();
    const int copies = FakeLibc::Calls("strdup");
    ASSERT_GT(copies, 3);
    for (int i = 1; i <= copies; ++i) {
        FakeLibc::Fail("strdup", ENOMEM, i);
        try {
            const Volume volume = Look();
            EXPECT_TRUE(volume.hasCache) << i;
            EXPECT_TRUE(volume.supportsPin != false) << i;
            EXPECT_TRUE(errors_.isUnknown || volume.marked) << i;
        } catch (const std::bad_alloc &) {
        }
    }
}
} // namespace vesk
