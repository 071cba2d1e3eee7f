#include "verbs/plan.h"

#include "tests/support/look_fixture.h"
#include "tests/support/ordinary_user.h"
#include "tests/support/private_mounts.h"
#include "tests/support/private_world.h"
#include "tests/unit/verbs/records.h"

#include <filesystem>
#include <map>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
// Volumes that are folders; each file has one block of its own choice.
class PlanLookTest : public LookTest {
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
            return 0;
        };
        world_.volumes.push_back(MakeVolume(volume_));
    }
    uint32_t Make(const std::string &relativePath, uint64_t block) {
        return MakeAt(volume_ + "/" + relativePath, block);
    }
    uint32_t MakeAt(const std::string &path, uint64_t block) {
        std::filesystem::create_directories(std::filesystem::path(path).parent_path());
        WriteWhole(path, "x");
        struct stat status {};
        EXPECT_EQ(lstat(path.c_str(), &status), 0);
        blockOf_[static_cast<uint32_t>(status.st_ino)] = block;
        return static_cast<uint32_t>(status.st_ino);
    }
    void Record(const std::vector<RecordedFile> &files,
                const std::vector<StoredRequest> &requests = {}) {
        RecordedVolume volume{volume_, files};
        world_.volumes[0].known = KnownFilesOf(volume_, &volume, requests);
    }
    const Plan &Look(const Texts &relativePaths) {
        Texts paths;
        for (const std::string &path : relativePaths) {
            paths.push_back(path.empty() || path[0] != '/' ? volume_ + "/" + path : path);
        }
        world_.errors = {};
        Progress progress(ProgressForm::None, 0);
        plan_ = PlanLook(world_, paths, 10, progress);
        return plan_;
    }
    // The figures of the first volume.
    const PlanFigures &Figures(const Texts &relativePaths) {
        Look(relativePaths);
        EXPECT_EQ(plan_.volumes.size(), 1U);
        plan_.volumes.resize(1);
        return plan_.volumes[0].figures;
    }
    // "path reason", paths below the volume as such.
    Texts Skipped() const {
        Texts texts;
        for (const SkippedPath &skipped : plan_.skipped) {
            const bool isBelow = skipped.path.compare(0, volume_.size() + 1, volume_ + "/") == 0;
            texts.push_back((isBelow ? skipped.path.substr(volume_.size() + 1) : skipped.path) +
                            " " + SkipReasonText(skipped.reason));
        }
        return texts;
    }
    Texts Errors() const { return TextsOf(world_.errors); }

    const TempDir folder_;
    const std::string volume_ = folder_.Path("volume1");
    World world_;
    Plan plan_;
    std::map<uint64_t, uint64_t> blockOf_; // by inode
};
} // namespace

TEST_F(PlanLookTest, AFileIsPlanned) {
    Make("share/a", 5);
    const PlanFigures &figures = Figures({"share/a"});
    EXPECT_EQ(plan_.volumes[0].mountPath, volume_);
    EXPECT_EQ(figures.files, 1U);
    EXPECT_EQ(figures.bytes, 1U);
    EXPECT_EQ(figures.blocks, 1U);
    EXPECT_EQ(figures.requests, 1U);
    EXPECT_EQ(figures.headroom, 32 - 1 - 4); // a tenth of the SSD stays free
    EXPECT_FALSE(plan_.isAllFailed);
    EXPECT_EQ(Skipped(), Texts{});
    EXPECT_EQ(Errors(), Texts{});
}

TEST_F(PlanLookTest, AFolderIsTakenWholeAndWhatCannotBePinnedLeftOut) {
    Make("share/a", 5);
    Make("share/deep/b", 5);
    Make("share/b c", 7);
    Make("veskcachepinfile.bitmap", 8);
    WriteWhole(volume_ + "/share/empty", "");
    ASSERT_EQ(mkfifo((volume_ + "/share/fifo").c_str(), 0600), 0);
    ASSERT_EQ(symlink("a", (volume_ + "/share/link").c_str()), 0);
    const PlanFigures &figures = Figures({"."});
    EXPECT_EQ(figures.files, 2U);
    EXPECT_EQ(figures.blocks, 1U);
    EXPECT_EQ(Skipped(),
              (Texts{"veskcachepinfile.bitmap bitmap-file", "share/b c name",
                     "share/empty no-blocks", "share/fifo not-regular", "share/link not-regular"}));
    EXPECT_FALSE(plan_.isAllFailed);
}

TEST_F(PlanLookTest, AnotherPathOfTheSameFileIsLeftOut) {
    Make("share/a", 5);
    std::filesystem::create_hard_link(volume_ + "/share/a", volume_ + "/share/b");
    EXPECT_EQ(Figures({"share"}).files, 1U);
    EXPECT_EQ(Skipped(), Texts{"share/b same-inode"});
    EXPECT_EQ(Figures({"share/b"}).files, 1U);
    EXPECT_EQ(Skipped(), Texts{});
}

TEST_F(PlanLookTest, WhatIsAskedForTwiceIsTakenOnce) {
    Make("a/x", 1);
    Make("a/deep/y", 2);
    Make("a-b/z", 3);
    Make("ab", 4);
    Make("top", 5);
    // "a-b" stands between "a" and "a/x" in the order of the letters.
    const Texts paths{"a/x", "a-b", "a",     "ab",     "a/deep/",
                      "top", "top", "a-b/z", "a/../a", "a/deep/y"};
    EXPECT_EQ(Figures(paths).files, 5U);
    EXPECT_EQ(Skipped(), Texts{});
    EXPECT_EQ(Figures({"top", ".", "a"}).files, 5U);
    EXPECT_EQ(Skipped(), Texts{});
}

TEST_F(PlanLookTest, PathsThatCannotBePlannedAreLeftOutWithTheirReason) {
    const std::string elsewhere = folder_.FileMake("elsewhere", "x");
    std::filesystem::create_directory(folder_.Path("plain"));
    const std::string plain = folder_.FileMake("plain/a", "x");
    world_.withoutCache.push_back(folder_.Path("plain"));
    Make("a", 1);
    EXPECT_EQ(Figures({"a", "gone", "a/x", elsewhere, plain}).files, 1U);
    EXPECT_EQ(Skipped(), (Texts{elsewhere + " no-volume", plain + " no-volume", "a/x not-found",
                                "gone not-found"}));
    EXPECT_FALSE(plan_.isAllFailed);
    Look({"gone", elsewhere});
    EXPECT_TRUE(plan_.isAllFailed);
    EXPECT_EQ(plan_.volumes.size(), 0U);
    EXPECT_EQ(Errors(), Texts{});
}

TEST_F(PlanLookTest, AFolderWithoutFilesCanBePlannedAllTheSame) {
    EXPECT_EQ(Figures({"share"}).files, 0U);
    EXPECT_FALSE(plan_.isAllFailed);
}

TEST_F(PlanLookTest, AVolumeThatIsNotMountedOrHasNoCacheIsNone) {
    Make("a", 1);
    world_.volumes[0].volume.isMounted = false;
    Look({"a"});
    EXPECT_EQ(Skipped(), Texts{"a no-volume"});
    world_.volumes[0].volume.isMounted = true;
    world_.volumes[0].volume.hasCache = false;
    Look({"a"});
    EXPECT_EQ(Skipped(), Texts{"a no-volume"});
    EXPECT_TRUE(plan_.isAllFailed);
}

TEST_F(PlanLookTest, ACacheThatCannotPinMakesTheAnswerUnknown) {
    Make("a", 1);
    world_.volumes[0].volume.supportsPin = false;
    EXPECT_EQ(Figures({"a"}).files, 1U);
    EXPECT_EQ(Errors(), (Texts{volume_ + ": its cache is not up or cannot pin", "unknown"}));
    world_.volumes[0].volume.supportsPin = std::nullopt; // told where it was looked at
    Look({"a"});
    EXPECT_EQ(Errors(), Texts{});
}

TEST_F(PlanLookTest, WhatIsPinnedIsNotSentAgain) {
    BlockSetAdd(&*world_.volumes[0].volume.marked, {1, 1});
    Record({{Make("a", 1), "a"}, {Make("b", 2), "b"}});
    const PlanFigures &figures = Figures({"."});
    EXPECT_EQ(figures.files, 2U);
    EXPECT_EQ(figures.blocks, 2U);
    EXPECT_EQ(figures.blocksNew, 1U);
    EXPECT_EQ(figures.requests, 1U);
    EXPECT_EQ(Figures({"a"}).requests, 0U);
    world_.volumes[0].volume.driverHasBitmap = false; // only marked
    EXPECT_EQ(Figures({"a"}).requests, 1U);
}

TEST_F(PlanLookTest, StoredPinsOfTheVolumeTakeTheirRoom) {
    Make("stored", 7);
    Make("away", 8);
    Make("a", 1);
    Record({}, {{"1", kRequestPinFiles, volume_, "stored#1;gone#2"},
                {"2", kRequestUnpinFiles, volume_, "away#3"}});
    EXPECT_EQ(Figures({"a"}).headroom, 32 - 1 - 4 - 1);
    EXPECT_EQ(plan_.volumes[0].figures.seconds, 3U);
}

TEST_F(PlanLookTest, EachVolumeHasItsPlan) {
    const std::string second = folder_.Path("volume2");
    std::filesystem::create_directory(second);
    world_.volumes.push_back(MakeVolume(second));
    MakeAt(second + "/z", 3);
    Make("a", 1);
    Make("b", 2);
    Look({second, "a", "b"});
    ASSERT_EQ(plan_.volumes.size(), 2U);
    EXPECT_EQ(plan_.volumes[0].mountPath, volume_);
    EXPECT_EQ(plan_.volumes[0].figures.files, 2U);
    EXPECT_EQ(plan_.volumes[1].mountPath, second);
    EXPECT_EQ(plan_.volumes[1].figures.files, 1U);
}

TEST_F(PlanLookTest, AVolumeMountedBelowAnotherIsPlannedWhenItIsAskedFor) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    const std::string inner = volume_ + "/share/deep";
    const ScopedMount mount = ScopedMount::Tmpfs(inner, 65536);
    ASSERT_TRUE(mount.IsMounted());
    world_.volumes.push_back(MakeVolume(inner));
    Make("share/a", 1);
    MakeAt(inner + "/b", 2);
    Make("share/z", 3);
    Look({"share", inner, "share/z", inner + "/b"});
    EXPECT_EQ(Skipped(), Texts{"share/deep other-filesystem"});
    ASSERT_EQ(plan_.volumes.size(), 2U);
    EXPECT_EQ(plan_.volumes[0].figures.files, 2U);
    EXPECT_EQ(plan_.volumes[1].mountPath, inner);
    EXPECT_EQ(plan_.volumes[1].figures.files, 1U);
}

TEST_F(PlanLookTest, WhoMayNotLookIsToldSo) {
    SKIP_WITHOUT_ROOT();
    Make("share/deep/a", 1);
    chmod(folder_.Path().c_str(), 0755);
    chmod((volume_ + "/share").c_str(), 0700);
    const OrdinaryUser user;
    Look({"share/deep/a"});
    EXPECT_EQ(Skipped(), Texts{"share/deep/a no-permission"});
    EXPECT_EQ(Errors(), (Texts{volume_ + "/share/deep/a: Permission denied", "unknown"}));
    Look({"."});
    EXPECT_EQ(Skipped(), Texts{"share no-permission"});
}

TEST_F(PlanLookTest, AMountPointThatMayNotBeReadIsNamedAsItIs) {
    SKIP_WITHOUT_ROOT();
    chmod(folder_.Path().c_str(), 0755);
    chmod(volume_.c_str(), 0700);
    const OrdinaryUser user;
    Look({"/" + volume_.substr(1)});
    EXPECT_EQ(Skipped(), Texts{volume_ + " no-permission"});
}
} // namespace vesk
