#include "cli/required_parameters.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"

#include <gtest/gtest.h>

namespace vesk {
namespace {
class CheckParameterTest : public LeakCheckedTest {
protected:
    // The messages of one check at level 1; empty: it passed.
    std::string Check() {
        CapturedLog log;
        const int result = CheckParameter(&required, &parameters);
        EXPECT_EQ(result, log.Text().empty() ? 0 : -1);
        return log.Text();
    }
    RequiredParameters required;
    ToolParameters parameters;
};

// What CheckFilesExist says at level 1; empty: it found every file.
std::string CheckFiles(const std::string &paths) {
    CapturedLog log;
    const int result = CheckFilesExist(paths.c_str());
    EXPECT_EQ(result, log.Text().empty() ? 0 : -1);
    return log.Text();
}

// A list that begins with so many separators.
std::string BehindSeparators(size_t count, const char *rest) {
    std::string list(count, ';');
    list += rest;
    return list;
}

using CheckFilesExistTest = LeakCheckedTest;
} // namespace

TEST_F(CheckParameterTest, PassesWhenNothingIsRequired) {
    EXPECT_EQ(Check(), "");
}

TEST_F(CheckParameterTest, StopsAtTheFirstFailureInThisOrder) {
    required = {1, 1, 1, 1, 1, 1, 1};
    EXPECT_EQ(Check(), "tool: Error: Cache path is not set\n");
    parameters.cachePath = "/no/such";
    EXPECT_EQ(Check(), "tool: Error: Cache path (/no/such) doesn't exist\n");
    parameters.cachePath = "/";
    EXPECT_EQ(Check(), "tool: Space UUID must be set\n");
    parameters.spaceUuid = "uuid-1";
    EXPECT_EQ(Check(), "tool: Config path must be set\n");
    parameters.configPath = "/no/such";
    EXPECT_EQ(Check(), "tool: Mount path must be set\n");
    parameters.mountPath = "/no/such";
    EXPECT_EQ(Check(), "tool: The file paths should not be NULL\ntool: Check file paths error\n");
    parameters.files = "/;/dev";
    EXPECT_EQ(Check(), "tool: Start sector is not set\n");
    parameters.startSector = 0;
    EXPECT_EQ(Check(), "tool: Num of sectors is not set\n");
    parameters.numSectors = 0;
    EXPECT_EQ(Check(), "");
}

TEST_F(CheckParameterTest, LogsInItsOwnName) {
    required.spaceUuid = 1;
    CapturedLog log(2);
    EXPECT_EQ(CheckParameter(&required, &parameters), -1);
    EXPECT_EQ(log.Messages(),
              std::vector<std::string>{"CheckParameter() [N] : ***** Space UUID must be set"});
}

TEST_F(CheckFilesExistTest, AcceptsPathsThatExist) {
    EXPECT_EQ(CheckFiles("/"), "");
    EXPECT_EQ(CheckFiles("/;/dev;/dev/null"), "");
}

TEST_F(CheckFilesExistTest, SkipsEmptyPieces) {
    EXPECT_EQ(CheckFiles(";/;;/dev;"), "");
}

TEST_F(CheckFilesExistTest, RefusesNull) {
    CapturedLog log;
    EXPECT_EQ(CheckFilesExist(nullptr), -1);
    EXPECT_EQ(log.Text(), "tool: The file paths should not be NULL\n");
}

TEST_F(CheckFilesExistTest, RefusesAListOfSeparatorsOnly) {
    EXPECT_EQ(CheckFiles(";;"), "tool: No availiable files in the file paths (;;)\n");
    EXPECT_EQ(CheckFiles(""), "tool: No availiable files in the file paths ()\n");
}

TEST_F(CheckFilesExistTest, FailsOnTheSecondPieceEvenThoughTheFirstExists) {
    EXPECT_EQ(CheckFiles("/dev;/no/such"), "tool: File (path /no/such) doesn't exist\n");
}

TEST_F(CheckFilesExistTest, StopsAtTheFirstThatIsMissing) {
    EXPECT_EQ(CheckFiles("/no/1;/no/2"), "tool: File (path /no/1) doesn't exist\n");
}

TEST_F(CheckFilesExistTest, BlanksBelongToThePath) {
    EXPECT_EQ(CheckFiles("/dev; /dev"), "tool: File (path  /dev) doesn't exist\n");
}

TEST_F(CheckFilesExistTest, LooksAtTheFirst512CharactersOnly) {
    EXPECT_EQ(CheckFiles(BehindSeparators(503, "/dev/null;/no/such")), "");
    EXPECT_EQ(CheckFiles(BehindSeparators(511, "/no/such")), ""); // cut to "/"
    EXPECT_EQ(CheckFiles(BehindSeparators(504, "/no/such")),
              "tool: File (path /no/such) doesn't exist\n");
    EXPECT_EQ(CheckFiles(BehindSeparators(504, "/dev/null")),
              "tool: File (path /dev/nul) doesn't exist\n");
}

TEST_F(CheckFilesExistTest, NamesTheWholeListWhenNothingIsInItsFirst512Characters) {
    const std::string list = BehindSeparators(512, "/dev");
    EXPECT_EQ(CheckFiles(list), "tool: No availiable files in the file paths (" + list + ")\n");
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
