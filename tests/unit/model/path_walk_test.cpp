#include "model/path_walk.h"

#include "tests/support/look_fixture.h"
#include "tests/support/ordinary_user.h"
#include "tests/support/private_mounts.h"
#include "tests/support/private_world.h"

#include <cstring>
#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
class PathWalkTest : public LookTest {
protected:
    void SetUp() override {
        LookTest::SetUp();
        std::filesystem::create_directory(volume_);
    }
    void Make(const std::string &relativePath, const std::string &content = "x") const {
        const std::filesystem::path path = volume_ + "/" + relativePath;
        std::filesystem::create_directories(path.parent_path());
        WriteWhole(path, content);
    }
    // What is met, in order: "path", with what is no file said behind it.
    Texts Walk(const std::string &folder = "", size_t most = 1000) const {
        const FileLooker looker(volume_);
        Texts met;
        PathWalk(looker, folder, [&](const WalkEntry &entry) {
            std::string text = entry.relativePath;
            switch (entry.kind) {
            case WalkKind::File: break;
            case WalkKind::Other: text += " (other)"; break;
            case WalkKind::OtherFileSystem: text += " (other file system)"; break;
            case WalkKind::Unreadable: text += std::string(": ") + strerror(entry.error); break;
            }
            met.push_back(text);
            return met.size() < most;
        });
        return met;
    }
    const TempDir folder_;
    const std::string volume_ = folder_.Path("volume1");
};
} // namespace

TEST_F(PathWalkTest, FilesStandInOrderOfTheirNamesAndFoldersBehindThem) {
    for (const char *path : {"b/z", "b/a/c", "b/a/b", "a", "c", "B", "a-b/x", "a/../d", "e/f"}) {
        Make(std::string(path) == "a/../d" ? "d" : path);
    }
    std::filesystem::create_directories(volume_ + "/empty");
    EXPECT_EQ(Walk(), (Texts{"B", "a", "c", "d", "a-b/x", "b/z", "b/a/b", "b/a/c", "e/f"}));
}

TEST_F(PathWalkTest, AFolderOfTheVolumeIsWalkedByItself) {
    Make("a/b/c");
    Make("a/d");
    Make("ab");
    EXPECT_EQ(Walk("a"), (Texts{"a/d", "a/b/c"}));
    EXPECT_EQ(Walk("a/b"), Texts{"a/b/c"});
    EXPECT_EQ(Walk("gone"), Texts{"gone: No such file or directory"});
    EXPECT_EQ(Walk("ab"), Texts{"ab: Not a directory"});
}

TEST_F(PathWalkTest, AnEmptyVolumeHasNothing) {
    EXPECT_EQ(Walk(), Texts{});
}

TEST_F(PathWalkTest, NamesThatLookLikeTheFoldersOwnAreNames) {
    Make("..a");
    Make("...");
    Make(".a");
    EXPECT_EQ(Walk(), (Texts{"...", "..a", ".a"}));
}

TEST_F(PathWalkTest, LinksAreNotFollowedAndNothingIsWaitedFor) {
    Make("share/a");
    ASSERT_EQ(symlink("share", (volume_ + "/link").c_str()), 0);
    ASSERT_EQ(symlink("..", (volume_ + "/share/up").c_str()), 0);
    ASSERT_EQ(symlink("nowhere", (volume_ + "/share/broken").c_str()), 0);
    ASSERT_EQ(mkfifo((volume_ + "/fifo").c_str(), 0600), 0);
    EXPECT_EQ(Walk(), (Texts{"fifo (other)", "link (other)", "share/a", "share/broken (other)",
                             "share/up (other)"}));
    EXPECT_EQ(Walk("link"), Texts{"link: Too many levels of symbolic links"});
}

TEST_F(PathWalkTest, WhoWantsNoMoreGetsNoMore) {
    Make("a");
    Make("b/c");
    Make("b/d");
    Make("e/f");
    EXPECT_EQ(Walk("", 1), Texts{"a"});
    EXPECT_EQ(Walk("", 2), (Texts{"a", "b/c"}));
    EXPECT_EQ(Walk("none", 1), Texts{"none: No such file or directory"});
}

TEST_F(PathWalkTest, WhoIsToEndIsAskedInFoldersWithoutFilesToo) {
    for (const char *path : {"a/x", "b/y", "c/z"}) {
        std::filesystem::create_directories(volume_ + "/" + path);
    }
    Make("d/file");
    const FileLooker looker(volume_);
    for (const int most : {0, 1, 4, 7, 9}) {
        int asked = 0;
        bool isMet = false;
        PathWalk(
            looker, "",
            [&](const WalkEntry &) {
                isMet = true;
                return true;
            },
            [&] { return ++asked <= most; });
        EXPECT_EQ(asked, most + 1);
        EXPECT_FALSE(isMet);
    }
}

TEST_F(PathWalkTest, AFilesStatusComesWithIt) {
    Make("a", "12345");
    const FileLooker looker(volume_);
    int met = 0;
    PathWalk(looker, "", [&](const WalkEntry &entry) {
        struct stat status {};
        EXPECT_EQ(lstat((volume_ + "/a").c_str(), &status), 0);
        EXPECT_EQ(entry.status.inode, status.st_ino);
        EXPECT_EQ(entry.status.bytes, 5U);
        EXPECT_EQ(entry.status.device, looker.Device());
        EXPECT_EQ(entry.error, 0);
        ++met;
        return true;
    });
    EXPECT_EQ(met, 1);
}

TEST_F(PathWalkTest, WhatVanishesMeanwhileIsLeftOut) {
    Make("a");
    Make("b");
    Make("c");
    const FileLooker looker(volume_);
    Texts met;
    PathWalk(looker, "", [&](const WalkEntry &entry) {
        met.push_back(entry.relativePath);
        std::filesystem::remove(volume_ + "/b");
        return true;
    });
    EXPECT_EQ(met, (Texts{"a", "c"}));
}

TEST_F(PathWalkTest, OtherFileSystemsAreNotEntered) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    Make("a/file");
    std::filesystem::create_directory(volume_ + "/a/mounted");
    const ScopedMount folder = ScopedMount::Tmpfs(volume_ + "/a/mounted", 65536);
    ASSERT_TRUE(folder.IsMounted());
    WriteWhole(volume_ + "/a/mounted/inside", "x");
    const ScopedMount file = ScopedMount::Bind(volume_ + "/a/mounted/inside", volume_ + "/a/file");
    ASSERT_TRUE(file.IsMounted());
    EXPECT_EQ(Walk(), (Texts{"a/file (other file system)", "a/mounted (other file system)"}));
    EXPECT_EQ(Walk("a/mounted").size(), 1U); // and not by its own name either
}

TEST_F(PathWalkTest, WhatAnOrdinaryUserMayNotReadIsTold) {
    SKIP_WITHOUT_ROOT();
    chmod(folder_.Path().c_str(), 0755);
    Make("a");
    Make("closed/b");
    Make("z/c");
    chmod((volume_ + "/closed").c_str(), 0700);
    const OrdinaryUser user;
    EXPECT_EQ(Walk(), (Texts{"a", "closed: Permission denied", "z/c"}));
}

TEST_F(PathWalkTest, AFolderWhoseNamesMayBeReadAndNothingElseIsALackOfRights) {
    SKIP_WITHOUT_ROOT();
    chmod(folder_.Path().c_str(), 0755);
    Make("names/a");
    chmod((volume_ + "/names").c_str(), 0744);
    const OrdinaryUser user;
    EXPECT_EQ(Walk(), Texts{"names: Permission denied"});
}

TEST_F(PathWalkTest, AVolumeThatCannotBeOpenedIsTold) {
    std::filesystem::remove(volume_);
    EXPECT_EQ(Walk(), Texts{": No such file or directory"});
    EXPECT_EQ(Walk("a"), Texts{"a: No such file or directory"});
}

TEST_F(PathWalkTest, OnlyTheFolderThatIsShownStaysOpen) {
    for (int i = 0; i < 40; ++i) {
        Make("a" + std::to_string(i) + "/b/c/d");
    }
    const FileLooker looker(volume_);
    const long before = CountOpenDescriptors();
    int met = 0;
    PathWalk(looker, "", [&](const WalkEntry &) {
        ++met;
        EXPECT_LE(CountOpenDescriptors(), before + 1);
        return true;
    });
    EXPECT_EQ(met, 40);
}
} // namespace vesk
