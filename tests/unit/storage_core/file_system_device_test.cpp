#include "storage_core/mount_table.h"

#include "tests/support/test_volume.h"
#include "vesk/storage_core.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <memory>

namespace vesk {
namespace {
MountEntry Mount(const std::string &type, const std::string &options) {
    MountEntry mount;
    mount.type = type;
    mount.options = options;
    return mount;
}

TEST(FileSystemIsMappable, ExtAndXfs) {
    for (const char *type : {"ext2", "ext3", "ext4", "xfs"}) {
        EXPECT_TRUE(FileSystemIsMappable(Mount(type, "rw"))) << type;
    }
    for (const char *type : {"btrfs", "fuseblk", "vfat", "squashfs", "ext", "ext4dev", ""}) {
        EXPECT_FALSE(FileSystemIsMappable(Mount(type, "rw"))) << type;
    }
}

TEST(FileSystemIsMappable, NotWithARealtimeDevice) {
    EXPECT_FALSE(FileSystemIsMappable(Mount("xfs", "rw,attr2,rtdev=/dev/sdc,noquota")));
    EXPECT_TRUE(FileSystemIsMappable(Mount("xfs", "rw,logdev=/dev/sdc")));
}

using DevicePointer = std::unique_ptr<FileSystemDevice>;

// One ext4 filesystem for all tests.
class FileSystem : public testing::Test {
protected:
    static void SetUpTestSuite() { ext4 = new TestVolume("device-ext4", kMakeExt4, kExt4Bytes); }
    static void TearDownTestSuite() {
        delete ext4;
        ext4 = nullptr;
    }
    void SetUp() override {
        if (!ext4->skipReason.empty()) {
            GTEST_SKIP() << ext4->skipReason;
        }
        device.reset(FileSystemDeviceCreater::Create(ext4->device));
        ASSERT_NE(device, nullptr);
    }

    static TestVolume *ext4;
    DevicePointer device;
};

TestVolume *FileSystem::ext4 = nullptr;

TEST_F(FileSystem, DevicePathOfFiles) {
    const TestFile file(ext4->mountPath + "/file");
    std::string path = "old";
    EXPECT_EQ(FileSystemDevice::GetDevicePath(file.path, path, false), 0);
    EXPECT_EQ(path, ext4->device);
    EXPECT_EQ(FileSystemDevice::GetDevicePath(ext4->mountPath, path, false), 0);
    EXPECT_EQ(path, ext4->device);

    // Through a symbolic link, and at another place of the tree.
    const std::string link = "/mnt/link";
    std::filesystem::create_symlink(file.path, link);
    path.clear();
    EXPECT_EQ(FileSystemDevice::GetDevicePath(link, path, false), 0);
    EXPECT_EQ(path, ext4->device);
    std::filesystem::remove(link);
    std::filesystem::create_directories("/mnt/bound");
    ASSERT_EQ(mount(ext4->mountPath.c_str(), "/mnt/bound", nullptr, MS_BIND, nullptr), 0);
    path.clear();
    EXPECT_EQ(FileSystemDevice::GetDevicePath("/mnt/bound/file", path, false), 0);
    EXPECT_EQ(path, ext4->device);
    ASSERT_EQ(umount2("/mnt/bound", 0), 0);
}

// A working directory outlives its mount's entry in the table.
TEST_F(FileSystem, DevicePathOfAMountThatIsNotInTheTable) {
    const TestVolume other("detached", kMakeExt4, kExt4Bytes);
    ASSERT_EQ(other.skipReason, "");
    const TestFile file(other.mountPath + "/file"); // keeps the filesystem and the loop device
    ASSERT_EQ(chdir(other.mountPath.c_str()), 0);
    ASSERT_EQ(umount2(other.mountPath.c_str(), MNT_DETACH), 0);
    std::string path;
    EXPECT_EQ(FileSystemDevice::GetDevicePath("file", path, false), 0);
    EXPECT_EQ(path, other.device);
    // The volume takes its mount away itself.
    ASSERT_EQ(mount(other.device.c_str(), other.mountPath.c_str(), "ext4", 0, nullptr), 0);
    ASSERT_EQ(chdir("/"), 0);
}

TEST_F(FileSystem, NoDevicePath) {
    std::string path = "old";
    EXPECT_EQ(FileSystemDevice::GetDevicePath("/proc/self/status", path, false), 1);
    EXPECT_EQ(FileSystemDevice::GetDevicePath(kWorldPath, path, false), 1) << "a tmpfs";
    EXPECT_EQ(FileSystemDevice::GetDevicePath("/dev/null", path, false), 1);
    EXPECT_EQ(FileSystemDevice::GetDevicePath(ext4->mountPath + "/missing", path, false), -1);
    EXPECT_EQ(FileSystemDevice::GetDevicePath("", path, false), -1);
    ASSERT_EQ(mount("none", "/proc", "tmpfs", 0, nullptr), 0);
    const int withoutTable = FileSystemDevice::GetDevicePath(ext4->mountPath, path, false);
    ASSERT_EQ(umount2("/proc", 0), 0);
    EXPECT_EQ(withoutTable, -1);
    EXPECT_EQ(path, "old");
}

TEST_F(FileSystem, Btrfs) {
    const TestVolume btrfs("device-btrfs", kMakeBtrfs, kBtrfsBytes);
    if (!btrfs.skipReason.empty()) {
        GTEST_SKIP() << btrfs.skipReason;
    }
    std::string output;
    ASSERT_EQ(CommandRun({"btrfs", "subvolume", "create", btrfs.mountPath + "/sub"}, output), 0)
        << output;
    for (const char *name : {"/file", "/sub/file"}) {
        const TestFile file(btrfs.mountPath + name);
        std::string path;
        EXPECT_EQ(FileSystemDevice::GetDevicePath(file.path, path, false), 0) << name;
        EXPECT_EQ(path, btrfs.device) << name;
    }
    EXPECT_EQ(DevicePointer(FileSystemDeviceCreater::Create(btrfs.device)), nullptr);
}

TEST_F(FileSystem, CreateRefusesWhatIsNoUsableDevice) {
    EXPECT_EQ(DevicePointer(FileSystemDeviceCreater::Create("")), nullptr);
    EXPECT_EQ(DevicePointer(FileSystemDeviceCreater::Create("/nonexistent")), nullptr);
    EXPECT_EQ(DevicePointer(FileSystemDeviceCreater::Create("/dev/null")), nullptr);
    EXPECT_EQ(DevicePointer(FileSystemDeviceCreater::Create(ext4->imagePath)), nullptr);
}

// The loop device stays while it is held open, though its filesystem is not mounted any more.
TEST_F(FileSystem, CreateOnUnmountedDevices) {
    const struct {
        const char *name;
        const char *mkfs;
        uint64_t bytes;
        bool isUsable;
    } kinds[] = {{"unmounted-xfs", kMakeXfs, kXfsBytes, true},
                 {"unmounted-ext2", "mke2fs -q -t ext2 -F -U %UUID%", kExt4Bytes, true},
                 {"unmounted-btrfs", kMakeBtrfs, kBtrfsBytes, false}};
    for (const auto &kind : kinds) {
        TestVolume volume(kind.name, kind.mkfs, kind.bytes);
        if (!volume.skipReason.empty()) {
            GTEST_SKIP() << volume.skipReason;
        }
        const std::string path = volume.device;
        const ScopedFd held(open(path.c_str(), O_RDONLY | O_CLOEXEC));
        ASSERT_TRUE(held.IsOpen());
        volume.Unmount();
        const DevicePointer created(FileSystemDeviceCreater::Create(path));
        EXPECT_EQ(created != nullptr, kind.isUsable) << kind.name;
    }
}

TEST_F(FileSystem, MapsAFile) {
    TestFile file(ext4->mountPath + "/mapped");
    file.Write(0, 262144); // which the kernel would give a place some seconds later
    FileMappingTable table;
    table.entries.resize(3);
    EXPECT_EQ(device->GetMappingByInode(ext4->mountPath, file.Inode(), table), 0);
    ASSERT_FALSE(table.entries.empty());
    EXPECT_EQ(table.entries[0].fileStartSector, 0U);
    EXPECT_NE(table.entries[0].deviceStartSector, 0U);
    EXPECT_EQ(device->GetMappingByInode(ext4->mountPath + "/", file.Inode(), table), 0);
    EXPECT_FALSE(table.entries.empty());
    EXPECT_EQ(device->Reserved(), 0);
}

TEST_F(FileSystem, EmptyFileHasAnEmptyTable) {
    const TestFile file(ext4->mountPath + "/empty");
    FileMappingTable table;
    table.entries.resize(3);
    EXPECT_EQ(device->GetMappingByInode(ext4->mountPath, file.Inode(), table), 0);
    EXPECT_TRUE(table.entries.empty());
}

TEST_F(FileSystem, FailuresLeaveAnEmptyTable) {
    const std::string directory = ext4->mountPath + "/directory";
    std::filesystem::create_directory(directory);
    struct stat status = {};
    ASSERT_EQ(stat(directory.c_str(), &status), 0);
    const TestFile file(ext4->mountPath + "/file");
    const struct {
        std::string directory;
        uint64_t inode;
    } cases[] = {{ext4->mountPath, 0xFFFFFFF0}, {ext4->mountPath, status.st_ino},
                 {directory, file.Inode()},     {ext4->mountPath + "/missing", file.Inode()},
                 {file.path, file.Inode()},     {"", file.Inode()}};
    for (const auto &failing : cases) {
        FileMappingTable table;
        table.entries.resize(3);
        EXPECT_LT(device->GetMappingByInode(failing.directory, failing.inode, table), 0)
            << failing.directory << " " << failing.inode;
        EXPECT_TRUE(table.entries.empty());
    }
}

TEST_F(FileSystem, RefusesAFileOfAnotherDevice) {
    const TestVolume xfs("device-xfs", kMakeXfs, kXfsBytes);
    if (!xfs.skipReason.empty()) {
        GTEST_SKIP() << xfs.skipReason;
    }
    TestFile file(xfs.mountPath + "/file");
    file.Write(0, 4096);
    file.Sync();
    FileMappingTable table;
    EXPECT_LT(device->GetMappingByInode(xfs.mountPath, file.Inode(), table), 0);
    EXPECT_TRUE(table.entries.empty());
    const DevicePointer own(FileSystemDeviceCreater::Create(xfs.device));
    ASSERT_NE(own, nullptr);
    EXPECT_EQ(own->GetMappingByInode(xfs.mountPath, file.Inode(), table), 0);
    EXPECT_EQ(table.entries.size(), 1U);
}
} // namespace
} // namespace vesk
