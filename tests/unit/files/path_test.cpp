#include "files/path.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/temp_dir.h"

#include <cerrno>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

namespace vesk {
namespace {
class PathTest : public LeakCheckedTest {
protected:
    std::string Make(mode_t type, dev_t device = 0) {
        const std::string path = folder.Path("node");
        unlink(path.c_str());
        return mknod(path.c_str(), type | 0600, device) == 0 ? path : "";
    }
    std::string LinkTo(const std::string &target) {
        const std::string link = folder.Path("link");
        EXPECT_EQ(symlink(target.c_str(), link.c_str()), 0);
        return link;
    }
    TempDir folder;
    const std::string missing = folder.Path("missing");
};
} // namespace

TEST_F(PathTest, SizeIsThatOfTheFile) {
    CapturedLog log(3);
    const std::string path = folder.Path("file");
    uint64_t size = 0;
    WriteWhole(path, "12345");
    EXPECT_EQ(FileGetSizeByte(path.c_str(), &size), 0);
    EXPECT_EQ(size, 5U);
    WriteWhole(path, "");
    EXPECT_EQ(FileGetSizeByte(path.c_str(), &size), 0);
    EXPECT_EQ(size, 0U);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(PathTest, SizePast4GiBIsWhole) {
    CapturedLog log;
    const std::string path = folder.Path("file");
    WriteWhole(path, "");
    ASSERT_EQ(truncate(path.c_str(), (1LL << 32) + 1), 0);
    uint64_t size = 0;
    EXPECT_EQ(FileGetSizeByte(path.c_str(), &size), 0);
    EXPECT_EQ(size, 4294967297U);
}

TEST_F(PathTest, SizeOfALinkIsThatOfItsTarget) {
    CapturedLog log;
    WriteWhole(folder.Path("file"), "123");
    uint64_t size = 0;
    EXPECT_EQ(FileGetSizeByte(LinkTo(folder.Path("file")).c_str(), &size), 0);
    EXPECT_EQ(size, 3U);
}

TEST_F(PathTest, SizeOfNothingFails) {
    CapturedLog log(2);
    uint64_t size = 9;
    EXPECT_EQ(FileGetSizeByte("/no/such", &size), -1);
    EXPECT_EQ(log.Messages(),
              std::vector<std::string>{
                  "FileGetSizeByte() [N] : ***** Can't get file (/no/such) stat result"});
    EXPECT_EQ(size, 9U);
}

TEST_F(PathTest, InodeNumberIsThatOfTheFile) {
    CapturedLog log(3);
    struct stat status {};
    ASSERT_EQ(stat(folder.Path().c_str(), &status), 0);
    uint32_t inode = 0;
    EXPECT_EQ(FileGetInodeNumber(folder.Path().c_str(), &inode), 0);
    EXPECT_EQ(inode, static_cast<uint32_t>(status.st_ino));
    EXPECT_EQ(FileGetInodeNumber(LinkTo(folder.Path()).c_str(), &inode), 0);
    EXPECT_EQ(inode, static_cast<uint32_t>(status.st_ino));
    EXPECT_EQ(log.Text(), "");
}

TEST_F(PathTest, InodeNumberIsCutTo32Bits) {
    CapturedLog log;
    FakeLibc::onStat = [](struct stat *status) {
        status->st_ino = static_cast<ino_t>(0x500000007ULL);
    };
    uint32_t inode = 0;
    EXPECT_EQ(FileGetInodeNumber("/", &inode), 0);
    EXPECT_EQ(inode, 7U);
}

TEST_F(PathTest, InodeNumberOfNothingFails) {
    CapturedLog log(2);
    uint32_t inode = 9;
    EXPECT_EQ(FileGetInodeNumber("/no/such", &inode), -1);
    EXPECT_EQ(log.Messages(), std::vector<std::string>{
                                  "FileGetInodeNumber() [N] : ***** Stat file /no/such error"});
    EXPECT_EQ(inode, 9U);
}

TEST_F(PathTest, ExistsIsSilent) {
    CapturedLog log(3);
    EXPECT_EQ(PathExists("/"), 1);
    EXPECT_EQ(PathExists("/dev/null"), 1);
    EXPECT_EQ(PathExists(missing.c_str()), 0);
    EXPECT_EQ(PathExists(""), 0);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(PathTest, LinkThatPointsNowhereDoesNotExist) {
    CapturedLog log;
    EXPECT_EQ(PathExists(LinkTo(missing).c_str()), 0);
}

TEST_F(PathTest, LinkItselfExistsAndIsNoFile) {
    CapturedLog log(3);
    const std::string link = LinkTo(missing);
    uint64_t size = 0;
    EXPECT_EQ(PathExists(link.c_str(), LastLink::Itself), 1);
    EXPECT_EQ(PathIsMissing(link.c_str(), LastLink::Itself), 0);
    EXPECT_EQ(PathIsMissing(link.c_str()), 1);
    EXPECT_EQ(PathIsFile(link.c_str(), LastLink::Itself), 0);
    EXPECT_EQ(FileGetSizeByte(link.c_str(), &size, LastLink::Itself), 0);
    EXPECT_EQ(size, missing.size());
    EXPECT_EQ(log.Text(), "");
    EXPECT_EQ(PathExists(missing.c_str(), LastLink::Itself), 0);
    EXPECT_EQ(PathIsMissing(missing.c_str(), LastLink::Itself), 1);
    WriteWhole(missing, "");
    EXPECT_EQ(PathIsFile(link.c_str(), LastLink::Itself), 0);
    EXPECT_EQ(PathIsFile(missing.c_str(), LastLink::Itself), 1);
}

// A 32-bit platform's own times reach from 1901 to 2038.
TEST_F(PathTest, FilesOfEveryDateAreFiles) {
    CapturedLog log(3);
    const std::string path = folder.Path("file");
    WriteWhole(path, "12345");
    for (const int64_t date : kFarDates) {
        DateFile(path, date);
        uint64_t size = 0;
        uint32_t inode = 0;
        EXPECT_EQ(PathExists(path.c_str()), 1);
        EXPECT_EQ(PathIsMissing(path.c_str()), 0);
        EXPECT_EQ(PathIsFile(path.c_str()), 1);
        EXPECT_EQ(FileGetSizeByte(path.c_str(), &size), 0);
        EXPECT_EQ(size, 5U);
        EXPECT_EQ(FileGetInodeNumber(path.c_str(), &inode), 0);
    }
    EXPECT_EQ(log.Text(), "");
}

TEST_F(PathTest, PlainFileIsAFileAndNoFolder) {
    CapturedLog log(3);
    const std::string path = Make(S_IFREG);
    EXPECT_EQ(PathIsFile(path.c_str()), 1);
    EXPECT_EQ(PathIsDir(path.c_str()), 0);
    EXPECT_EQ(PathIsFile(LinkTo(path).c_str()), 1);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(PathTest, FolderIsAFolderAndNoFile) {
    CapturedLog log(3);
    EXPECT_EQ(PathIsFile(folder.Path().c_str()), 0);
    EXPECT_EQ(PathIsDir(folder.Path().c_str()), 1);
    EXPECT_EQ(PathIsDir(LinkTo(folder.Path()).c_str()), 1);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(PathTest, SocketCountsAsAFile) {
    CapturedLog log;
    const std::string path = Make(S_IFSOCK);
    EXPECT_EQ(PathIsFile(path.c_str()), 1);
    EXPECT_EQ(PathIsDir(path.c_str()), 1); // a socket's type has the folder's bit, too
}

TEST_F(PathTest, FifoAndCharacterDeviceAreNeither) {
    CapturedLog log;
    for (const std::string &path : {Make(S_IFIFO), std::string("/dev/null")}) {
        EXPECT_EQ(PathIsFile(path.c_str()), 0);
        EXPECT_EQ(PathIsDir(path.c_str()), 0);
    }
}

TEST_F(PathTest, BlockDeviceCountsAsAFolder) {
    CapturedLog log;
    const std::string path = Make(S_IFBLK, makedev(7, 0));
    if (path.empty()) {
        GTEST_SKIP() << "making a block device node needs root";
    }
    EXPECT_EQ(PathIsFile(path.c_str()), 0);
    EXPECT_EQ(PathIsDir(path.c_str()), 1);
}

TEST_F(PathTest, OnlyWhatIsNotThereIsMissing) {
    CapturedLog log(3);
    EXPECT_EQ(PathIsMissing("/no/such"), 1);
    EXPECT_EQ(PathIsMissing("/dev/null/below"), 1);
    EXPECT_EQ(PathIsMissing(("/" + std::string(300, 'x')).c_str()), 1);
    EXPECT_EQ(PathIsMissing("/"), 0);
    for (const int error : {EIO, ENOMEM, EACCES}) {
        FakeLibc::Fail("stat", error);
        EXPECT_EQ(PathIsMissing("/no/such"), 0);
    }
    EXPECT_EQ(log.Messages(), std::vector<std::string>{});
}

TEST_F(PathTest, NothingIsNeitherAndSaysSo) {
    CapturedLog log(2);
    EXPECT_EQ(PathIsFile("/no/such"), 0);
    EXPECT_EQ(PathIsDir("/no/such"), 0);
    EXPECT_EQ(log.Messages(),
              (std::vector<std::string>{"PathIsFile() [N] : ***** Path (/no/such) doesn't exist",
                                        "PathIsDir() [N] : ***** Path (/no/such) doesn't exist"}));
}
} // namespace vesk
