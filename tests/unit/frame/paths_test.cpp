#include "base/scoped_fd.h"
#include "tests/unit/frame/command_line_fixture.h"

#include <fcntl.h>
#include <unistd.h>

namespace vesk {
namespace {
class PathsTest : public CommandLineTest {
protected:
    const TempDir folder_;
};
} // namespace

TEST_F(PathsTest, StandInTheOrderInWhichTheyWereGiven) {
    EXPECT_EQ(Paths({"list", "/b", "/a", "/b"}), (Arguments{"/b", "/a", "/b"}));
}

TEST_F(PathsTest, ANameIsTakenAsItIs) {
    for (const char *name :
         {"a,b",   "a b", "a;b",    "{}",   "%%", "#",    "a=b", "\xFF", "a\nb", "-", "'a'",
          "\"a\"", "a]",  "status", "list", "[",  "true", "0",   "/a",   "@x",   "+"}) {
        const Arguments paths = Paths({"list", name});
        const std::string expected = name[0] == '[' ? "./" + std::string(name) : name;
        EXPECT_EQ(paths, Arguments{expected});
    }
}

TEST_F(PathsTest, NamesThatTheLibraryHasAMeaningForAreNames) {
    EXPECT_EQ(Paths({"list", "[a,b]", "[c]", "++", "[]", "d"}),
              (Arguments{"./[a,b]", "./[c]", "./++", "./[]", "d"}));
    ASSERT_TRUE(Read({"status", "[v]", "--config", "[c]"}));
    EXPECT_EQ(line_.settings.volumes, Arguments{"./[v]"});
    EXPECT_EQ(line_.settings.configPath, "./[c]");
}

TEST_F(PathsTest, BehindTwoDashesAllIsAName) {
    EXPECT_EQ(Paths({"list", "--", "--json", "-0", "-x", "--help"}),
              (Arguments{"--json", "-0", "-x", "--help"}));
    EXPECT_FALSE(line_.settings.json);
}

TEST_F(PathsTest, AListsPathsStandBehindTheOthers) {
    const std::string list = folder_.FileMake("list", "/c\n/d e\n");
    EXPECT_EQ(Paths({"list", "--files-from", list, "/a"}), (Arguments{"/a", "/c", "/d e"}));
    EXPECT_EQ(Paths({"plan", "--files-from", list}), (Arguments{"/c", "/d e"}));
}

TEST_F(PathsTest, AListMayBeNulSeparated) {
    const std::string list = folder_.FileMake("list", std::string("/c\nd\0[e]\0", 9));
    EXPECT_EQ(Paths({"list", "-0", "--files-from", list}), (Arguments{"/c\nd", "[e]"}));
    EXPECT_EQ(Paths({"list", "--files-from=" + list, "-0"}), (Arguments{"/c\nd", "[e]"}));
}

TEST_F(PathsTest, ADashIsStandardInput) {
    const std::string list = folder_.FileMake("list", "/c\n");
    const ScopedFd saved(dup(STDIN_FILENO));
    const ScopedFd file(open(list.c_str(), O_RDONLY | O_CLOEXEC));
    ASSERT_NE(dup2(file.Get(), STDIN_FILENO), -1);
    EXPECT_EQ(Paths({"plan", "--files-from", "-"}), Arguments{"/c"});
    dup2(saved.Get(), STDIN_FILENO);
}

TEST_F(PathsTest, AListThatCannotBeReadOrIsEmptyIsRefused) {
    EXPECT_TRUE(IsRefused({"list", "--files-from", folder_.Path("go\nne")}));
    EXPECT_EQ(said_, "veskpin: " + folder_.Path() + "/go\\x0ane: No such file or directory\n");
    EXPECT_TRUE(IsRefused({"list", "--files-from", folder_.Path()}));
    const std::string empty = folder_.FileMake("empty", "\n\n");
    EXPECT_TRUE(IsRefused({"plan", "--files-from", empty}));
    EXPECT_EQ(said_, "veskpin: the list of paths is empty\n");
    // All that is recorded is another question.
    EXPECT_TRUE(IsRefused({"list", "--files-from", empty}));
    EXPECT_EQ(said_, "veskpin: the list of paths is empty\n");
    EXPECT_EQ(Paths({"list", "/a", "--files-from", empty}), Arguments{"/a"});
}
} // namespace vesk
