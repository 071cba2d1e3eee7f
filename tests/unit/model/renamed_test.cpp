#include "model/renamed.h"

#include "tests/support/look_fixture.h"
#include "tests/support/private_mounts.h"
#include "tests/support/private_world.h"

#include <filesystem>
#include <memory>
#include <sys/stat.h>

namespace vesk {
namespace {
const char kLast[] = "/var/lib/veskpin/last/uuid-1.json";

// The folder of the last good records is this test's own.
class RenamedTest : public LookTest {
protected:
    void SetUp() override {
        LookTest::SetUp();
        SKIP_WITHOUT_PRIVATE_WORLD();
        lib_.reset(new ScopedMount(ScopedMount::Tmpfs("/var/lib", 1 << 20)));
        ASSERT_TRUE(lib_->IsMounted());
        std::filesystem::create_directories("/var/lib/veskpin/last");
        std::filesystem::create_directories(volume_ + "/share");
        world_.volume.mountPath = volume_;
        world_.volume.isMounted = true;
        world_.volume.uuid = "uuid-1";
        if (Make("probe").birth == 0) {
            GTEST_SKIP() << "this file system keeps no birth times";
        }
    }
    FileStat Make(const std::string &relativePath) const {
        WriteWhole(volume_ + "/" + relativePath, "x");
        FileStat status{};
        EXPECT_EQ(FileLooker(volume_).Stat(relativePath, &status), 0);
        return status;
    }
    void Rename(const std::string &from, const std::string &to) const {
        std::filesystem::rename(volume_ + "/" + from, volume_ + "/" + to);
    }
    // The file is recorded, and its birth in the last copy.
    void Record(const std::string &relativePath, const FileStat &status, int64_t birth) {
        world_.known.files.push_back({relativePath, Low(status), kRequestUnknown});
        if (!copy_.empty()) {
            copy_ += ", ";
        }
        copy_ += R"({"path": "x", "inode": )" + std::to_string(Low(status)) + R"(, "birth": )" +
                 std::to_string(birth) + "}";
        WriteWhole(kLast, R"({"files": [)" + copy_ + "]}");
    }
    static uint32_t Low(const FileStat &status) { return static_cast<uint32_t>(status.inode); }
    RenamedFiles Find() {
        errors_ = {};
        return RenamedFind(world_, ProgressForm::None, &errors_);
    }

    const TempDir folder_;
    const std::string volume_ = folder_.Path("volume1");
    std::unique_ptr<ScopedMount> lib_;
    WorldVolume world_;
    std::string copy_;
    LookErrors errors_;
};
} // namespace

TEST_F(RenamedTest, AFileThatLeftItsPathIsFoundByInodeAndBirth) {
    const FileStat moved = Make("a");
    const FileStat stays = Make("b");
    Record("a", moved, moved.birth);
    Record("b", stays, stays.birth);
    Rename("a", "share/now");
    ASSERT_EQ(mkfifo((volume_ + "/fifo").c_str(), 0600), 0);
    EXPECT_EQ(Find(), (RenamedFiles{{Low(moved), "share/now"}}));
    Make("a"); // another file at the old path
    EXPECT_EQ(Find(), (RenamedFiles{{Low(moved), "share/now"}}));
    EXPECT_EQ(TextsOf(errors_), Texts{});
}

TEST_F(RenamedTest, AFileOfAnotherBirthOnlyGotTheInode) {
    const FileStat moved = Make("a");
    Record("a", moved, moved.birth - 1);
    Rename("a", "now");
    EXPECT_EQ(Find(), RenamedFiles{});
}

TEST_F(RenamedTest, WithoutABirthInTheCopyNothingIsFound) {
    const FileStat moved = Make("a");
    Record("a", moved, 0);
    Rename("a", "now");
    EXPECT_EQ(Find(), RenamedFiles{});
    WriteWhole(kLast, R"({"files": [{"path": "a", "inode": )" + std::to_string(Low(moved)) + "}]}");
    EXPECT_EQ(Find(), RenamedFiles{});
    WriteWhole(kLast,
               R"({"files": [{"path": "a", "birth": )" + std::to_string(moved.birth) + "}]}");
    EXPECT_EQ(Find(), RenamedFiles{});
    std::filesystem::remove(kLast);
    EXPECT_EQ(Find(), RenamedFiles{});
    EXPECT_EQ(TextsOf(errors_), Texts{});
}

TEST_F(RenamedTest, ACopyThatCannotBeUsedIsTold) {
    WriteWhole(kLast, "{");
    EXPECT_EQ(Find(), RenamedFiles{});
    EXPECT_EQ(TextsOf(errors_), (Texts{std::string(kLast) + ": no copy of records", "unknown"}));
    std::filesystem::remove(kLast);
    ASSERT_EQ(mkfifo(kLast, 0600), 0);
    EXPECT_EQ(Find(), RenamedFiles{});
    EXPECT_EQ(TextsOf(errors_), (Texts{std::string(kLast) + ": Invalid argument", "unknown"}));
}

TEST_F(RenamedTest, OfAVolumeThatCannotBeLookedAtNothingIsFound) {
    const FileStat moved = Make("a");
    Record("a", moved, moved.birth);
    Rename("a", "now");
    world_.volume.isMounted = false;
    EXPECT_EQ(Find(), RenamedFiles{});
    world_.volume.isMounted = true;
    world_.volume.uuid = std::nullopt;
    EXPECT_EQ(Find(), RenamedFiles{});
    world_.volume.uuid = "uuid-1";
    EXPECT_EQ(Find().size(), 1U);
    world_.volume.mountPath = folder_.Path("gone");
    EXPECT_EQ(Find(), RenamedFiles{});
}

TEST_F(RenamedTest, OnlyFilesAreFoundAndOnlyRecordedOnes) {
    const FileStat moved = Make("a");
    Record("a", moved, moved.birth);
    world_.known.files.push_back({"asked", std::nullopt, kRequestPinFiles});
    const FileStat other = Make("other");
    world_.known.files.clear(); // the copy has more than the records
    EXPECT_EQ(Find(), RenamedFiles{});
    world_.known.files.push_back({"gone", Low(other), kRequestUnknown});
    EXPECT_EQ(Find(), RenamedFiles{}); // recorded, and not in the copy
}
} // namespace vesk
