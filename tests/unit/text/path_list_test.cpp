#include "text/path_list.h"

#include "base/scoped_fd.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/temp_dir.h"

#include <cerrno>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

namespace vesk {
namespace {
using Paths = std::vector<std::string>;

class PathListTest : public LeakCheckedTest {
protected:
    Paths Read(const std::string &content, bool nulSeparated) const {
        Paths paths;
        EXPECT_EQ(PathListRead(folder_.FileMake("list", content), nulSeparated, &paths), 0);
        return paths;
    }
    const TempDir folder_;
};
} // namespace

TEST_F(PathListTest, EachLineIsAPath) {
    EXPECT_EQ(Read("/v/a\n/v/b c\n", false), (Paths{"/v/a", "/v/b c"}));
    EXPECT_EQ(Read("/v/a\n/v/b", false), (Paths{"/v/a", "/v/b"})); // the last may be unended
    EXPECT_EQ(Read("\n\n/v/a\n\n", false), Paths{"/v/a"});
    EXPECT_EQ(Read("", false), Paths{});
    EXPECT_EQ(Read("/v/a\r\n /v/b \n", false), (Paths{"/v/a\r", " /v/b "})); // as it is
    EXPECT_EQ(Read(std::string("/v/a\0b\n", 7), false), Paths{std::string("/v/a\0b", 6)});
}

TEST_F(PathListTest, WithNulsALineFeedIsPartOfAPath) {
    EXPECT_EQ(Read(std::string("/v/a\nb\0/v/c\0", 12), true), (Paths{"/v/a\nb", "/v/c"}));
    EXPECT_EQ(Read(std::string("\0/v/a\0\0/v/b", 11), true), (Paths{"/v/a", "/v/b"}));
    EXPECT_EQ(Read("/v/a\n/v/b\n", true), Paths{"/v/a\n/v/b\n"});
}

TEST_F(PathListTest, PathsCrossTheBordersOfReads) {
    std::string content;
    Paths expected;
    for (size_t i = 0; i < 20000; ++i) {
        expected.push_back("/v/" + std::string(i % 17, 'x') + std::to_string(i));
        content += expected.back() + "\n";
    }
    EXPECT_EQ(Read(content, false), expected);
}

TEST_F(PathListTest, PathsAreAddedBehindThoseThatAreThere) {
    Paths paths{"/v/first"};
    EXPECT_EQ(PathListRead(folder_.FileMake("list", "/v/a\n"), false, &paths), 0);
    EXPECT_EQ(paths, (Paths{"/v/first", "/v/a"}));
}

TEST_F(PathListTest, AListThatCannotBeReadIsItsErrno) {
    Paths paths;
    EXPECT_EQ(PathListRead(folder_.Path("missing"), false, &paths), ENOENT);
    EXPECT_EQ(PathListRead(folder_.Path(), false, &paths), EISDIR);
    FakeLibc::Fail("read", EIO, 2);
    EXPECT_EQ(PathListRead(folder_.FileMake("list", "/v/a\n"), false, &paths), EIO);
}

TEST_F(PathListTest, ADashIsStandardInputWhichStaysOpen) {
    const std::string list = folder_.FileMake("list", "/v/a\n/v/b\n");
    Paths paths;
    {
        const ScopedFd saved(dup(STDIN_FILENO));
        const ScopedFd file(open(list.c_str(), O_RDONLY | O_CLOEXEC));
        ASSERT_NE(dup2(file.Get(), STDIN_FILENO), -1);
        EXPECT_EQ(PathListRead("-", false, &paths), 0);
        EXPECT_NE(fcntl(STDIN_FILENO, F_GETFD), -1);
        dup2(saved.Get(), STDIN_FILENO);
    }
    EXPECT_EQ(paths, (Paths{"/v/a", "/v/b"}));
}
} // namespace vesk
