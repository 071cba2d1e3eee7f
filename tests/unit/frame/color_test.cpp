#include "base/scoped_fd.h"
#include "tests/unit/frame/command_line_fixture.h"

#include <fcntl.h>
#include <unistd.h>

namespace vesk {
namespace {
class ColorTest : public CommandLineTest {
protected:
    // Whether tables are coloured, with standard output here.
    bool Colors(const Arguments &arguments, int output) {
        const ScopedFd saved(dup(STDOUT_FILENO));
        EXPECT_NE(dup2(output, STDOUT_FILENO), -1);
        const bool isRead = Read(arguments);
        dup2(saved.Get(), STDOUT_FILENO);
        EXPECT_TRUE(isRead) << said_;
        return line_.settings.color;
    }
    const TempDir folder_;
};
} // namespace

TEST_F(ColorTest, IsUsedOnATerminalWithoutNoColor) {
    const ScopedFd master(posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC));
    if (!master.IsOpen() || grantpt(master.Get()) != 0 || unlockpt(master.Get()) != 0) {
        GTEST_SKIP() << "no terminals here";
    }
    char name[64];
    ASSERT_EQ(ptsname_r(master.Get(), name, sizeof(name)), 0);
    const ScopedFd terminal(open(name, O_RDWR | O_NOCTTY | O_CLOEXEC));
    if (!terminal.IsOpen()) {
        GTEST_SKIP() << "no terminals here";
    }
    EXPECT_TRUE(Colors({"status"}, terminal.Get()));
    EXPECT_TRUE(Colors({"status", "--color", "auto"}, terminal.Get()));
    EXPECT_TRUE(Colors({"--color=always", "status"}, terminal.Get()));
    EXPECT_FALSE(Colors({"status", "--color", "never"}, terminal.Get()));
    setenv("NO_COLOR", "1", 1);
    EXPECT_FALSE(Colors({"status"}, terminal.Get()));
    EXPECT_TRUE(Colors({"status", "--color", "always"}, terminal.Get()));
    setenv("NO_COLOR", "", 1); // which says nothing
    EXPECT_TRUE(Colors({"status"}, terminal.Get()));
    unsetenv("NO_COLOR");
}

TEST_F(ColorTest, IsUsedElsewhereOnlyWhenItIsWanted) {
    const ScopedFd file(open(folder_.Path("out").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
    EXPECT_FALSE(Colors({"status"}, file.Get()));
    EXPECT_TRUE(Colors({"status", "--color", "always"}, file.Get()));
    EXPECT_FALSE(Colors({"status", "--color", "never"}, file.Get()));
}
} // namespace vesk
