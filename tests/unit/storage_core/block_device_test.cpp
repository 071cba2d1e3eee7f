#include "storage_core/block_device.h"

#include "tests/support/test_volume.h"

#include <gtest/gtest.h>

#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

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
    EXPECT_EQ(BlockDeviceProbe(volume->device, "TYPE"), "ext4");
    EXPECT_EQ(BlockDeviceProbe(volume->device, "UUID"), volume->uuid);
    EXPECT_EQ(BlockDeviceProbe(volume->device, "NO_SUCH_VALUE"), "");
    EXPECT_EQ(BlockDeviceProbe("/nonexistent", "UUID"), "");
    EXPECT_EQ(BlockDeviceProbe("", "UUID"), "");
}
} // namespace
} // namespace vesk
