#include "cachedev/background.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <functional>
#include <sys/wait.h>
#include <unistd.h>

namespace vesk {
namespace {
// Runs `daemon` in the background of a process of its own; the exit status of that process.
int StatusOf(const std::function<void(Background &)> &daemon) {
    const pid_t child = fork();
    if (child == 0) {
        Background background;
        if (!BackgroundStart(background)) {
            _exit(99);
        }
        daemon(background);
        _exit(0);
    }
    int status = -1; // of no process, where there is none
    EXPECT_EQ(waitpid(child, &status, 0), child);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}
} // namespace

TEST(BackgroundTest, TheCommandEndsWellOnceTheDaemonIsReady) {
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    EXPECT_EQ(StatusOf([&ends](Background &background) {
                  const pid_t parent = getppid();
                  BackgroundReady(background);
                  while (getppid() == parent) {
                      usleep(1000);
                  }
                  // Still there after the parent's end, in a session of its own, and at "/".
                  char folder[8] = {};
                  const bool away = getsid(0) == getpid() && getcwd(folder, sizeof folder) &&
                                    folder[0] == '/' && folder[1] == '\0';
                  const ssize_t written = write(ends[1], away ? "y" : "n", 1);
                  static_cast<void>(written);
              }),
              0);
    close(ends[1]); // a daemon that has gone with its parent leaves nobody who could write
    char answer = 0;
    EXPECT_EQ(read(ends[0], &answer, 1), 1);
    EXPECT_EQ(answer, 'y');
    close(ends[0]);
}

TEST(BackgroundTest, TheCommandFailsWhenTheDaemonEndsBefore) {
    EXPECT_EQ(StatusOf([](Background &) { _exit(0); }), 1);
    EXPECT_EQ(StatusOf([](Background &) { raise(SIGKILL); }), 1);
}

TEST(BackgroundTest, WithoutAParentNothingHappens) {
    Background background;
    BackgroundReady(background);
    EXPECT_FALSE(background.ready.IsOpen());
}
} // namespace vesk
