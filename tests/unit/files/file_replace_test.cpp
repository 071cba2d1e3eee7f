// What FileReplaceContent leaves behind when all goes well.
#include "files/file_replace.h"

#include "tests/unit/files/file_replace_fixture.h"

#include <fcntl.h>

namespace vesk {
TEST_F(FileReplaceTest, ReplacesTheContentWhole) {
    for (const std::string &content :
         {fresh, std::string(), std::string("a\0b", 3), std::string(1000000, 'x')}) {
        EXPECT_EQ(FileReplaceContent(path.c_str(), content), FileReplaceResult::Done);
        EXPECT_EQ(ReadWhole(path), content);
    }
    EXPECT_EQ(Names(), onlyTheFile);
}

TEST_F(FileReplaceTest, WritesAnotherFileAndRenamesIt) {
    const ino_t before = Status(path).st_ino;
    const int reader = open(path.c_str(), O_RDONLY);
    EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_NE(Status(path).st_ino, before);
    // Whoever has the old file open still reads it whole.
    char text[100] = {};
    EXPECT_EQ(read(reader, text, sizeof(text)), static_cast<ssize_t>(old.size()));
    EXPECT_EQ(text, old);
    close(reader);
}

TEST_F(FileReplaceTest, SyncsTheFileBeforeItsRenameAndTheFolderAfterIt) {
    FakeLibc::Count("fsync");
    FakeLibc::Count("rename");
    EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_EQ(FakeLibc::Calls("fsync"), 2);
    EXPECT_EQ(FakeLibc::Calls("rename"), 1);
}

TEST_F(FileReplaceTest, KeepsTheMode) {
    umask(077);
    for (const mode_t mode : {0600U, 0640U, 0666U, 0755U, 01640U}) {
        ASSERT_EQ(chmod(path.c_str(), mode), 0);
        EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::Done);
        EXPECT_EQ(Status(path).st_mode & 07777, mode);
    }
}

TEST_F(FileReplaceTest, KeepsTheOwnerAndTheSetIdBits) {
    SKIP_WITHOUT_ROOT();
    ASSERT_EQ(chown(path.c_str(), 1234, 5678), 0);
    ASSERT_EQ(chmod(path.c_str(), 06751), 0);
    EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_EQ(Status(path).st_uid, 1234U);
    EXPECT_EQ(Status(path).st_gid, 5678U);
    EXPECT_EQ(Status(path).st_mode & 07777, 06751U);
    EXPECT_EQ(ReadWhole(path), fresh);
}

TEST_F(FileReplaceTest, NewFileHasTheModeThatTheMaskLeaves) {
    const std::string created = folder.Path("new");
    for (const mode_t mask : {0U, 022U, 077U}) {
        umask(mask);
        EXPECT_EQ(FileReplaceContent(created.c_str(), fresh), FileReplaceResult::Done);
        EXPECT_EQ(Status(created).st_mode & 07777, 0666 & ~mask);
        EXPECT_EQ(ReadWhole(created), fresh);
        EXPECT_EQ(unlink(created.c_str()), 0);
    }
    EXPECT_EQ(Names(), onlyTheFile);
}

TEST_F(FileReplaceTest, LinkStaysALinkAndItsTargetIsReplaced) {
    const std::string link = folder.Path("link");
    const std::string chain = folder.Path("chain");
    ASSERT_EQ(symlink("file", link.c_str()), 0);
    ASSERT_EQ(symlink(link.c_str(), chain.c_str()), 0);
    EXPECT_EQ(FileReplaceContent(chain.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_TRUE(S_ISLNK(Status(link).st_mode));
    EXPECT_TRUE(S_ISLNK(Status(chain).st_mode));
    EXPECT_EQ(ReadWhole(path), fresh);
    EXPECT_EQ(Names(), (std::vector<std::string>{"chain", "file", "link"}));
}

TEST_F(FileReplaceTest, LinkIntoAnotherFolderReplacesTheFileThere) {
    TempDir elsewhere;
    const std::string target = elsewhere.Path("target");
    const std::string link = folder.Path("link");
    WriteWhole(target, old);
    ASSERT_EQ(symlink(target.c_str(), link.c_str()), 0);
    EXPECT_EQ(FileReplaceContent(link.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_TRUE(S_ISLNK(Status(link).st_mode));
    EXPECT_EQ(ReadWhole(target), fresh);
}

TEST_F(FileReplaceTest, LinkThatPointsNowhereCreatesItsTarget) {
    const std::string link = folder.Path("link");
    ASSERT_EQ(symlink("target", link.c_str()), 0);
    EXPECT_EQ(FileReplaceContent(link.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_TRUE(S_ISLNK(Status(link).st_mode));
    EXPECT_EQ(ReadWhole(folder.Path("target")), fresh);
    EXPECT_EQ(Names(), (std::vector<std::string>{"file", "link", "target"}));
}

TEST_F(FileReplaceTest, RelativePathIsTakenFromTheWorkingFolder) {
    const int before = open(".", O_RDONLY | O_DIRECTORY);
    ASSERT_EQ(chdir(folder.Path().c_str()), 0);
    EXPECT_EQ(FileReplaceContent("file", fresh), FileReplaceResult::Done);
    EXPECT_EQ(FileReplaceContent("new", fresh), FileReplaceResult::Done);
    ASSERT_EQ(fchdir(before), 0);
    close(before);
    EXPECT_EQ(ReadWhole(path), fresh);
    EXPECT_EQ(ReadWhole(folder.Path("new")), fresh);
}

TEST_F(FileReplaceTest, LeftoversOfADeadProcessAreNoHindrance) {
    TakeTemporaryNames(99);
    EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_EQ(ReadWhole(path), fresh);
    EXPECT_EQ(Names().size(), 100U);
}

TEST_F(FileReplaceTest, ShortWritesAreContinued) {
    FakeLibc::Limit("write", 3);
    EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_EQ(ReadWhole(path), fresh);
    EXPECT_EQ(FakeLibc::Calls("write"), 2);
}

TEST_F(FileReplaceTest, InterruptedWriteIsRepeated) {
    FakeLibc::Fail("write", EINTR);
    EXPECT_EQ(FileReplaceContent(path.c_str(), fresh), FileReplaceResult::Done);
    EXPECT_EQ(ReadWhole(path), fresh);
}
} // namespace vesk
