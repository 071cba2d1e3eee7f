#include "storage_core/mount_table.h"

#include "tests/support/test_volume.h"

#include <gtest/gtest.h>

#include <sys/sysmacros.h>

namespace vesk {
namespace {
// The table that this text gives.
std::vector<MountEntry> TableOf(const std::string &text) {
    const TestFolder folder;
    std::vector<MountEntry> entries;
    EXPECT_TRUE(MountTableRead(folder.FileMake("mountinfo", text).c_str(), entries));
    return entries;
}

constexpr char kTable[] =
    "22 27 0:21 / /proc rw,relatime - proc proc rw\n"
    "27 1 254:0 / / rw,relatime - ext4 /dev/vda rw,discard\n"
    "28 27 0:50 / /home rw,relatime shared:1 - autofs systemd-1 rw,fd=29\n"
    "29 28 254:1 / /home rw,relatime shared:2 - xfs /dev/vdb rw,attr2\n"
    "30 27 254:2 /sub\\040dir /volume\\0401\\011a\\134b rw - ext4 /dev/disk/by\\040label rw\n"
    "31 27 0:40 /@ /data rw - btrfs /dev/vdc rw,subvolid=256,subvol=/@\n"
    "32 31 0:60 / /data/tmp rw - tmpfs tmpfs rw\n"
    "33 32 0:61 / /data/tmp rw - tmpfs tmpfs2 rw\n";

TEST(MountTable, ReadsEveryFieldDecoded) {
    const std::vector<MountEntry> entries = TableOf(kTable);
    ASSERT_EQ(entries.size(), 8U);
    const MountEntry &entry = entries[4];
    EXPECT_EQ(entry.id, 30);
    EXPECT_EQ(entry.parentId, 27);
    EXPECT_EQ(entry.device, makedev(254, 2));
    EXPECT_EQ(entry.root, "/sub dir");
    EXPECT_EQ(entry.target, "/volume 1\ta\\b");
    EXPECT_EQ(entry.type, "ext4");
    EXPECT_EQ(entry.source, "/dev/disk/by label");
    EXPECT_EQ(entry.options, "rw");
    EXPECT_EQ(entries[1].options, "rw,discard");
}

TEST(MountTable, TakesATableOfEveryDate) {
    const TestFolder folder;
    const std::string path = folder.FileMake("mountinfo", kTable);
    for (const int64_t date : kFarDates) {
        DateFile(path, date);
        std::vector<MountEntry> entries;
        EXPECT_TRUE(MountTableRead(path.c_str(), entries)) << date;
        EXPECT_EQ(entries.size(), 8U);
    }
}

TEST(MountTable, EmptyTableIsNoFailure) {
    EXPECT_TRUE(TableOf("").empty());
}

TEST(MountTable, UnreadableTableFailsAndLeavesNothing) {
    std::vector<MountEntry> entries(1);
    EXPECT_FALSE(MountTableRead("/nonexistent/mountinfo", entries));
    EXPECT_TRUE(entries.empty());
}

TEST(MountTable, ReadsTheKernelsTable) {
    std::vector<MountEntry> entries;
    ASSERT_TRUE(MountTableRead(kMountTablePath, entries));
    const MountEntry *root = MountFindByPath(entries, "/");
    ASSERT_NE(root, nullptr);
    EXPECT_EQ(root->target, "/");
}

TEST(MountTable, FindsByDeviceTheFirstMountThatIsNoAutomountPoint) {
    std::vector<MountEntry> entries = TableOf(kTable);
    ASSERT_EQ(entries.size(), 8U);
    ASSERT_NE(MountFindByDevice(entries, makedev(254, 1)), nullptr);
    EXPECT_EQ(MountFindByDevice(entries, makedev(254, 1))->id, 29);
    EXPECT_EQ(MountFindByDevice(entries, makedev(0, 50)), nullptr);
    EXPECT_EQ(MountFindByDevice(entries, makedev(254, 9)), nullptr);

    entries.push_back(entries[3]);
    entries.back().id = 99;
    ASSERT_NE(MountFindByDevice(entries, makedev(254, 1)), nullptr);
    EXPECT_EQ(MountFindByDevice(entries, makedev(254, 1))->id, 29);
}

TEST(MountTable, FindsByPathNoMountThatALaterOneHides) {
    const std::vector<MountEntry> entries = TableOf("27 1 254:0 / / rw - ext4 /dev/vda rw\n"
                                                    "28 27 254:1 / /mnt/a/b rw - ext4 /dev/vdb rw\n"
                                                    "29 27 0:60 / /mnt rw - tmpfs tmpfs rw\n"
                                                    "30 29 254:2 / /mnt/a rw - ext4 /dev/vdc rw\n"
                                                    "31 31 254:3 / /own rw - ext4 /dev/vdd rw\n");
    const auto idOf = [&](const char *path) {
        const MountEntry *mount = MountFindByPath(entries, path);
        return mount == nullptr ? -1 : mount->id;
    };
    EXPECT_EQ(idOf("/mnt/a/b"), 30);
    EXPECT_EQ(idOf("/mnt/b"), 29);
    EXPECT_EQ(idOf("/own/file"), 27);
}

TEST(MountTable, FindsByPathTheLongestMountPoint) {
    const std::vector<MountEntry> entries = TableOf(kTable);
    const auto idOf = [&](const char *path) {
        const MountEntry *mount = MountFindByPath(entries, path);
        return mount == nullptr ? -1 : mount->id;
    };
    EXPECT_EQ(idOf("/"), 27);
    EXPECT_EQ(idOf("/etc/fstab"), 27);
    EXPECT_EQ(idOf("/data"), 31);
    EXPECT_EQ(idOf("/data/file"), 31);
    EXPECT_EQ(idOf("/database/file"), 27) << "a mount point is matched by whole components";
    EXPECT_EQ(idOf("/data/tmpfile"), 31);
    EXPECT_EQ(idOf("/data/tmp/file"), 33) << "the mount on top is the later one";
    EXPECT_EQ(idOf("/home/a"), 29) << "the mount on the automount point, not the point";
    EXPECT_EQ(idOf("relative"), -1);
    EXPECT_EQ(idOf(""), -1);
}

TEST(MountTable, OptionValues) {
    const std::vector<MountEntry> entries = TableOf(kTable);
    ASSERT_EQ(entries.size(), 8U);
    EXPECT_EQ(MountOptionValue(entries[5], "subvol"), "/@");
    EXPECT_EQ(MountOptionValue(entries[5], "subvolid"), "256");
    EXPECT_EQ(MountOptionValue(entries[5], "rw"), "") << "an option without a value";
    EXPECT_EQ(MountOptionValue(entries[5], "rtdev"), "");
    EXPECT_EQ(MountOptionValue(MountEntry(), "subvol"), "");
}
} // namespace
} // namespace vesk
