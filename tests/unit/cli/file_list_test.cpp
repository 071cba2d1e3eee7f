#include "cli/file_list.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"

#include <gtest/gtest.h>

namespace vesk {

namespace {

// What CheckFilesExist says at level 1; empty: it found every file.
std::string Check(const std::string &paths) {
    CapturedLog log;
    const int result = CheckFilesExist(paths.c_str());
    EXPECT_EQ(result, log.Text().empty() ? 0 : -1);
    return log.Text();
}

using CheckFilesExistTest = LeakCheckedTest;

} // namespace

TEST_F(CheckFilesExistTest, AcceptsPathsThatExist) {
    EXPECT_EQ(Check("/"), "");
    EXPECT_EQ(Check("/;/dev;/dev/null"), "");
}

TEST_F(CheckFilesExistTest, SkipsEmptyPieces) {
    EXPECT_EQ(Check(";/;;/dev;"), "");
}

TEST_F(CheckFilesExistTest, RefusesNull) {
    CapturedLog log;
    EXPECT_EQ(CheckFilesExist(nullptr), -1);
    EXPECT_EQ(log.Text(), "tool: The file paths should not be NULL\n");
}

TEST_F(CheckFilesExistTest, RefusesAListOfSeparatorsOnly) {
    EXPECT_EQ(Check(";;"), "tool: No availiable files in the file paths (;;)\n");
    EXPECT_EQ(Check(""), "tool: No availiable files in the file paths ()\n");
}

TEST_F(CheckFilesExistTest, FailsOnTheSecondPieceEvenThoughTheFirstExists) {
    EXPECT_EQ(Check("/dev;/no/such"), "tool: File (path /no/such) doesn't exist\n");
}

TEST_F(CheckFilesExistTest, StopsAtTheFirstThatIsMissing) {
    EXPECT_EQ(Check("/no/1;/no/2"), "tool: File (path /no/1) doesn't exist\n");
}

TEST_F(CheckFilesExistTest, BlanksBelongToThePath) {
    EXPECT_EQ(Check("/dev; /dev"), "tool: File (path  /dev) doesn't exist\n");
}

TEST_F(CheckFilesExistTest, LooksAtTheFirst512CharactersOnly) {
    EXPECT_EQ(Check(std::string(503, ';') + "/dev/null" + ";/no/such"), "");
    EXPECT_EQ(Check(std::string(511, ';') + "/no/such"), ""); // cut to "/"
    EXPECT_EQ(Check(std::string(504, ';') + "/no/such"),
              "tool: File (path /no/such) doesn't exist\n");
    EXPECT_EQ(Check(std::string(504, ';') + "/dev/null"),
              "tool: File (path /dev/nul) doesn't exist\n");
}

TEST_F(CheckFilesExistTest, NamesTheWholeListWhenNothingIsInItsFirst512Characters) {
    const std::string list = std::string(512, ';') + "/dev";
    EXPECT_EQ(Check(list), "tool: No availiable files in the file paths (" + list + ")\n");
}

TEST_F(CheckFilesExistTest, LeavesTheListAsItIs) {
    CapturedLog log;
    char list[] = "/;/dev";
    EXPECT_EQ(CheckFilesExist(list), 0);
    EXPECT_STREQ(list, "/;/dev");
}

TEST_F(CheckFilesExistTest, LogsInItsOwnName) {
    CapturedLog log(2);
    EXPECT_EQ(CheckFilesExist("/no/such"), -1);
    EXPECT_EQ(log.Messages(),
              std::vector<std::string>{"CheckFilesExist() [N] : ***** File (path /no/such) doesn't "
                                       "exist"});
}

} // namespace vesk
