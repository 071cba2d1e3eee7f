#include "base/malloc_text.h"
#include "tests/support/test_volume.h"
#include "vesk/storage_core.h"

#include <gtest/gtest.h>

#include <fcntl.h>

#include <cstring>

namespace vesk {
namespace {
// The UUID of the space on this device, "(null)" where there is none.
std::string UuidOf(const std::string &devicePath) {
    VESKSpaceInfo space = {};
    devicePath.copy(space.devicePath, sizeof(space.devicePath) - 1);
    const MallocText uuid(VESKSpaceUUIDGet(&space));
    return uuid == nullptr ? "(null)" : uuid.get();
}

TEST(VESKSpaceUUIDGet, IsTheFilesystems) {
    const TestVolume ext4("ext4", kMakeExt4, kExt4Bytes);
    const TestVolume xfs("xfs", kMakeXfs, kXfsBytes);
    for (const TestVolume *volume : {&ext4, &xfs}) {
        if (!volume->skipReason.empty()) {
            GTEST_SKIP() << volume->skipReason;
        }
    }
    EXPECT_EQ(UuidOf(ext4.device), ext4.uuid);
    EXPECT_EQ(UuidOf(xfs.device), xfs.uuid);
}

TEST(VESKSpaceUUIDGet, IsTheFilesystemsOfABtrfs) {
    const TestVolume btrfs("uuid-btrfs", kMakeBtrfs, kBtrfsBytes);
    if (!btrfs.skipReason.empty()) {
        GTEST_SKIP() << btrfs.skipReason;
    }
    EXPECT_EQ(UuidOf(btrfs.device), btrfs.uuid);
}

TEST(VESKSpaceUUIDGet, NullOfWhatIsNotMountedAnyMore) {
    TestVolume volume("uuid-unmounted", kMakeExt4, kExt4Bytes);
    if (!volume.skipReason.empty()) {
        GTEST_SKIP() << volume.skipReason;
    }
    const std::string path = volume.device;
    const ScopedFd held(open(path.c_str(), O_RDONLY | O_CLOEXEC));
    ASSERT_TRUE(held.IsOpen());
    EXPECT_EQ(UuidOf(path), volume.uuid);
    volume.Unmount();
    EXPECT_EQ(UuidOf(path), "(null)");
}

TEST(VESKSpaceUUIDGet, NullWithoutAFilesystem) {
    const TestFolder folder;
    EXPECT_EQ(UuidOf(folder.FileMake("zeros", std::string(1000000, '\0'))), "(null)");
    EXPECT_EQ(UuidOf("/nonexistent"), "(null)");
    EXPECT_EQ(UuidOf(""), "(null)");
    EXPECT_EQ(VESKSpaceUUIDGet(nullptr), nullptr);
}

TEST(VESKSpaceUUIDGet, PathFieldWithoutNulStaysInBounds) {
    VESKSpaceInfo space = {};
    std::memset(space.devicePath, 'x', sizeof(space.devicePath));
    std::memset(space.referencePath, 'y', sizeof(space.referencePath));
    EXPECT_EQ(VESKSpaceUUIDGet(&space), nullptr);
}
} // namespace
} // namespace vesk
