#include "model/file_look.h"

#include "tests/support/look_fixture.h"
#include "tests/support/ordinary_user.h"
#include "tests/support/private_mounts.h"
#include "tests/support/private_world.h"

#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
class FileLookTest : public LookTest {
protected:
    void SetUp() override {
        LookTest::SetUp();
        std::filesystem::create_directories(volume_ + "/share/deep");
        WriteWhole(volume_ + "/top.txt", "12345");
        WriteWhole(volume_ + "/share/a.txt", "abc");
        WriteWhole(volume_ + "/share/deep/b.txt", "");
        FakeAppliance::onLookup = [this](const std::string &folder, uint64_t inode, int,
                                         FileMappingTable &table) {
            asked_ = folder + " " + std::to_string(inode);
            table.entries = extents_;
            return lookupResult_;
        };
    }
    uint64_t InodeOf(const std::string &relativePath) const {
        struct stat status {};
        EXPECT_EQ(lstat((volume_ + "/" + relativePath).c_str(), &status), 0);
        return status.st_ino;
    }
    const TempDir folder_;
    const std::string volume_ = folder_.Path("volume1");
    std::vector<FileMappingEntry> extents_{FakeExtent(0, 128, 1280), FakeExtent(128, 8, 128)};
    int lookupResult_ = 0;
    std::string asked_;
};
} // namespace

TEST_F(FileLookTest, AFileIsItsStatusItsExtentsAndTheirBlocks) {
    FileLooker looker(volume_);
    ASSERT_EQ(looker.Error(), 0);
    const FileLook &look = looker.Look("share/a.txt");
    EXPECT_EQ(look.error, 0);
    EXPECT_EQ(look.status.inode, InodeOf("share/a.txt"));
    EXPECT_EQ(look.status.bytes, 3U);
    EXPECT_TRUE(S_ISREG(look.status.mode));
    EXPECT_EQ(look.status.device, looker.Device());
    EXPECT_TRUE(look.hasExtents);
    EXPECT_EQ(look.table.entries.size(), 2U);
    ASSERT_EQ(look.blocks.size(), 2U);
    EXPECT_EQ(look.blocks[0].first, 1U);
    EXPECT_EQ(look.blocks[1].first, 10U);
    const auto inode = static_cast<uint32_t>(InodeOf("share/a.txt"));
    EXPECT_EQ(asked_, volume_ + "/share " + std::to_string(inode));
    EXPECT_EQ(FakeAppliance::askedPath, volume_);
}

TEST_F(FileLookTest, EachFolderIsItsOwnAlsoWhenTheOneBeforeStaysOpen) {
    FileLooker looker(volume_);
    EXPECT_EQ(looker.Look("share/a.txt").status.inode, InodeOf("share/a.txt"));
    EXPECT_EQ(looker.Look("top.txt").status.inode, InodeOf("top.txt"));
    EXPECT_EQ(asked_.compare(0, volume_.size() + 1, volume_ + " "), 0) << asked_;
    EXPECT_EQ(looker.Look("share/deep/b.txt").status.inode, InodeOf("share/deep/b.txt"));
    EXPECT_EQ(looker.Look("share/deep").status.inode, InodeOf("share/deep"));
    EXPECT_EQ(looker.Look("share/b.txt").error, ENOENT);
    EXPECT_EQ(looker.Look("gone/a.txt").error, ENOENT);
    EXPECT_EQ(looker.Look("gone/b.txt").error, ENOENT); // its folder is no other one either
    EXPECT_EQ(looker.Look("top.txt/x").error, ENOTDIR);
}

TEST_F(FileLookTest, AFailedLookHasNothingOfTheOneBefore) {
    FileLooker looker(volume_);
    EXPECT_TRUE(looker.Look("top.txt").hasExtents);
    EXPECT_FALSE(looker.Look("gone").hasExtents);
    EXPECT_EQ(looker.Look("gone").error, ENOENT);
    lookupResult_ = -1;
    const FileLook &failed = looker.Look("top.txt");
    EXPECT_EQ(failed.error, 0);
    EXPECT_FALSE(failed.hasExtents);
    EXPECT_EQ(failed.blocks.size(), 0U);
    lookupResult_ = 0;
    extents_.clear();
    const FileLook &empty = looker.Look("top.txt");
    EXPECT_TRUE(empty.hasExtents);
    EXPECT_EQ(empty.blocks.size(), 0U);
    EXPECT_EQ(empty.table.entries.size(), 0U);
}

TEST_F(FileLookTest, AFileWhoseStatusIsKnownIsNotAskedForItAgain) {
    FileLooker looker(volume_);
    const FileStat status{0x100000007, 99, S_IFREG | 0644, looker.Device(), 0};
    const FileLook &look = looker.Look("share/gone.txt", &status);
    EXPECT_EQ(look.error, 0);
    EXPECT_EQ(look.status.inode, 0x100000007U);
    EXPECT_EQ(look.status.bytes, 99U);
    EXPECT_TRUE(look.hasExtents);
    EXPECT_EQ(asked_, volume_ + "/share 4294967303");
}

TEST_F(FileLookTest, AStatusAloneAsksForNoExtents) {
    FileLooker looker(volume_);
    FileStat status{};
    EXPECT_EQ(looker.Stat("share/a.txt", &status), 0);
    EXPECT_EQ(status.inode, InodeOf("share/a.txt"));
    EXPECT_EQ(status.bytes, 3U);
    EXPECT_EQ(looker.Stat("share/gone", &status), ENOENT);
    EXPECT_EQ(looker.Stat("gone/a.txt", &status), ENOENT);
    EXPECT_EQ(looker.Stat("top.txt", &status), 0);
    EXPECT_EQ(status.inode, InodeOf("top.txt"));
    EXPECT_EQ(FakeAppliance::lookups, 0);
}

TEST_F(FileLookTest, TheBirthTimeIsTheFilesOwnToTheNanosecond) {
    struct statx answer {};
    ASSERT_EQ(statx(AT_FDCWD, (volume_ + "/top.txt").c_str(), 0, STATX_BTIME, &answer), 0);
    FileLooker looker(volume_);
    const bool isKnown = (answer.stx_mask & STATX_BTIME) != 0;
    EXPECT_EQ(looker.Look("top.txt").status.birth,
              isKnown ? answer.stx_btime.tv_sec * 1000000000 + answer.stx_btime.tv_nsec : 0);
}

TEST_F(FileLookTest, OnlyRegularFilesHaveExtents) {
    ASSERT_EQ(symlink("a.txt", (volume_ + "/share/link").c_str()), 0);
    ASSERT_EQ(mkfifo((volume_ + "/share/fifo").c_str(), 0600), 0);
    FileLooker looker(volume_);
    for (const char *path : {"share/link", "share/fifo", "share/deep", "share"}) {
        const FileLook &look = looker.Look(path);
        EXPECT_EQ(look.error, 0) << path;
        EXPECT_FALSE(look.hasExtents) << path;
        EXPECT_EQ(look.status.inode, InodeOf(path));
    }
    EXPECT_EQ(FakeAppliance::lookups, 0);
}

TEST_F(FileLookTest, AFolderIsNotReachedThroughALinkNorOutsideTheVolume) {
    std::filesystem::create_directory(folder_.Path("other"));
    WriteWhole(folder_.Path("other/a.txt"), "x");
    ASSERT_EQ(symlink("share", (volume_ + "/link").c_str()), 0);
    ASSERT_EQ(symlink(folder_.Path("other").c_str(), (volume_ + "/out").c_str()), 0);
    FileLooker looker(volume_);
    EXPECT_EQ(looker.Look("link/a.txt").error, ELOOP);
    EXPECT_EQ(looker.Look("out/a.txt").error, ELOOP);
    EXPECT_NE(looker.Look("../other/a.txt").error, 0);
    EXPECT_EQ(FakeAppliance::lookups, 0);
}

TEST_F(FileLookTest, AnotherFileSystemBelowIsNotEntered) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    std::filesystem::create_directory(volume_ + "/mounted");
    const ScopedMount mount = ScopedMount::Tmpfs(volume_ + "/mounted", 65536);
    ASSERT_TRUE(mount.IsMounted());
    WriteWhole(volume_ + "/mounted/a.txt", "x");
    FileLooker looker(volume_);
    EXPECT_EQ(looker.Look("mounted").error, EXDEV);
    EXPECT_EQ(looker.Look("mounted/a.txt").error, EXDEV);
    EXPECT_EQ(FakeAppliance::lookups, 0);
}

TEST_F(FileLookTest, AMountPointThatCannotBeOpenedIsTheErrorOfEveryFile) {
    FileLooker looker(folder_.Path("gone"));
    EXPECT_EQ(looker.Error(), ENOENT);
    const FileStat status{7, 1, S_IFREG, 1, 0};
    FileStat found{};
    EXPECT_EQ(looker.Stat("a", &found), ENOENT);
    EXPECT_EQ(looker.Look("a").error, ENOENT);
    EXPECT_EQ(looker.Look("a", &status).error, ENOENT);
    EXPECT_FALSE(looker.Look("a", &status).hasExtents);
}

TEST_F(FileLookTest, WhereThePlatformHasNoExtentsThereAreNone) {
    FakeAppliance::createFails = true;
    FileLooker looker(volume_);
    const FileLook &look = looker.Look("top.txt");
    EXPECT_EQ(look.error, 0);
    EXPECT_EQ(look.status.bytes, 5U);
    EXPECT_FALSE(look.hasExtents);
    EXPECT_EQ(LookLogTake("none"), "none"); // the platform's words are no other look's cause
}

TEST_F(FileLookTest, WhoMayNotSearchAFolderIsToldSo) {
    SKIP_WITHOUT_ROOT();
    chmod(folder_.Path().c_str(), 0755);
    chmod((volume_ + "/share").c_str(), 0700);
    const OrdinaryUser user;
    FileLooker looker(volume_);
    EXPECT_EQ(looker.Look("top.txt").error, 0);
    EXPECT_EQ(looker.Look("share/a.txt").error, EACCES);
    EXPECT_EQ(looker.Look("share/deep/b.txt").error, EACCES);
}

TEST_F(FileLookTest, AStatusIsOfTheEntryItself) {
    ASSERT_EQ(symlink("/nowhere", (volume_ + "/link").c_str()), 0);
    FileStat status{};
    EXPECT_EQ(FileStatAt(AT_FDCWD, (volume_ + "/link").c_str(), &status), 0);
    EXPECT_TRUE(S_ISLNK(status.mode));
    EXPECT_EQ(FileStatAt(AT_FDCWD, (volume_ + "/gone").c_str(), &status), ENOENT);
}
} // namespace vesk
