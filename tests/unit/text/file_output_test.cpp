#include "text/file_output.h"

#include "tests/support/temp_dir.h"

#include <gtest/gtest.h>

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>

namespace vesk {
namespace {
class FileOutputTest : public testing::Test {
protected:
    // How many entries the folder has: nothing may be left beside the file.
    long Entries() const {
        return std::distance(std::filesystem::directory_iterator(folder_.Path()),
                             std::filesystem::directory_iterator());
    }
    TempDir folder_;
    const std::string path_ = folder_.Path("figures.prom");
};
} // namespace

TEST_F(FileOutputTest, MakesAFileThatOthersMayReadWhateverTheUmask) {
    const mode_t old = umask(077);
    EXPECT_EQ(FileOutputReplace(path_, "1\n"), 0);
    umask(old);
    struct stat status {};
    ASSERT_EQ(stat(path_.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777U, 0644U);
    EXPECT_EQ(ReadWhole(path_), "1\n");
    EXPECT_EQ(Entries(), 1);
}

TEST_F(FileOutputTest, TakesAnotherFilesPlaceAndLeavesThatOneAlone) {
    WriteWhole(path_, "old");
    ASSERT_EQ(chmod(path_.c_str(), 0666), 0);
    const std::string kept = folder_.Path("kept");
    ASSERT_EQ(link(path_.c_str(), kept.c_str()), 0);
    EXPECT_EQ(FileOutputReplace(path_, "new"), 0);
    EXPECT_EQ(ReadWhole(path_), "new");
    EXPECT_EQ(ReadWhole(kept), "old");
    struct stat status {};
    ASSERT_EQ(stat(path_.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777U, 0644U);
}

TEST_F(FileOutputTest, RefusesWhatIsNoRegularFile) {
    const std::string target = folder_.Path("target");
    WriteWhole(target, "secret");
    ASSERT_EQ(symlink(target.c_str(), path_.c_str()), 0);
    EXPECT_EQ(FileOutputReplace(path_, "new"), EINVAL);
    EXPECT_EQ(ReadWhole(target), "secret");
    ASSERT_EQ(unlink(path_.c_str()), 0);
    ASSERT_EQ(mkfifo(path_.c_str(), 0600), 0);
    EXPECT_EQ(FileOutputReplace(path_, "new"), EINVAL);
    ASSERT_EQ(unlink(path_.c_str()), 0);
    ASSERT_EQ(mkdir(path_.c_str(), 0700), 0);
    EXPECT_EQ(FileOutputReplace(path_, "new"), EINVAL);
}

TEST_F(FileOutputTest, LeavesSomebodyElsesTemporaryFileAlone) {
    const std::string temporary = folder_.Path(".veskpin." + std::to_string(getpid()) + ".tmp");
    ASSERT_EQ(symlink("/etc/passwd", temporary.c_str()), 0);
    EXPECT_EQ(FileOutputReplace(path_, "new"), EEXIST);
    EXPECT_EQ(Entries(), 1);
}

TEST_F(FileOutputTest, SaysWhyItCannotWrite) {
    EXPECT_EQ(FileOutputReplace(folder_.Path("gone/file"), "new"), ENOENT);
    EXPECT_EQ(FileOutputReplace(folder_.Path() + "/", "new"), ENOENT);
    EXPECT_EQ(Entries(), 0);
}

TEST_F(FileOutputTest, ABareNameIsInTheCurrentFolder) {
    const std::filesystem::path before = std::filesystem::current_path();
    std::filesystem::current_path(folder_.Path());
    EXPECT_EQ(FileOutputReplace("figures.prom", "new"), 0);
    std::filesystem::current_path(before);
    EXPECT_EQ(ReadWhole(path_), "new");
}
} // namespace vesk
