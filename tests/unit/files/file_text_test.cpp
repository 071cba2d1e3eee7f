#include "files/file_text.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/ordinary_user.h"
#include "tests/support/private_mounts.h"
#include "tests/support/recorded_opens.h"
#include "tests/support/temp_dir.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

namespace vesk {
namespace {
class FileTextTest : public LeakCheckedTest {
protected:
    // The text that FileReadString finds in a file with this content.
    std::string FirstLineOf(const std::string &content) {
        WriteWhole(path, content);
        std::string text = "before";
        EXPECT_EQ(FileReadString(path.c_str(), &text), 0);
        return text;
    }
    TempDir folder;
    const std::string path = folder.Path("file");
};
} // namespace

TEST_F(FileTextTest, WritesTheTextAndNothingElse) {
    CapturedLog log;
    EXPECT_EQ(FileWriteString(path.c_str(), "12345"), 0);
    EXPECT_EQ(ReadWhole(path), "12345");
    EXPECT_EQ(log.Text(), "");
}

TEST_F(FileTextTest, EmptiesALongerFileFirst) {
    CapturedLog log;
    WriteWhole(path, "a longer text than the new one");
    EXPECT_EQ(FileWriteString(path.c_str(), "1"), 0);
    EXPECT_EQ(ReadWhole(path), "1");
}

TEST_F(FileTextTest, WritesBehindTheOldContentWhereThatIsKept) {
    CapturedLog log;
    EXPECT_EQ(FileWriteString(path.c_str(), "", OldContent::Kept), 0);
    EXPECT_EQ(ReadWhole(path), "");
    EXPECT_EQ(FileWriteString(path.c_str(), "1", OldContent::Kept), 0);
    EXPECT_EQ(FileWriteString(path.c_str(), "", OldContent::Kept), 0);
    EXPECT_EQ(FileWriteString(path.c_str(), "2", OldContent::Kept), 0);
    EXPECT_EQ(ReadWhole(path), "12");
}

TEST_F(FileTextTest, ANewFileIsEverybodysToReadWhateverTheUmask) {
    const auto modeOf = [](const std::string &file) {
        struct stat status {};
        EXPECT_EQ(stat(file.c_str(), &status), 0);
        return status.st_mode & 07777;
    };
    CapturedLog log;
    for (const mode_t mask : {0U, 022U, 077U}) {
        const mode_t before = umask(mask);
        for (const OldContent old : {OldContent::Kept, OldContent::Emptied}) {
            EXPECT_EQ(FileWriteString(path.c_str(), "", old), 0);
            EXPECT_EQ(modeOf(path), 0644U);
            EXPECT_EQ(unlink(path.c_str()), 0);
        }
        umask(before);
    }
    // One that is there stays what it is.
    WriteWhole(path, "");
    ASSERT_EQ(chmod(path.c_str(), 0600), 0);
    EXPECT_EQ(FileWriteString(path.c_str(), "1"), 0);
    EXPECT_EQ(modeOf(path), 0600U);
}

TEST_F(FileTextTest, EmptyTextMakesAnEmptyFile) {
    CapturedLog log;
    EXPECT_EQ(FileWriteString(path.c_str(), ""), 0);
    struct stat status {};
    ASSERT_EQ(stat(path.c_str(), &status), 0);
    EXPECT_EQ(status.st_size, 0);
}

TEST_F(FileTextTest, WriteSaysSoAtLevel2) {
    CapturedLog log(2);
    EXPECT_EQ(FileWriteString(path.c_str(), "1"), 0);
    EXPECT_EQ(log.Messages(), std::vector<std::string>{"FileWriteString() [N]: Write to file OK"});
}

TEST_F(FileTextTest, WriteFailsWhereTheFileCannotBeOpened) {
    CapturedLog log(2);
    EXPECT_EQ(FileWriteString("/no/such/file", "1"), -1);
    EXPECT_EQ(log.Messages(), std::vector<std::string>{
                                  "FileWriteString() [N] : ***** Can't open file (/no/such/file)"});
}

TEST_F(FileTextTest, WriteFailsOnAFullDisk) {
    SKIP_WITHOUT_PRIVATE_MOUNTS();
    ASSERT_TRUE(MakeCharacterDevice(path, 1, 7));
    for (const size_t length : {1U, 100000U}) { // found out when closing, when writing
        CapturedLog log;
        EXPECT_EQ(FileWriteString(path.c_str(), std::string(length, 'x').c_str()), -1);
        EXPECT_EQ(log.Text(), "tool: Write error\n");
    }
}

TEST_F(FileTextTest, ReadsTheFirstLineWithItsLineFeed) {
    CapturedLog log;
    EXPECT_EQ(FirstLineOf("123"), "123");
    EXPECT_EQ(FirstLineOf("123\n"), "123\n");
    EXPECT_EQ(FirstLineOf("123\n456\n"), "123\n");
    EXPECT_EQ(FirstLineOf("\n123"), "\n");
    EXPECT_EQ(FirstLineOf(" 1 2 "), " 1 2 ");
    std::string line(100001, 'x');
    line.back() = '\n';
    EXPECT_EQ(FirstLineOf(line), line);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(FileTextTest, ReadSaysWhatItFoundAtLevel2) {
    CapturedLog log(2);
    EXPECT_EQ(FirstLineOf("123"), "123");
    EXPECT_EQ(log.Messages(), std::vector<std::string>{"FileReadString() [N]: Get text = 123"});
}

TEST_F(FileTextTest, ReadFailsWhereTheFileCannotBeOpened) {
    CapturedLog log(2);
    std::string text = "before";
    EXPECT_EQ(FileReadString(path.c_str(), &text), -1);
    EXPECT_EQ(text, "before");
    EXPECT_EQ(log.Messages(), std::vector<std::string>{
                                  "FileReadString() [N] : ***** Can't open file (" + path + ")"});
    EXPECT_FALSE(std::filesystem::exists(path));
}

TEST_F(FileTextTest, ReadsWhatMayOnlyBeRead) {
    WriteWhole(path, "123");
    ASSERT_EQ(chmod(folder.Path().c_str(), 0755), 0);
    ASSERT_EQ(chmod(path.c_str(), 0444), 0);
    CapturedLog log;
    std::string text;
    {
        const OrdinaryUser user;
        EXPECT_EQ(FileReadString(path.c_str(), &text), 0);
    }
    EXPECT_EQ(text, "123");
    EXPECT_EQ(log.Text(), "");
}

TEST_F(FileTextTest, ReadFailsOnAnEmptyFileAndOnAFolder) {
    WriteWhole(path, "");
    for (const std::string &unreadable : {path, folder.Path()}) {
        CapturedLog log;
        std::string text = "before";
        EXPECT_EQ(FileReadString(unreadable.c_str(), &text), -1);
        EXPECT_EQ(text, "before");
        EXPECT_EQ(log.Text(), "tool: Can't get a line from file (" + unreadable + ")\n");
    }
}

TEST_F(FileTextTest, ReadsAWholeFileWithoutWaiting) {
    WriteWhole(path, "123\n456");
    CapturedLog log(2);
    const RecordedOpens opens;
    std::string text = "before";
    EXPECT_EQ(FileReadWhole(path.c_str(), &text), 0);
    EXPECT_EQ(text, "123\n456");
    EXPECT_EQ(opens.FlagsOf(path), std::vector<int>{O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC});
    EXPECT_EQ(log.Messages(),
              (std::vector<std::string>{"FileReadString() [N]: Get text = 123\\x0a456"}));
}

TEST_F(FileTextTest, ReadingAWholeFileFailsAsReadingItsFirstLineDoes) {
    CapturedLog log;
    std::string text;
    EXPECT_EQ(FileReadWhole(path.c_str(), &text), -1);
    EXPECT_FALSE(std::filesystem::exists(path));
    WriteWhole(path, "");
    EXPECT_EQ(FileReadWhole(path.c_str(), &text), -1);
    EXPECT_EQ(log.Text(), "tool: Can't open file (" + path +
                              ")\ntool: Can't get a line from file (" + path + ")\n");
}

TEST_F(FileTextTest, WhatIsNoRegularFileIsNotRead) {
    ASSERT_EQ(mkfifo(path.c_str(), 0600), 0);
    CapturedLog log;
    std::string text = "before";
    for (const std::string &other : {path, folder.Path()}) {
        EXPECT_EQ(FileReadWhole(other.c_str(), &text), -1);
    }
    EXPECT_EQ(text, "before");
    EXPECT_EQ(log.Text(), "");
}
} // namespace vesk
