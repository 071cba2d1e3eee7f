#include "storage_core/space_list.h"

#include "base/deleter.h"
#include "tests/support/test_volume.h"
#include "vesk/storage_core.h"

#include <gtest/gtest.h>

#include <sys/mount.h>
#include <sys/sysmacros.h>

#include <algorithm>
#include <cstring>
#include <filesystem>
#include <memory>

namespace vesk {
namespace {
// Stands for the machine's device nodes: every source in /dev exists but /dev/root, which is vda.
std::string FakeDeviceOf(const MountEntry &mount) {
    if (mount.source == "/dev/root") {
        return mount.device == makedev(254, 0) ? "/dev/vda" : "";
    }
    return mount.source.compare(0, 5, "/dev/") == 0 ? mount.source : "";
}

// "device path" pairs that the selection makes of a table's text.
std::vector<std::string> SpacesOf(const std::string &text) {
    const TestFolder folder;
    std::vector<MountEntry> entries;
    EXPECT_TRUE(MountTableRead(folder.FileMake("mountinfo", text).c_str(), entries));
    std::vector<std::string> spaces;
    for (const Space &space : SpaceListSelect(entries, FakeDeviceOf)) {
        spaces.push_back(space.devicePath + " " + space.referencePath);
    }
    return spaces;
}

using Texts = std::vector<std::string>;

TEST(SpaceListSelect, TakesFilesystemsOnBlockDevicesInTableOrder) {
    EXPECT_EQ(SpacesOf("22 27 0:21 / /proc rw - proc proc rw\n"
                       "27 1 254:0 / / rw - ext4 /dev/vda rw\n"
                       "28 27 0:25 / /run rw - tmpfs tmpfs rw\n"
                       "29 27 0:26 / /net rw - nfs4 server:/export rw\n"
                       "30 27 254:9 / /volume2 rw - xfs /dev/vdj rw\n"
                       "31 27 254:1 / /volume1 ro - ext4 /dev/vdb ro\n"),
              (Texts{"/dev/vda /", "/dev/vdj /volume2", "/dev/vdb /volume1"}));
}

TEST(SpaceListSelect, EmptyTable) {
    EXPECT_EQ(SpacesOf(""), Texts{});
}

TEST(SpaceListSelect, SecondMountOfADeviceAddsNone) {
    EXPECT_EQ(SpacesOf("30 27 254:1 / /volume1 rw - ext4 /dev/vdb rw\n"
                       "31 27 254:1 / /again rw - ext4 /dev/vdb rw\n"
                       "32 27 254:1 / /alias rw - ext4 /dev/disk/by-id/b rw\n"),
              Texts{"/dev/vdb /volume1"});
}

TEST(SpaceListSelect, SecondMountOfASourceAddsNone) {
    EXPECT_EQ(SpacesOf("30 27 0:41 / /volume1 rw - btrfs /dev/vdb rw,subvol=/\n"
                       "31 27 0:42 / /again rw - btrfs /dev/vdb rw,subvol=/\n"),
              Texts{"/dev/vdb /volume1"});
}

TEST(SpaceListSelect, BindMountOfASubdirectoryIsNone) {
    EXPECT_EQ(SpacesOf("29 27 254:1 /etc/hosts /etc/hosts rw - ext4 /dev/vdb rw\n"
                       "30 27 254:1 / /volume1 rw - ext4 /dev/vdb rw\n"
                       "31 27 254:1 /share /share rw - ext4 /dev/vdb rw\n"
                       "32 27 254:2 /share /other rw - ext4 /dev/vdc rw\n"),
              Texts{"/dev/vdb /volume1"});
}

TEST(SpaceListSelect, BtrfsSubvolumeCountsOnce) {
    EXPECT_EQ(SpacesOf("29 27 0:40 /@/etc/hosts /etc/hosts rw - btrfs /dev/vdb rw,subvol=/@\n"
                       "30 27 0:40 /@ /volume1 rw - btrfs /dev/vdb rw,subvolid=256,subvol=/@\n"
                       "31 27 0:40 /@home /home rw - btrfs /dev/vdb rw,subvolid=257,subvol=/@home\n"
                       "32 27 0:40 / /top rw - btrfs /dev/vdb rw,subvolid=5,subvol=/\n"),
              Texts{"/dev/vdb /volume1"});
}

TEST(SpaceListSelect, AutomountAddsNone) {
    EXPECT_EQ(SpacesOf("29 27 0:50 / /volume1 rw - autofs /dev/vdb rw,fd=29\n"
                       "30 29 254:1 / /volume1 rw - ext4 /dev/vdb rw\n"
                       "31 27 0:51 / /idle rw - autofs /dev/vdc rw,fd=30\n"),
              Texts{"/dev/vdb /volume1"});
}

TEST(SpaceListSelect, BlanksInPathsAreDecoded) {
    EXPECT_EQ(SpacesOf("30 27 254:1 / /my\\040volume\\0121 rw - ext4 /dev/by\\040b rw\n"),
              Texts{"/dev/by b /my volume\n1"});
}

TEST(SpaceListSelect, MissingSourceNodeIsLookedUpByNumber) {
    EXPECT_EQ(SpacesOf("27 1 254:0 / / rw - ext4 /dev/root rw\n"), Texts{"/dev/vda /"});
    EXPECT_EQ(SpacesOf("27 1 253:7 / / rw - ext4 /dev/root rw\n"), Texts{});
}

TEST(SpaceListSelect, CoveredMountIsNoSpace) {
    EXPECT_EQ(SpacesOf("30 27 254:1 / /volume1 rw - ext4 /dev/vdb rw\n"
                       "31 30 254:2 / /volume1 rw - ext4 /dev/vdc rw\n"
                       "32 31 254:3 / /volume1/inner rw - ext4 /dev/vdd rw\n"),
              (Texts{"/dev/vdc /volume1", "/dev/vdd /volume1/inner"}));
}

TEST(SpaceListSelect, MountBelowAFolderThatIsMountedOverIsNoSpace) {
    EXPECT_EQ(SpacesOf("27 1 254:0 / / rw - ext4 /dev/vda rw\n"
                       "30 27 254:1 / /mnt/volume1 rw - ext4 /dev/vdb rw\n"
                       "31 27 0:60 / /mnt rw - tmpfs tmpfs rw\n"
                       "32 27 254:1 / /volume1 rw - ext4 /dev/vdb rw\n"
                       "33 31 254:2 / /mnt/volume1 rw - ext4 /dev/vdc rw\n"),
              (Texts{"/dev/vda /", "/dev/vdb /volume1", "/dev/vdc /mnt/volume1"}));
}

TEST(SpaceListSelect, PathsThatDoNotFitAreLeftOut) {
    const std::string fits127 = "/dev/" + std::string(122, 'd');
    const std::string fits511 = "/" + std::string(510, 'm');
    const std::string line = "30 27 254:1 / " + fits511 + " rw - ext4 " + fits127 + " rw\n";
    EXPECT_EQ(SpacesOf(line), Texts{fits127 + " " + fits511});
    EXPECT_EQ(SpacesOf("30 27 254:1 / " + fits511 + "m rw - ext4 /dev/vdb rw\n"), Texts{});
    EXPECT_EQ(SpacesOf("30 27 254:1 / /volume1 rw - ext4 " + fits127 + "d rw\n"), Texts{});
    EXPECT_EQ(SpacesOf("30 27 254:1 / " + fits511 + "m rw - ext4 /dev/vdb rw\n" +
                       "31 27 254:1 / /short rw - ext4 /dev/vdb rw\n"),
              Texts{"/dev/vdb /short"})
        << "a second mount that fits stands for the filesystem";
}

// The enumeration's "device path" pairs of mounts below the private world.
Texts WorldSpaces() {
    VESKSpaceInfo *list = nullptr;
    EXPECT_EQ(VESKSpaceInfoEnum(1, &list), 0);
    const std::unique_ptr<VESKSpaceInfo, Deleter<VESKSpaceInfoFree>> owner(list);
    Texts spaces;
    for (; list != nullptr; list = list->next) {
        const std::string path = list->referencePath;
        if (path.compare(0, std::strlen(kWorldPath), kWorldPath) == 0) {
            spaces.push_back(std::string(list->devicePath) + " " + path);
        }
    }
    return spaces;
}

TEST(VESKSpaceInfoEnum, ListsRealFilesystemsOnceEach) {
    const TestVolume ext4("volume one", kMakeExt4, kExt4Bytes);
    if (!ext4.skipReason.empty()) {
        GTEST_SKIP() << ext4.skipReason;
    }
    EXPECT_EQ(WorldSpaces(), Texts{ext4.device + " /mnt/volume one"});

    const std::string bound = "/mnt/bound";
    const std::string inner = ext4.mountPath + "/inner";
    std::filesystem::create_directory(bound);
    std::filesystem::create_directory(inner);
    for (const std::string &source : {ext4.mountPath, inner, ext4.device}) {
        const bool isDevice = source == ext4.device;
        ASSERT_EQ(mount(source.c_str(), bound.c_str(), "ext4", isDevice ? 0 : MS_BIND, nullptr), 0);
        EXPECT_EQ(WorldSpaces(), Texts{ext4.device + " /mnt/volume one"}) << source;
        ASSERT_EQ(umount2(bound.c_str(), 0), 0);
    }
    // A filesystem without a device may have any source.
    ASSERT_EQ(mount(ext4.device.c_str(), bound.c_str(), "tmpfs", 0, nullptr), 0);
    EXPECT_EQ(WorldSpaces(), Texts{ext4.device + " /mnt/volume one"});
    ASSERT_EQ(umount2(bound.c_str(), 0), 0);
}

TEST(VESKSpaceInfoEnum, ListsSeveralFilesystems) {
    const TestVolume xfs("first", kMakeXfs, kXfsBytes);
    const TestVolume ext4("second", kMakeExt4, kExt4Bytes);
    const TestVolume btrfs("third", kMakeBtrfs, kBtrfsBytes);
    for (const TestVolume *volume : {&xfs, &ext4, &btrfs}) {
        if (!volume->skipReason.empty()) {
            GTEST_SKIP() << volume->skipReason;
        }
    }
    std::string output;
    ASSERT_EQ(CommandRun({"btrfs", "subvolume", "create", "/mnt/third/sub"}, output), 0) << output;
    std::filesystem::create_directory("/mnt/sub");
    ASSERT_EQ(mount(btrfs.device.c_str(), "/mnt/sub", "btrfs", 0, "subvol=sub"), 0);
    EXPECT_EQ(WorldSpaces(), (Texts{xfs.device + " /mnt/first", ext4.device + " /mnt/second",
                                    btrfs.device + " /mnt/third"}));
    ASSERT_EQ(umount2("/mnt/sub", 0), 0);
}

TEST(VESKSpaceInfoEnum, UnreadableTableIsAFailure) {
    const std::string reason = PrivateWorldEnter();
    if (!reason.empty()) {
        GTEST_SKIP() << reason;
    }
    VESKSpaceInfo old = {};
    VESKSpaceInfo *list = &old;
    ASSERT_EQ(mount("none", "/proc", "tmpfs", 0, nullptr), 0);
    const int result = VESKSpaceInfoEnum(1, &list);
    ASSERT_EQ(umount2("/proc", 0), 0);
    EXPECT_LT(result, 0);
    EXPECT_EQ(list, nullptr);
}

TEST(VESKSpaceInfoEnum, NullArguments) {
    EXPECT_LT(VESKSpaceInfoEnum(1, nullptr), 0);
    VESKSpaceInfoFree(nullptr);
}
} // namespace
} // namespace vesk
