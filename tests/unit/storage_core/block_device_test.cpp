#include "storage_core/block_device.h"

#include "tests/support/test_volume.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <linux/fs.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

namespace vesk {
namespace {
class BlockDevice : public testing::Test {
protected:
    static void SetUpTestSuite() { volume = new TestVolume("blockdev", kMakeExt4, kExt4Bytes); }
    static void TearDownTestSuite() {
        delete volume;
        volume = nullptr;
    }
    void SetUp() override {
        if (!volume->skipReason.empty()) {
            GTEST_SKIP() << volume->skipReason;
        }
        number = BlockDeviceNumber(volume->device);
        ASSERT_NE(number, 0U);
    }

    static MountEntry Mount(const std::string &type, dev_t device, const std::string &source) {
        MountEntry mount;
        mount.type = type;
        mount.device = device;
        mount.source = source;
        return mount;
    }

    static TestVolume *volume;
    dev_t number = 0;
};

TestVolume *BlockDevice::volume = nullptr;

TEST_F(BlockDevice, NumberIsTheMountedFilesystems) {
    struct stat status = {};
    ASSERT_EQ(stat(volume->mountPath.c_str(), &status), 0);
    EXPECT_EQ(number, status.st_dev);
    EXPECT_EQ(BlockDeviceNumber("/dev/null"), 0U) << "a character device";
    EXPECT_EQ(BlockDeviceNumber(volume->imagePath), 0U) << "a regular file";
    EXPECT_EQ(BlockDeviceNumber("/nonexistent"), 0U);
    EXPECT_EQ(BlockDeviceNumber(""), 0U);
}

TEST_F(BlockDevice, PathByNumber) {
    EXPECT_EQ(BlockDeviceByNumber(number), volume->device);
    EXPECT_EQ(BlockDeviceByNumber(makedev(4000, 77)), "");
    EXPECT_EQ(BlockDeviceByNumber(0), "");
}

TEST_F(BlockDevice, SourceThatNamesTheDeviceIsKept) {
    EXPECT_EQ(BlockDeviceOfMount(Mount("ext4", number, volume->device)), volume->device);
    const std::string link = "/mnt/link to device";
    ASSERT_EQ(symlink(volume->device.c_str(), link.c_str()), 0);
    EXPECT_EQ(BlockDeviceOfMount(Mount("ext4", number, link)), link);
    ASSERT_EQ(unlink(link.c_str()), 0);
}

TEST_F(BlockDevice, OtherSourcesAreResolvedByNumber) {
    EXPECT_EQ(BlockDeviceOfMount(Mount("ext4", number, "/dev/root")), volume->device);
    EXPECT_EQ(BlockDeviceOfMount(Mount("ext4", number, "")), volume->device);
    // A node of another device, left over from another namespace.
    const std::string node = "/mnt/other node";
    ASSERT_EQ(mknod(node.c_str(), S_IFBLK | 0600, makedev(259, 1000)), 0);
    EXPECT_EQ(BlockDeviceOfMount(Mount("ext4", number, node)), volume->device);
    ASSERT_EQ(unlink(node.c_str()), 0);
}

TEST_F(BlockDevice, FilesystemsWithoutADeviceHaveNone) {
    EXPECT_EQ(BlockDeviceOfMount(Mount("tmpfs", makedev(0, 25), "tmpfs")), "");
    EXPECT_EQ(BlockDeviceOfMount(Mount("tmpfs", makedev(0, 25), volume->device)), "");
    EXPECT_EQ(BlockDeviceOfMount(Mount("btrfs", makedev(0, 40), volume->device)), volume->device);
    EXPECT_EQ(BlockDeviceOfMount(Mount("btrfs", makedev(0, 40), "/dev/gone")), "");
}

TEST_F(BlockDevice, RelativeSourceIsNoPath) {
    const std::string name = "relative-node";
    ASSERT_EQ(mknod(("/mnt/" + name).c_str(), S_IFBLK | 0600, number), 0);
    ASSERT_EQ(chdir("/mnt"), 0);
    EXPECT_EQ(BlockDeviceOfMount(Mount("btrfs", makedev(0, 40), name)), "");
    ASSERT_EQ(chdir("/"), 0);
    ASSERT_EQ(unlink(("/mnt/" + name).c_str()), 0);
}

TEST_F(BlockDevice, ProbeTellsTypeAndUuid) {
    for (const char *mountType : {"", "ext4", "ext3", "ext2"}) {
        EXPECT_EQ(BlockDeviceProbe(volume->device, "TYPE", mountType), "ext4") << mountType;
        EXPECT_EQ(BlockDeviceProbe(volume->device, "UUID", mountType), volume->uuid) << mountType;
        EXPECT_EQ(BlockDeviceProbe(volume->device, "NO_SUCH_VALUE", mountType), "") << mountType;
        EXPECT_EQ(BlockDeviceProbe("/nonexistent", "UUID", mountType), "") << mountType;
        EXPECT_EQ(BlockDeviceProbe("", "UUID", mountType), "") << mountType;
    }
    for (const char *mountType : {"xfs", "vfat", "fuseblk", "autofs", "ext4dev", "ext"}) {
        EXPECT_EQ(BlockDeviceProbe(volume->device, "UUID", mountType), "") << mountType;
    }
}

// Bytes as files of the volume may bring them to these places.
class ForeignSignature : public BlockDevice {
protected:
    void Put(const std::string &bytes, uint64_t offset) {
        std::fstream image(volume->imagePath, std::ios::in | std::ios::out | std::ios::binary);
        image.seekp(static_cast<std::streamoff>(offset));
        image << bytes;
        image.close();
        ASSERT_TRUE(image.good());
        const ScopedFd fd(open(volume->device.c_str(), O_RDONLY | O_CLOEXEC));
        ASSERT_EQ(ioctl(fd.Get(), BLKFLSBUF), 0);
    }
    void TearDown() override {
        if (volume->skipReason.empty()) {
            Put(std::string(kRaidEnd - kRaidPlace, '\0'), kRaidPlace);
            Put(std::string(8, '\0'), kBtrfsMagicPlace);
        }
    }
    std::string Uuid(const char *mountType) const {
        return BlockDeviceProbe(volume->device, "UUID", mountType);
    }
    // A RAID's superblock, version 0.90: magic number and version, then the first part of its UUID.
    static std::string Raid() {
        return std::string("\xfc\x4e\x2b\xa9\0\0\0\0\x5a\0\0\0\0\0\0\0\0\0\0\0uuid", 24);
    }
    static constexpr uint64_t kRaidPlace = kExt4Bytes - 65536;
    static constexpr uint64_t kRaidEnd = kRaidPlace + 4096;
    static constexpr uint64_t kBtrfsMagicPlace = 65536 + 64;
};

TEST_F(ForeignSignature, OfARaidChangesNothingOfAMountedFilesystem) {
    Put(Raid(), kRaidPlace);
    EXPECT_EQ(BlockDeviceProbe(volume->device, "TYPE", ""), "linux_raid_member");
    EXPECT_NE(Uuid(""), volume->uuid);
    EXPECT_EQ(Uuid("ext4"), volume->uuid);
    EXPECT_EQ(BlockDeviceProbe(volume->device, "TYPE", "ext4"), "ext4");
}

TEST_F(ForeignSignature, OfAnotherFilesystemChangesNothingOfAMountedOne) {
    Put("_BHRfS_M", kBtrfsMagicPlace);
    EXPECT_EQ(Uuid(""), "") << "two contradict each other";
    EXPECT_EQ(Uuid("ext4"), volume->uuid);
}

// A folder as the kernel describes devices in, by number.
class BlockDeviceOffset : public testing::Test {
protected:
    bool HasOffset(const std::string &file = "", const std::string &text = "") {
        std::filesystem::remove_all(folder.Path("7:3"));
        std::filesystem::create_directories(folder.Path("7:3/loop"));
        std::filesystem::create_directories(folder.Path("7:3/dm"));
        if (!file.empty()) {
            folder.FileMake("7:3/" + file, text + "\n");
        }
        return BlockDeviceHasOffset(makedev(7, 3), folder.Path());
    }
    TestFolder folder;
};

TEST_F(BlockDeviceOffset, WholeDevicesHaveNone) {
    EXPECT_FALSE(HasOffset());
    EXPECT_FALSE(HasOffset("loop/offset", "0"));
    EXPECT_FALSE(HasOffset("loop/backing_file", "/run/vesk/cachedev_0"));
    EXPECT_FALSE(HasOffset("dm/uuid", ""));
    EXPECT_FALSE(HasOffset("dm/uuid", "FLASHCACHE-1"));
}

TEST_F(BlockDeviceOffset, WhatIsNotKnownHasOne) {
    EXPECT_TRUE(BlockDeviceHasOffset(makedev(7, 9), folder.Path()));
    EXPECT_TRUE(BlockDeviceHasOffset(makedev(7, 9), folder.Path("no")));
}

TEST_F(BlockDeviceOffset, PartsAndTranslationsOfOthersHaveOne) {
    EXPECT_TRUE(HasOffset("partition", "1"));
    EXPECT_TRUE(HasOffset("loop/offset", "1048576"));
    EXPECT_TRUE(HasOffset("md", ""));
    EXPECT_TRUE(HasOffset("bcache", ""));
    EXPECT_TRUE(HasOffset("dm/uuid", "LVM-x"));
    EXPECT_TRUE(HasOffset("dm/uuid", "CRYPT-LUKS2-x"));
    EXPECT_TRUE(HasOffset("dm/uuid", "part1-mpath-x"));
}

TEST_F(BlockDevice, OffsetOfTheDeviceBelowCounts) {
    const TestFolder folder;
    const std::string below = std::to_string(major(number)) + ":" + std::to_string(minor(number));
    std::filesystem::create_directories(folder.Path("7:300/loop"));
    std::filesystem::create_directories(folder.Path(below + "/loop"));
    folder.FileMake("7:300/loop/backing_file", volume->device + "\n");
    EXPECT_FALSE(BlockDeviceHasOffset(makedev(7, 300), folder.Path()));
    folder.FileMake(below + "/loop/offset", "512\n");
    EXPECT_TRUE(BlockDeviceHasOffset(makedev(7, 300), folder.Path()));
}

TEST_F(BlockDevice, LoopDeviceOverAFileHasNoOffset) {
    EXPECT_FALSE(BlockDeviceHasOffset(number));
}
} // namespace
} // namespace vesk
