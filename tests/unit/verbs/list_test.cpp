#include "verbs/list.h"

#include "tests/support/look_fixture.h"
#include "tests/support/ordinary_user.h"
#include "tests/support/private_mounts.h"
#include "tests/support/private_world.h"
#include "tests/unit/verbs/records.h"

#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
const bool kPrivateWorld = UsePrivateWorld();

// A volume that is a folder; each file has the block of its first byte's number, "0" to "9".
class ListLookTest : public LookTest {
protected:
    void SetUp() override {
        LookTest::SetUp();
        std::filesystem::create_directories(volume_ + "/share/deep");
        FakeAppliance::onLookup = [this](const std::string &, uint64_t inode, int,
                                         FileMappingTable &table) {
            const auto block = blockOf_.find(inode);
            if (block != blockOf_.end()) {
                table.entries.push_back(FakeExtent(0, 8, block->second * 128));
            }
            return refused_ == inode ? -1 : 0;
        };
        world_.isConfigKnown = true;
        world_.volumes.push_back(MakeVolume(volume_));
        BlockSetAdd(&*Volume1().marked, {1, 1});
    }
    Volume &Volume1() { return world_.volumes[0].volume; }

    // Makes a file with this block; its inode number.
    uint32_t Make(const std::string &relativePath, uint64_t block) {
        const std::filesystem::path path = volume_ + "/" + relativePath;
        std::filesystem::create_directories(path.parent_path());
        WriteWhole(path, "x");
        struct stat status {};
        EXPECT_EQ(lstat(path.c_str(), &status), 0);
        blockOf_[static_cast<uint32_t>(status.st_ino)] = block;
        return static_cast<uint32_t>(status.st_ino);
    }
    // Puts these into the records; in order of their paths.
    void Record(const std::vector<RecordedFile> &files,
                const std::vector<StoredRequest> &requests = {}) {
        RecordedVolume volume{volume_, files};
        world_.volumes[0].known = KnownFilesOf(volume_, &volume, requests);
    }

    // Each file below the volume as "path state marked/blocks", in the order of the visits.
    Texts List(const Texts &relativePaths, bool isAll = false) {
        Texts paths;
        for (const std::string &path : relativePaths) {
            paths.push_back(volume_ + "/" + path);
        }
        return ListPaths(isAll ? Texts{} : paths);
    }
    Texts ListPaths(const Texts &paths) {
        Texts files;
        world_.errors = {};
        result_ = ListLook(world_, paths, std::nullopt, [&](const ListedFile &file) {
            const bool isBelow = file.path.compare(0, volume_.size() + 1, volume_ + "/") == 0;
            EXPECT_EQ(file.volume, isBelow ? volume_ : file.volume);
            std::string text = isBelow ? file.path.substr(volume_.size() + 1) : file.path;
            text += std::string(" ") + (file.state ? FileStateText(*file.state) : "null");
            if (file.figures.blocks) {
                text += " " + (file.figures.marked ? std::to_string(*file.figures.marked) : "-") +
                        "/" + std::to_string(*file.figures.blocks);
            }
            files.push_back(text);
            inodes_[file.path] = file.inode;
        });
        return files;
    }
    // The folders as "path pinned/files blocks marked resident".
    Texts Folders() const {
        Texts texts;
        const auto text = [](const std::optional<uint64_t> &count) {
            return count ? std::to_string(*count) : std::string("-");
        };
        for (const ListedFolder &folder : result_.folders) {
            texts.push_back(folder.path.substr(volume_.size()) + " " +
                            std::to_string(folder.filesPinned) + "/" +
                            std::to_string(folder.files) + " " + text(folder.blocks) + " " +
                            text(folder.marked) + " " + text(folder.resident));
        }
        return texts;
    }
    Texts Errors() const { return TextsOf(world_.errors); }

    const TempDir folder_;
    const std::string volume_ = folder_.Path("volume1");
    World world_;
    ListResult result_;
    std::map<uint64_t, uint64_t> blockOf_; // by inode
    uint64_t refused_ = 0;                 // the inode whose extents cannot be read
    std::map<std::string, std::optional<uint64_t>> inodes_;
};
} // namespace

TEST_F(ListLookTest, WithoutPathsAllThatIsRecordedOrRequestedIsListed) {
    Record({{Make("a", 1), "a"}, {Make("b", 2), "b"}, {77, "gone"}},
           {{"1", kRequestPinFiles, volume_, "c#5"}});
    Make("c", 3);
    Make("unknown", 4);
    EXPECT_EQ(List({}, true),
              (Texts{"a pinned 1/1", "b unmarked 0/1", "c pinning 0/1", "gone missing"}));
    EXPECT_EQ(inodes_[volume_ + "/gone"], 77U);
    EXPECT_EQ(Folders(), Texts{});
    EXPECT_EQ(Errors(), Texts{});
}

TEST_F(ListLookTest, VolumesWithoutRecordsAreNotOpened) {
    world_.volumes.push_back(MakeVolume(folder_.Path("gone")));
    EXPECT_EQ(List({}, true), Texts{});
    EXPECT_EQ(Errors(), Texts{});
}

TEST_F(ListLookTest, AFileThatWasAskedForIsListedWhateverItIs) {
    Record({{Make("a", 1), "a"}});
    Make("free", 1);
    ASSERT_EQ(symlink("a", (volume_ + "/link").c_str()), 0);
    EXPECT_EQ(List({"free", "a", "link", "a"}),
              (Texts{"free unpinned 1/1", "a pinned 1/1", "link unpinned", "a pinned 1/1"}));
    EXPECT_EQ(result_.failedPaths, 0U);
    EXPECT_EQ(Errors(), Texts{});
}

TEST_F(ListLookTest, AHardLinkIsJudgedByItsInode) {
    const uint32_t inode = Make("a", 1);
    Record({{inode, "a"}, {Make("b", 2), "b"}});
    std::filesystem::create_hard_link(volume_ + "/a", volume_ + "/share/other");
    EXPECT_EQ(List({"share/other"}), Texts{"share/other pinned 1/1"});
    EXPECT_EQ(inodes_[volume_ + "/share/other"], inode);
    // A path of its own wins: the file at b is not the one that was recorded there.
    std::filesystem::remove(volume_ + "/b");
    std::filesystem::create_hard_link(volume_ + "/a", volume_ + "/b");
    EXPECT_EQ(List({"b"}), Texts{"b replaced 1/1"});
}

TEST_F(ListLookTest, OfSeveralRecordsOfAPathTheOneOfItsFileCounts) {
    const uint32_t inode = Make("a", 1);
    Record({{inode - 1, "a"}, {inode, "a"}, {inode + 1, "a"}});
    EXPECT_EQ(List({}, true), Texts{"a pinned 1/1"});
    EXPECT_EQ(List({"a"}), Texts{"a pinned 1/1"});
    Record({{inode - 1, "a"}, {inode + 1, "a"}});
    EXPECT_EQ(List({}, true), Texts{"a replaced 1/1"});
    EXPECT_EQ(inodes_[volume_ + "/a"], inode - 1);
}

TEST_F(ListLookTest, AFolderHasItsRecordsFirstAndThenItsOtherFiles) {
    Record({{Make("share/b", 1), "share/b"}, {88, "share/gone"}, {Make("top", 1), "top"}});
    Make("share-2", 1);
    Make("share/a", 2);
    Make("share/deep/c", 1);
    ASSERT_EQ(mkfifo((volume_ + "/share/fifo").c_str(), 0600), 0);
    EXPECT_EQ(List({"share"}), (Texts{"share/b pinned 1/1", "share/gone missing",
                                      "share/a unpinned 0/1", "share/deep/c unpinned 1/1"}));
    EXPECT_EQ(Folders(), Texts{"/share 1/3 2 1 -"});
    EXPECT_EQ(List({"share/deep/"}), Texts{"share/deep/c unpinned 1/1"});
    EXPECT_EQ(Folders(), Texts{"/share/deep 0/1 1 1 -"});
    EXPECT_EQ(List({"."}).size(), 6U);
    EXPECT_EQ(Folders(), Texts{" 2/5 2 1 -"});
    EXPECT_EQ(Errors(), Texts{});
}

TEST_F(ListLookTest, BlocksThatFilesOfAFolderShareCountOnce) {
    Record({{Make("share/a", 1), "share/a"}, {Make("share/b", 1), "share/b"}});
    Make("share/c", 63);
    Volume1().resident = BlockSet{0, 0, 0, 0, 0, 0, 0, 0x80};
    List({"share"});
    EXPECT_EQ(Folders(), Texts{"/share 2/3 2 1 1"});
}

TEST_F(ListLookTest, FiguresOfAFolderThatCannotBeHadAreAbsent) {
    Make("share/a", 1);
    Volume1().marked = std::nullopt;
    List({"share"});
    EXPECT_EQ(Folders(), Texts{"/share 0/1 1 - -"});
    Volume1().deviceBytes = std::nullopt;
    List({"share"});
    EXPECT_EQ(Folders(), Texts{"/share 0/1 - - -"});
}

TEST_F(ListLookTest, AFolderThatIsGoneStillHasItsRecords) {
    Record({{77, "old/a"}, {78, "old/b/c"}});
    EXPECT_EQ(List({"old"}), (Texts{"old/a missing", "old/b/c missing"}));
    EXPECT_EQ(Folders(), Texts{"/old 0/0 0 0 -"});
    EXPECT_EQ(result_.failedPaths, 0U);
    EXPECT_EQ(List({"old/a"}), Texts{"old/a missing"});
    EXPECT_EQ(result_.failedPaths, 0U);
    EXPECT_EQ(Errors(), Texts{});
}

TEST_F(ListLookTest, APathThatIsNeitherThereNorRecordedFails) {
    EXPECT_EQ(List({"gone", "share/gone"}), Texts{});
    EXPECT_EQ(result_.failedPaths, 2U);
    EXPECT_EQ(Errors(), (Texts{volume_ + "/gone: No such file or directory",
                               volume_ + "/share/gone: No such file or directory"}));
}

TEST_F(ListLookTest, WhatLiesOnNoVolumeFailsAndIsUnpinned) {
    const std::string file = folder_.FileMake("elsewhere", "12345");
    std::filesystem::create_directory(folder_.Path("plain"));
    const std::string onPlain = folder_.FileMake("plain/a", "x");
    world_.withoutCache.push_back(folder_.Path("plain"));
    EXPECT_EQ(ListPaths({file, onPlain, folder_.Path("plain"), "/nowhere/x"}),
              (Texts{file + " unpinned", onPlain + " unpinned"}));
    EXPECT_EQ(result_.failedPaths, 4U);
    EXPECT_EQ(Errors(),
              (Texts{file + ": lies on no volume", onPlain + ": lies on a volume without a cache",
                     folder_.Path("plain") + ": lies on a volume without a cache",
                     "/nowhere/x: No such file or directory"}));
}

TEST_F(ListLookTest, OfAVolumeThatIsNotMountedTheRecordsAreListedAndTheAnswerIsUnknown) {
    Record({{77, "a"}}, {{"1", kRequestUnpinFiles, volume_, "b#5"}});
    Volume1().isMounted = false;
    Volume1().hasCache = false;
    EXPECT_EQ(List({}, true), (Texts{"a unreadable", "b unpinning"}));
    EXPECT_EQ(Errors(), (Texts{volume_ + ": is not mounted", "unknown"}));
    EXPECT_EQ(List({"share"}), Texts{}); // a folder that is there, but not the volume's
    EXPECT_EQ(FakeAppliance::lookups, 0);
}

TEST_F(ListLookTest, AMountPointThatCannotBeOpenedMakesTheAnswerUnknown) {
    Record({{77, "a"}});
    std::filesystem::remove_all(volume_);
    EXPECT_EQ(List({}, true), Texts{"a missing"});
    EXPECT_EQ(Errors(), (Texts{volume_ + ": No such file or directory", "unknown"}));
}

TEST_F(ListLookTest, ForRootExtentsThatCannotBeReadAreTheFilesState) {
    SKIP_WITHOUT_ROOT();
    refused_ = Make("a", 1);
    Record({{static_cast<uint32_t>(refused_), "a"}});
    EXPECT_EQ(List({}, true), Texts{"a unreadable"});
    EXPECT_EQ(Errors(), Texts{volume_ + "/a: its blocks cannot be looked at"});
}

TEST_F(ListLookTest, WhoMayNotLookIsToldSo) {
    SKIP_WITHOUT_ROOT();
    refused_ = Make("a", 1);
    Record({{static_cast<uint32_t>(refused_), "a"}, {Make("share/b", 1), "share/b"}});
    chmod(folder_.Path().c_str(), 0755);
    chmod((volume_ + "/share").c_str(), 0700);
    const OrdinaryUser user;
    EXPECT_EQ(List({}, true), (Texts{"a unreadable", "share/b unreadable"}));
    EXPECT_EQ(Errors(), (Texts{volume_ + "/a: Permission denied",
                               volume_ + "/share/b: Permission denied", "unknown"}));
    EXPECT_EQ(List({"share"}), Texts{"share/b unreadable"});
    EXPECT_EQ(Errors(), (Texts{volume_ + "/share/b: Permission denied",
                               volume_ + "/share: Permission denied", "unknown"}));
    EXPECT_EQ(List({"share/none"}), Texts{});
    EXPECT_EQ(Errors(), (Texts{volume_ + "/share/none: Permission denied", "unknown"}));
    EXPECT_EQ(result_.failedPaths, 1U);
}

TEST_F(ListLookTest, WithoutTheConfigurationNoFileHasAState) {
    Make("share/a", 1);
    world_.isConfigKnown = false;
    EXPECT_EQ(List({"share"}), Texts{"share/a null 1/1"});
    EXPECT_EQ(List({"share/a"}), Texts{"share/a null 1/1"});
}

// A request there may pin or unpin any of them.
TEST_F(ListLookTest, WhereTheQueueCannotBeSeenNoFileHasAState) {
    Record({{Make("share/a", 1), "share/a"}});
    Make("share/b", 2);
    EXPECT_EQ(List({"share"}), (Texts{"share/a pinned 1/1", "share/b unpinned 0/1"}));
    world_.areSentKnown = false;
    EXPECT_EQ(List({"share"}), (Texts{"share/a null 1/1", "share/b null 0/1"}));
    EXPECT_EQ(Errors(), Texts{"unknown"});
}

TEST_F(ListLookTest, APathThatCannotBeLookedAtFailsOnce) {
    ASSERT_EQ(symlink("loop", (volume_ + "/loop").c_str()), 0);
    Record({{77, "loop/b"}});
    EXPECT_EQ(List({"loop/a", "loop/b"}), Texts{"loop/b unreadable"});
    EXPECT_EQ(result_.failedPaths, 2U);
    EXPECT_EQ(Errors(), (Texts{volume_ + "/loop/a: Too many levels of symbolic links",
                               volume_ + "/loop/b: Too many levels of symbolic links"}));
}

TEST_F(ListLookTest, OtherFileSystemsBelowAreNotListed) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    Make("share/a", 1);
    const ScopedMount mount = ScopedMount::Tmpfs(volume_ + "/share/deep", 65536);
    ASSERT_TRUE(mount.IsMounted());
    Make("share/deep/x", 2);
    EXPECT_EQ(List({"share"}), Texts{"share/a unpinned 1/1"});
    EXPECT_EQ(Errors(), Texts{});
}

// The record's path is where it was; the figures are those of the file where it is now.
TEST_F(ListLookTest, WithSearchARenamedFileIsFound) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    const ScopedMount lib = ScopedMount::Tmpfs("/var/lib", 1 << 20);
    ASSERT_TRUE(lib.IsMounted());
    std::filesystem::create_directories("/var/lib/veskpin/last");
    const uint32_t inode = Make("a", 1);
    FileStat status{};
    ASSERT_EQ(FileLooker(volume_).Stat("a", &status), 0);
    if (status.birth == 0) {
        GTEST_SKIP() << "this file system keeps no birth times";
    }
    WriteWhole("/var/lib/veskpin/last/uuid-1.json", R"({"files": [{"inode": )" +
                                                        std::to_string(inode) + R"(, "birth": )" +
                                                        std::to_string(status.birth) + "}]}");
    Record({{inode, "a"}, {77, "gone"}});
    std::filesystem::rename(volume_ + "/a", volume_ + "/share/now");
    for (const bool search : {false, true}) {
        Texts files;
        const auto form = search ? std::optional(ProgressForm::None) : std::nullopt;
        ListLook(world_, {}, form, [&](const ListedFile &file) {
            files.push_back(
                file.path.substr(volume_.size()) + " " + FileStateText(*file.state) +
                (file.pathNow == nullptr ? "" : " " + *file.pathNow) +
                (file.figures.blocks ? " " + std::to_string(*file.figures.blocks) : ""));
        });
        const std::string first =
            search ? "/a renamed " + volume_ + "/share/now 1" : std::string("/a missing");
        EXPECT_EQ(files, (Texts{first, "/gone missing"}));
    }
}
} // namespace vesk
