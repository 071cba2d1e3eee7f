// FileReplaceContent where something goes wrong: the old content stays whole, or the file is
// written in place where there can be no other.
#include "files/file_replace.h"

#include "tests/support/private_mounts.h"
#include "tests/unit/files/file_replace_fixture.h"

#include <cerrno>
#include <fcntl.h>

namespace vesk {
namespace {
const bool kPrivateMounts = UsePrivateMounts();

class FileReplaceFailureTest : public FileReplaceTest {
protected:
    void ExpectOldWhole() {
        EXPECT_EQ(ReadWhole(path), old);
        EXPECT_EQ(Names(), onlyTheFile);
    }
    // Replaced, but as the very file that was there.
    void ExpectWrittenInPlace(ino_t before) {
        EXPECT_EQ(ReadWhole(path), fresh);
        EXPECT_EQ(Status(path).st_ino, before);
        EXPECT_EQ(Names(), onlyTheFile);
    }
};
} // namespace

TEST_F(FileReplaceFailureTest, FailedWriteLeavesTheOldContent) {
    for (const int error : {ENOSPC, EDQUOT}) {
        FakeLibc::Fail("write", error);
        EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::NotWritten);
        ExpectOldWhole();
    }
    for (const int error : {EIO, EFBIG}) {
        FakeLibc::Fail("write", error);
        EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::CannotOpen);
        ExpectOldWhole();
    }
}

TEST_F(FileReplaceFailureTest, WriteThatFailsHalfwayLeavesTheOldContent) {
    FakeLibc::Limit("write", 3);
    FakeLibc::Fail("write", ENOSPC, 2);
    EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::NotWritten);
    ExpectOldWhole();
}

TEST_F(FileReplaceFailureTest, WriteThatGivesNothingLeavesTheOldContent) {
    FakeLibc::Limit("write", 0);
    EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::NotWritten);
    ExpectOldWhole();
}

TEST_F(FileReplaceFailureTest, FailedSyncLeavesTheOldContent) {
    for (const int error : {EIO, ENOSPC}) {
        FakeLibc::Fail("fsync", error);
        EXPECT_EQ(FileReplaceContent(path.c_str(), fresh),
                  error == EIO ? FileReplaceResult::CannotOpen : FileReplaceResult::NotWritten);
        ExpectOldWhole();
    }
}

TEST_F(FileReplaceFailureTest, FolderThatCannotBeSyncedIsLeftToItsOwnWays) {
    FakeLibc::Fail("fsync", EINVAL, 2);
    EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_EQ(ReadWhole(path), fresh);
}

TEST_F(FileReplaceFailureTest, RenameThatFailsIsFollowedByWritingInPlace) {
    for (const int error : {EACCES, EPERM, EROFS, EBUSY, EXDEV, ENOSPC, EDQUOT, EIO, ENOMEM}) {
        WriteWhole(path, old);
        const ino_t before = Status(path).st_ino;
        FakeLibc::Fail("rename", error);
        EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::Done);
        ExpectWrittenInPlace(before);
    }
}

TEST_F(FileReplaceFailureTest, OwnerThatCannotBeGivenIsFollowedByWritingInPlace) {
    SKIP_WITHOUT_ROOT();
    ASSERT_EQ(chown(path.c_str(), 1234, 5678), 0);
    const ino_t before = Status(path).st_ino;
    FakeLibc::Fail("fchown", EPERM);
    EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::Done);
    ExpectWrittenInPlace(before);
    EXPECT_EQ(Status(path).st_uid, 1234U);
    EXPECT_EQ(Status(path).st_gid, 5678U);
}

TEST_F(FileReplaceFailureTest, FailedWriteInPlaceIsReported) {
    FakeLibc::Fail("rename", EACCES);
    FakeLibc::Fail("write", EIO, 2);
    EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::CannotOpen);
    ExpectOldWhole();
}

TEST_F(FileReplaceFailureTest, LongerContentIsNotWrittenInPlaceWithoutItsRoom) {
    const std::string longer(10000, 'x');
    const ino_t before = Status(path).st_ino;
    for (const int nth : {2, 3}) { // of the blanks, none is written, or some
        FakeLibc::Fail("rename", EACCES);
        FakeLibc::Limit("write", 100, 2);
        FakeLibc::Fail("write", ENOSPC, nth);
        EXPECT_EQ(FileReplaceContent(path.c_str(), longer), FileReplaceResult::CannotOpen);
        ExpectOldWhole();
    }
    FakeLibc::Fail("rename", EACCES);
    EXPECT_EQ(FileReplaceContent(path.c_str(), longer), FileReplaceResult::Done);
    EXPECT_EQ(ReadWhole(path), longer);
    EXPECT_EQ(Status(path).st_ino, before);
}

TEST_F(FileReplaceFailureTest, RoomThatTheStorageDoesNotHaveIsNotUsed) {
    // The temporary file's content is synced first, then the blanks.
    for (const int error : {ENOSPC, EDQUOT, EIO}) {
        FakeLibc::Fail("rename", EACCES);
        FakeLibc::Fail("fsync", error, 2);
        EXPECT_EQ(FileReplaceContent(path.c_str(), std::string(10000, 'x')),
                  FileReplaceResult::CannotOpen);
        ExpectOldWhole();
    }
}

TEST_F(FileReplaceFailureTest, ContentInPlaceIsSynced) {
    for (const size_t size : {size_t{10}, size_t{10000}}) {
        FakeLibc::Fail("rename", EACCES);
        // After the temporary file's, the blanks' where there are any.
        FakeLibc::Fail("fsync", EIO, size > old.size() ? 3 : 2);
        EXPECT_EQ(FileReplaceContent(path.c_str(), std::string(size, 'x')),
                  FileReplaceResult::CannotOpen);
        WriteWhole(path, old);
    }
}

TEST_F(FileReplaceFailureTest, CrashBeforeTheContentIsWrittenInPlaceLeavesBlanksBehindTheOld) {
    const std::string longer(old.size() + 5, 'x');
    FakeLibc::Fail("rename", EACCES);
    FakeLibc::Fail("write", EIO, 3);
    EXPECT_EQ(FileReplaceContent(path.c_str(), longer), FileReplaceResult::CannotOpen);
    EXPECT_EQ(ReadWhole(path), old + "     ");
}

TEST_F(FileReplaceFailureTest, NewFileThatCannotBeWrittenIsNotLeftBehind) {
    const std::string created = folder.Path("new");
    FakeLibc::Fail("write", ENOSPC);
    EXPECT_EQ(FileReplaceContent(created.c_str(), fresh), FileReplaceResult::NotWritten);
    EXPECT_EQ(Names(), onlyTheFile);
    FakeLibc::Fail("fsync", EIO);
    EXPECT_EQ(FileReplaceContent(created.c_str(), fresh), FileReplaceResult::CannotOpen);
    EXPECT_EQ(Names(), onlyTheFile);
}

TEST_F(FileReplaceFailureTest, NewFileThatCannotBeRenamedIsWrittenInPlaceOrNotAtAll) {
    const std::string created = folder.Path("new");
    FakeLibc::Fail("rename", EIO);
    FakeLibc::Fail("write", ENOSPC, 2);
    EXPECT_EQ(FileReplaceContent(created.c_str(), fresh), FileReplaceResult::CannotOpen);
    EXPECT_EQ(Names(), onlyTheFile);
    FakeLibc::Fail("rename", EPERM);
    EXPECT_EQ(FileReplaceContent(created.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_EQ(ReadWhole(created), fresh);
    EXPECT_EQ(Names(), (std::vector<std::string>{"file", "new"}));
}

TEST_F(FileReplaceFailureTest, AHundredTemporaryNamesThatAreTakenAreFollowedByWritingInPlace) {
    TakeTemporaryNames(100);
    const ino_t before = Status(path).st_ino;
    EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_EQ(ReadWhole(path), fresh);
    EXPECT_EQ(Status(path).st_ino, before);
    EXPECT_EQ(Names().size(), 101U);
}

TEST_F(FileReplaceFailureTest, FileThatHasNoNameAnyMoreIsWrittenInPlace) {
    const int file = open(path.c_str(), O_RDWR);
    ASSERT_EQ(unlink(path.c_str()), 0);
    const std::string byNumber = "/proc/self/fd/" + std::to_string(file);
    EXPECT_EQ(FileReplaceContent(byNumber.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_EQ(ReadWhole(byNumber), fresh);
    close(file);
    EXPECT_TRUE(Names().empty());
}

TEST_F(FileReplaceFailureTest, PathsThatCannotBeFilesAreNotOpened) {
    const std::string loop = folder.Path("loop");
    ASSERT_EQ(symlink("loop", loop.c_str()), 0);
    for (const std::string &wrong :
         {std::string(), folder.Path(), folder.Path("no/file"), folder.Path("file/below"),
          folder.Path("new/"), loop, folder.Path(std::string(300, 'x'))}) {
        SCOPED_TRACE(wrong);
        EXPECT_EQ(FileReplaceContent(wrong.c_str(), fresh), FileReplaceResult::CannotOpen);
    }
    EXPECT_EQ(Names(), (std::vector<std::string>{"file", "loop"}));
}

TEST_F(FileReplaceFailureTest, LinkThatPointsIntoAMissingFolderIsNotOpened) {
    const std::string link = folder.Path("link");
    ASSERT_EQ(symlink("no/target", link.c_str()), 0);
    EXPECT_EQ(FileReplaceContent(link.c_str(), fresh), FileReplaceResult::CannotOpen);
}

TEST_F(FileReplaceFailureTest, FifoWithoutAReaderDoesNotBlock) {
    const std::string fifo = folder.Path("fifo");
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    EXPECT_EQ(FileReplaceContent(fifo.c_str(), fresh), FileReplaceResult::CannotOpen);
    ASSERT_EQ(symlink("fifo", folder.Path("link").c_str()), 0);
    EXPECT_EQ(FileReplaceContent(folder.Path("link").c_str(), fresh),
              FileReplaceResult::CannotOpen);
    EXPECT_TRUE(S_ISFIFO(Status(fifo).st_mode));
}

TEST_F(FileReplaceFailureTest, FifoWithAReaderTakesWhatItHoldsAndDoesNotBlock) {
    const std::string fifo = folder.Path("fifo");
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    const int reader = open(fifo.c_str(), O_RDONLY | O_NONBLOCK);
    EXPECT_EQ(FileReplaceContent(fifo.c_str(), fresh), FileReplaceResult::Done);
    char text[100] = {};
    EXPECT_EQ(read(reader, text, sizeof(text)), static_cast<ssize_t>(fresh.size()));
    EXPECT_EQ(text, fresh);
    EXPECT_EQ(FileReplaceContent(fifo.c_str(), std::string(1 << 21, 'x')),
              FileReplaceResult::NotWritten);
    close(reader);
}

TEST_F(FileReplaceFailureTest, DevicesAreWrittenAndNotReplaced) {
    SKIP_WITHOUT_PRIVATE_MOUNTS();
    const std::string null = folder.Path("null");
    const std::string full = folder.Path("full");
    ASSERT_TRUE(MakeCharacterDevice(null, 1, 3));
    ASSERT_TRUE(MakeCharacterDevice(full, 1, 7));
    EXPECT_EQ(FileReplaceContent(null.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_EQ(FileReplaceContent(full.c_str(), fresh), FileReplaceResult::NotWritten);
    EXPECT_TRUE(S_ISCHR(Status(null).st_mode));
    EXPECT_TRUE(S_ISCHR(Status(full).st_mode));
}

TEST_F(FileReplaceFailureTest, ReadOnlyFolderOfAnotherUserIsFollowedByWritingInPlace) {
    SKIP_WITHOUT_ROOT();
    ASSERT_EQ(chown(path.c_str(), kNobody, kNobody), 0);
    ASSERT_EQ(chmod(folder.Path().c_str(), 0755), 0);
    const ino_t before = Status(path).st_ino;
    EXPECT_EQ(ReplaceAsNobody(path, fresh), FileReplaceResult::Done);
    ExpectWrittenInPlace(before);
    EXPECT_EQ(ReplaceAsNobody(folder.Path("new"), fresh), FileReplaceResult::CannotOpen);
    EXPECT_EQ(Names(), onlyTheFile);
}

TEST_F(FileReplaceFailureTest, FolderThatCannotBeReadIsFollowedByWritingInPlace) {
    SKIP_WITHOUT_ROOT();
    ASSERT_EQ(chown(path.c_str(), kNobody, kNobody), 0);
    ASSERT_EQ(chmod(folder.Path().c_str(), 0711), 0);
    const ino_t before = Status(path).st_ino;
    EXPECT_EQ(ReplaceAsNobody(path, fresh), FileReplaceResult::Done);
    ExpectWrittenInPlace(before);
}

TEST_F(FileReplaceFailureTest, FileThatMayNotBeWrittenStaysThoughTheFolderWouldAllowIt) {
    SKIP_WITHOUT_ROOT();
    ASSERT_EQ(chown(folder.Path().c_str(), kNobody, kNobody), 0);
    EXPECT_EQ(ReplaceAsNobody(path, fresh), FileReplaceResult::CannotOpen);
    ExpectOldWhole();
}

TEST_F(FileReplaceFailureTest, FileOfAnotherUserKeepsItsOwnerByWritingInPlace) {
    SKIP_WITHOUT_ROOT();
    ASSERT_EQ(chown(folder.Path().c_str(), kNobody, kNobody), 0);
    ASSERT_EQ(chmod(path.c_str(), 0666), 0);
    const ino_t before = Status(path).st_ino;
    EXPECT_EQ(ReplaceAsNobody(path, fresh), FileReplaceResult::Done);
    ExpectWrittenInPlace(before);
    EXPECT_EQ(Status(path).st_uid, 0U);
}

TEST_F(FileReplaceFailureTest, FileThatSomethingIsMountedOverIsWrittenInPlace) {
    SKIP_WITHOUT_PRIVATE_MOUNTS();
    const ScopedMount over = ScopedMount::Bind(path, path);
    ASSERT_TRUE(over.IsMounted());
    const ino_t before = Status(path).st_ino;
    EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::Done);
    ExpectWrittenInPlace(before);
}

TEST_F(FileReplaceFailureTest, FullDiskLeavesTheOldContent) {
    SKIP_WITHOUT_PRIVATE_MOUNTS();
    TempDir disk;
    const ScopedMount tiny = ScopedMount::Tmpfs(disk.Path(), 65536);
    ASSERT_TRUE(tiny.IsMounted());
    WriteWhole(disk.Path("file"), old);
    const std::string large(100000, 'x');
    EXPECT_EQ(FileReplaceContent(disk.Path("file").c_str(), large), FileReplaceResult::NotWritten);
    EXPECT_EQ(ReadWhole(disk.Path("file")), old);
    EXPECT_EQ(FileReplaceContent(disk.Path("new").c_str(), large), FileReplaceResult::NotWritten);
    using Folder = std::filesystem::directory_iterator;
    EXPECT_EQ(std::distance(Folder(disk.Path()), Folder()), 1);
    // With nothing left over there is room for what fits.
    EXPECT_EQ(FileReplaceContent(disk.Path("file").c_str(), fresh), FileReplaceResult::Done);
    EXPECT_EQ(ReadWhole(disk.Path("file")), fresh);
}

TEST_F(FileReplaceFailureTest, DiskWithoutInodesKeepsOneFileAndMakesNone) {
    SKIP_WITHOUT_PRIVATE_MOUNTS();
    TempDir disk;
    const ScopedMount tiny = ScopedMount::Tmpfs(disk.Path(), 65536, 2); // its root and one file
    ASSERT_TRUE(tiny.IsMounted());
    const std::string only = disk.Path("file");
    const std::string link = folder.Path("link");
    ASSERT_EQ(symlink(disk.Path("new").c_str(), link.c_str()), 0);
    WriteWhole(only, old);
    const ino_t before = Status(only).st_ino;
    for (const std::string &content : {fresh, std::string(50000, 'x'), std::string()}) {
        EXPECT_EQ(FileReplaceContent(only.c_str(), content), FileReplaceResult::Done);
        EXPECT_EQ(ReadWhole(only), content);
        EXPECT_EQ(Status(only).st_ino, before);
    }
    WriteWhole(only, old);
    EXPECT_EQ(FileReplaceContent(only.c_str(), std::string(100000, 'x')),
              FileReplaceResult::CannotOpen);
    EXPECT_EQ(ReadWhole(only), old);
    EXPECT_EQ(FileReplaceContent(disk.Path("new").c_str(), fresh), FileReplaceResult::CannotOpen);
    EXPECT_EQ(FileReplaceContent(link.c_str(), fresh), FileReplaceResult::CannotOpen);
    EXPECT_FALSE(std::filesystem::exists(disk.Path("new")));
}

TEST_F(FileReplaceFailureTest, TargetOfALinkThatCannotBeFilledIsNotLeftBehind) {
    SKIP_WITHOUT_PRIVATE_MOUNTS();
    TempDir disk;
    const ScopedMount tiny = ScopedMount::Tmpfs(disk.Path(), 65536);
    ASSERT_TRUE(tiny.IsMounted());
    const std::string link = folder.Path("link");
    ASSERT_EQ(symlink(disk.Path("new").c_str(), link.c_str()), 0);
    EXPECT_EQ(FileReplaceContent(link.c_str(), std::string(100000, 'x')),
              FileReplaceResult::CannotOpen);
    EXPECT_FALSE(std::filesystem::exists(disk.Path("new")));
    EXPECT_EQ(FileReplaceContent(link.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_EQ(ReadWhole(disk.Path("new")), fresh);
}
} // namespace vesk
