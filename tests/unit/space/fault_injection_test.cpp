#include "space/fault_injection.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/ordinary_user.h"
#include "tests/support/private_mounts.h"
#include "tests/support/recorded_opens.h"
#include "tests/support/temp_dir.h"

#include <cerrno>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
const bool kPrivateMounts = UsePrivateMounts();
const char kControlFile[] = "/tmp/veskcachepinfiletool.debug";
const char kFile[] = "/volume1/photo/a.jpg";
const char kNoLine[] = "FileReadString() [N] : ***** Can't get a line from file "
                       "(/tmp/veskcachepinfiletool.debug)";

class FileSimulateGetMappingFailedTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        SKIP_WITHOUT_PRIVATE_MOUNTS();
        LeakCheckedTest::SetUp();
    }
    void TearDown() override {
        if (!PrivateMountsMissing().empty()) {
            return;
        }
        std::filesystem::remove(kControlFile);
        LeakCheckedTest::TearDown();
    }
    static int WithControl(const std::string &content, const std::string &path = kFile) {
        WriteWhole(kControlFile, content);
        return FileSimulateGetMappingFailed(path);
    }
};
} // namespace

TEST_F(FileSimulateGetMappingFailedTest, NothingFailsWithoutAControlFile) {
    CapturedLog log(3);
    EXPECT_EQ(FileSimulateGetMappingFailed(kFile), 0);
    EXPECT_EQ(FileSimulateGetMappingFailed(""), 0);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(FileSimulateGetMappingFailedTest, ThePathOfTheFileMatches) {
    CapturedLog log(2);
    EXPECT_EQ(WithControl("/volume1/photo/a.jpg"), 1);
    EXPECT_EQ(log.Messages(),
              std::vector<std::string>{"FileReadString() [N]: Get text = /volume1/photo/a.jpg"});
}

TEST_F(FileSimulateGetMappingFailedTest, OneLineFeedIsIgnoredTwoAreNot) {
    CapturedLog log;
    EXPECT_EQ(WithControl("/volume1/photo/a.jpg\n"), 1);
    EXPECT_EQ(WithControl("/volume1/photo/a.jpg\n\n"), 0);
    EXPECT_EQ(WithControl("\n/volume1/photo/a.jpg"), 0);
    EXPECT_EQ(WithControl("/volume1/photo/a.jpg\r\n"), 0);
    EXPECT_EQ(WithControl("/volume1/photo/a.jpg\n/volume1/photo/b.jpg\n"), 0);
}

TEST_F(FileSimulateGetMappingFailedTest, ThePathIsComparedWhole) {
    CapturedLog log;
    EXPECT_EQ(WithControl("/volume1/photo/a.jp"), 0);
    EXPECT_EQ(WithControl("/volume1/photo/a.jpg2"), 0);
    EXPECT_EQ(WithControl("/volume1/photo/A.jpg"), 0);
    EXPECT_EQ(WithControl("photo/a.jpg"), 0);
    EXPECT_EQ(WithControl(" /volume1/photo/a.jpg"), 0);
    EXPECT_EQ(WithControl(std::string("/volume1/photo/a.jpg\0", 21)), 0);
}

TEST_F(FileSimulateGetMappingFailedTest, EmptyControlFileMatchesNoFile) {
    {
        CapturedLog log(3);
        EXPECT_EQ(WithControl("", ""), 0);
        EXPECT_EQ(log.Messages(), std::vector<std::string>{kNoLine});
    }
    CapturedLog log;
    EXPECT_EQ(WithControl("\n"), 0);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(FileSimulateGetMappingFailedTest, LongPathsAreComparedWhole) {
    CapturedLog log;
    const std::string path = "/" + std::string(4000, 'x');
    EXPECT_EQ(WithControl(path + "\n", path), 1);
    EXPECT_EQ(WithControl(path + "y\n", path), 0);
    EXPECT_EQ(WithControl(path + std::string(100000, 'y'), path), 0);
}

TEST_F(FileSimulateGetMappingFailedTest, ControlFileThatComesInPiecesIsReadWhole) {
    CapturedLog log;
    FakeLibc::Limit("read", 5);
    EXPECT_EQ(WithControl("/volume1/photo/a.jpg\n"), 1);
}

TEST_F(FileSimulateGetMappingFailedTest, ControlFileIsOpenedForReadingWithoutWaiting) {
    CapturedLog log;
    const RecordedOpens opens;
    EXPECT_EQ(WithControl("/volume1/photo/a.jpg\n"), 1);
    EXPECT_EQ(opens.FlagsOf(kControlFile),
              std::vector<int>{O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC});
}

TEST_F(FileSimulateGetMappingFailedTest, ControlFileIsReadAnewEveryTime) {
    CapturedLog log;
    EXPECT_EQ(WithControl("/volume1/photo/a.jpg\n"), 1);
    EXPECT_EQ(WithControl("/volume1/photo/b.jpg\n"), 0);
    std::filesystem::remove(kControlFile);
    EXPECT_EQ(FileSimulateGetMappingFailed(kFile), 0);
}

TEST_F(FileSimulateGetMappingFailedTest, LinkToAControlFileIsFollowed) {
    CapturedLog log;
    const TempDir folder;
    WriteWhole(folder.Path("control"), "/volume1/photo/a.jpg\n");
    ASSERT_EQ(symlink(folder.Path("control").c_str(), kControlFile), 0);
    EXPECT_EQ(FileSimulateGetMappingFailed(kFile), 1);
}

TEST_F(FileSimulateGetMappingFailedTest, FifoDoesNotBlockAndCountsAsAbsent) {
    CapturedLog log(3);
    ASSERT_EQ(mkfifo(kControlFile, 0666), 0);
    EXPECT_EQ(FileSimulateGetMappingFailed(kFile), 0);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(FileSimulateGetMappingFailedTest, FolderSocketAndDeviceCountAsAbsent) {
    CapturedLog log(3);
    ASSERT_EQ(mkdir(kControlFile, 0777), 0);
    EXPECT_EQ(FileSimulateGetMappingFailed(kFile), 0);
    std::filesystem::remove(kControlFile);
    ASSERT_EQ(mknod(kControlFile, S_IFSOCK | 0666, 0), 0);
    EXPECT_EQ(FileSimulateGetMappingFailed(kFile), 0);
    std::filesystem::remove(kControlFile);
    ASSERT_EQ(symlink("/dev/zero", kControlFile), 0);
    EXPECT_EQ(FileSimulateGetMappingFailed(kFile), 0);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(FileSimulateGetMappingFailedTest, ControlFileThatCannotBeReadCountsAsAbsent) {
    CapturedLog log(3);
    FakeLibc::Fail("read", EIO);
    EXPECT_EQ(WithControl("/volume1/photo/a.jpg\n"), 0);
    EXPECT_EQ(log.Messages(), std::vector<std::string>{kNoLine});
}

TEST_F(FileSimulateGetMappingFailedTest, ControlFileThatBreaksOffCountsAsAbsent) {
    CapturedLog log(3);
    FakeLibc::Limit("read", 20);
    FakeLibc::Fail("read", EIO, 2);
    EXPECT_EQ(WithControl("/volume1/photo/a.jpg\n"), 0);
    EXPECT_EQ(log.Messages(), std::vector<std::string>{kNoLine});
}

TEST_F(FileSimulateGetMappingFailedTest, ControlFileWithoutPermissionCountsAsAbsent) {
    WriteWhole(kControlFile, "/volume1/photo/a.jpg\n");
    ASSERT_EQ(chmod(kControlFile, 0600), 0);
    CapturedLog log(3);
    {
        const OrdinaryUser user;
        EXPECT_EQ(FileSimulateGetMappingFailed(kFile), 0);
    }
    EXPECT_EQ(log.Messages(),
              std::vector<std::string>{"FileReadString() [N] : ***** Can't open file "
                                       "(/tmp/veskcachepinfiletool.debug)"});
}

TEST_F(FileSimulateGetMappingFailedTest, ComparisonIsToldAtLevel3) {
    CapturedLog log(3);
    EXPECT_EQ(WithControl("/volume1/photo/a.jpg\n"), 1);
    EXPECT_EQ(WithControl("/other"), 0);
    EXPECT_EQ(log.Messages(),
              (std::vector<std::string>{
                  "FileReadString() [N]: Get text = /volume1/photo/a.jpg\\x0a",
                  "FileSimulateGetMappingFailed() [N]: Simulate error file=/volume1/photo/a.jpg "
                  "failed failed=/volume1/photo/a.jpg ret=1",
                  "FileReadString() [N]: Get text = /other",
                  "FileSimulateGetMappingFailed() [N]: Simulate error file=/volume1/photo/a.jpg "
                  "failed failed=/other ret=0"}));
}
} // namespace vesk
