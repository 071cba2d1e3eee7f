#include "model/targets.h"

#include "tests/support/look_fixture.h"
#include "tests/support/ordinary_user.h"
#include "tests/support/private_mounts.h"
#include "tests/support/private_world.h"

#include <cerrno>
#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
WorldVolume VolumeAt(const std::string &mountPath, bool isMounted = true, bool hasCache = true) {
    WorldVolume volume;
    volume.volume.mountPath = mountPath;
    volume.volume.isMounted = isMounted;
    volume.volume.hasCache = hasCache;
    return volume;
}

class TargetsTest : public LookTest {
protected:
    void SetUp() override {
        LookTest::SetUp();
        std::filesystem::create_directories(volume_ + "/share/deep");
        std::filesystem::create_directories(folder_.Path("volume10"));
        WriteWhole(volume_ + "/share/a.txt", "abc");
        world_.volumes.push_back(VolumeAt(volume_));
        world_.withoutCache.push_back(folder_.Path("volume10"));
    }
    Target Resolve(const std::string &path) const { return TargetResolve(world_, path); }
    // What lies below the volume; else why not.
    std::string Place(const std::string &path) const {
        const Target target = Resolve(path);
        const std::string where =
            target.volume == nullptr ? "no volume"
            : target.volume == &world_.volumes[0]
                ? "\"" + target.relativePath + "\""
                : target.volume->volume.mountPath + " \"" + target.relativePath + "\"";
        return where + (target.isWithoutCache ? " without cache" : "") +
               (target.error != 0 ? " error " + std::to_string(target.error) : "");
    }

    const TempDir folder_{std::filesystem::canonical("/tmp")};
    const std::string volume_ = folder_.Path("volume1");
    World world_;
};
} // namespace

TEST_F(TargetsTest, AFileLiesBelowItsVolume) {
    const Target target = Resolve(volume_ + "/share/a.txt");
    EXPECT_EQ(target.path, volume_ + "/share/a.txt");
    EXPECT_EQ(target.volume, &world_.volumes[0]);
    EXPECT_EQ(target.relativePath, "share/a.txt");
    EXPECT_FALSE(target.isWithoutCache);
    EXPECT_EQ(target.error, 0);
    ASSERT_TRUE(target.status);
    EXPECT_EQ(target.status->bytes, 3U);
}

TEST_F(TargetsTest, SlashesAndDotsMakeNoDifference) {
    EXPECT_EQ(Place(volume_), "\"\"");
    EXPECT_EQ(Place(volume_ + "///"), "\"\"");
    EXPECT_EQ(Place(volume_ + "/share/"), "\"share\"");
    EXPECT_EQ(Place(volume_ + "//share//./a.txt//"), "\"share/a.txt\"");
    EXPECT_EQ(Place(volume_ + "/share/deep/../a.txt"), "\"share/a.txt\"");
    EXPECT_EQ(Place(volume_ + "/share/deep/.."), "\"share\"");
    EXPECT_EQ(Place(volume_ + "/share/."), "\"share\"");
    EXPECT_EQ(Place(volume_ + "/.."), "no volume");
    EXPECT_EQ(Place("/"), "no volume");
    EXPECT_EQ(Resolve("/").path, "/");
    EXPECT_EQ(Resolve("//tmp/").path, "/tmp");
    EXPECT_EQ(Resolve("/..").path, "/");
}

TEST_F(TargetsTest, AVolumeIsNotItsNeighbourWithALongerName) {
    EXPECT_EQ(Place(folder_.Path("volume10")), "no volume without cache");
    EXPECT_EQ(Place(folder_.Path("volume10/x")), "no volume without cache error 2");
    EXPECT_EQ(Place(folder_.Path("volume100")), "no volume error 2");
    EXPECT_EQ(Place(folder_.Path("volume")), "no volume error 2");
}

TEST_F(TargetsTest, FoldersAreResolvedAndTheLastComponentIsNot) {
    ASSERT_EQ(symlink((volume_ + "/share").c_str(), folder_.Path("link").c_str()), 0);
    ASSERT_EQ(symlink("a.txt", (volume_ + "/share/b.txt").c_str()), 0);
    EXPECT_EQ(Place(folder_.Path("link/a.txt")), "\"share/a.txt\"");
    EXPECT_EQ(Place(folder_.Path("link/deep/..")), "\"share\"");
    EXPECT_EQ(Place(folder_.Path("link/../share")), "\"share\""); // ".." of where the link leads
    EXPECT_EQ(Place(volume_ + "/share/b.txt"), "\"share/b.txt\"");
    EXPECT_TRUE(S_ISLNK(Resolve(volume_ + "/share/b.txt").status->mode));
    EXPECT_EQ(Place(folder_.Path("link")), "no volume");
    EXPECT_EQ(Place(folder_.Path("link/")), "no volume");
}

TEST_F(TargetsTest, ARelativePathIsTakenFromTheCurrentFolder) {
    const std::filesystem::path before = std::filesystem::current_path();
    std::filesystem::current_path(volume_ + "/share");
    EXPECT_EQ(Place("a.txt"), "\"share/a.txt\"");
    EXPECT_EQ(Place("."), "\"share\"");
    EXPECT_EQ(Place(".."), "\"\"");
    EXPECT_EQ(Place("../share/deep"), "\"share/deep\"");
    EXPECT_EQ(Place("gone/x"), "\"share/gone/x\" error 2");
    std::filesystem::current_path(before);
}

TEST_F(TargetsTest, APathThatLeadsNowhereKeepsItsVolume) {
    EXPECT_EQ(Place(volume_ + "/share/gone"), "\"share/gone\" error 2");
    EXPECT_EQ(Place(volume_ + "/gone/x/../y/./z"), "\"gone/y/z\" error 2");
    EXPECT_EQ(Place(volume_ + "/gone/../../../../../../../x"), "no volume error 2");
    EXPECT_EQ(Place(volume_ + "/share/a.txt/x"), "\"share/a.txt/x\" error 20");
    EXPECT_EQ(Place(volume_ + "/gone/.."), "\"\" error 2");
    EXPECT_FALSE(Resolve(volume_ + "/gone").status);
    ASSERT_EQ(symlink("loop", (volume_ + "/loop").c_str()), 0);
    EXPECT_EQ(Place(volume_ + "/loop/x"), "\"loop/x\" error 40");
}

TEST_F(TargetsTest, TheVolumeWithTheLongestMountPathIsTheOne) {
    const std::string inner = volume_ + "/share/deep";
    world_.volumes.push_back(VolumeAt(inner));
    world_.volumes.push_back(VolumeAt("/"));
    EXPECT_EQ(Place(inner + "/gone"), inner + " \"gone\" error 2");
    EXPECT_EQ(Place(volume_ + "/share/gone"), "\"share/gone\" error 2");
    EXPECT_EQ(Place("/nowhere/gone"), "/ \"nowhere/gone\" error 2");
    world_.withoutCache.push_back(inner + "/more");
    EXPECT_EQ(Place(inner + "/more/gone"), "no volume without cache error 2");
    world_.withoutCache.push_back(volume_ + "/share"); // shorter than the one that has it
    EXPECT_EQ(Place(inner + "/gone"), inner + " \"gone\" error 2");
}

TEST_F(TargetsTest, AVolumeThatIsKnownByRecordsMayHaveNoCache) {
    world_.volumes.push_back(VolumeAt(folder_.Path("plain"), true, false));
    world_.volumes.push_back(VolumeAt(folder_.Path("away"), false, false));
    EXPECT_EQ(Place(folder_.Path("plain/x")),
              folder_.Path("plain") + " \"x\" without cache error 2");
    EXPECT_EQ(Place(folder_.Path("away/x")), folder_.Path("away") + " \"x\" error 2");
}

TEST_F(TargetsTest, WhatLiesOnAFileSystemMountedBelowIsNotOnTheVolume) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    const ScopedMount mount = ScopedMount::Tmpfs(volume_ + "/share/deep", 65536);
    ASSERT_TRUE(mount.IsMounted());
    WriteWhole(volume_ + "/share/deep/x", "x");
    EXPECT_EQ(Place(volume_ + "/share/deep/x"), "no volume");
    EXPECT_EQ(Place(volume_ + "/share/deep"), "no volume");
    EXPECT_EQ(Place(volume_ + "/share/a.txt"), "\"share/a.txt\"");
    EXPECT_EQ(Place(volume_ + "/share/deep/gone"), "\"share/deep/gone\" error 2");
}

TEST_F(TargetsTest, WhoMayNotSearchTheWayIsToldSo) {
    SKIP_WITHOUT_ROOT();
    chmod(folder_.Path().c_str(), 0755);
    chmod((volume_ + "/share").c_str(), 0700);
    const OrdinaryUser user;
    EXPECT_EQ(Place(volume_ + "/share/deep/x"), "\"share/deep/x\" error 13");
    EXPECT_EQ(Place(volume_ + "/share/a.txt"), "\"share/a.txt\" error 13");
    EXPECT_EQ(Place(volume_ + "/share"), "\"share\"");
}
} // namespace vesk
