#include "tests/unit/cachedev/private_world.h"

#include "tests/support/test_device.h"

#include <gtest/gtest.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <sched.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace vesk {
namespace {
constexpr int kFailed = 1;
constexpr int kSkipped = 77;

[[noreturn]] void RunBody(const std::function<void()> &body) {
    setsid(); // what is sent to the world's process group reaches nobody outside
    if (mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0 ||
        mount("world", "/run", "tmpfs", 0, nullptr) != 0 ||
        mount("proc", "/proc", "proc", 0, nullptr) != 0) {
        SkipWorld("no private mounts");
    }
    body();
    const bool failed = testing::Test::HasFailure();
    fflush(nullptr);
    _exit(failed ? kFailed : 0);
}

int StatusOf(pid_t child) {
    int status = 0;
    while (waitpid(child, &status, 0) < 0) {
        if (errno != EINTR) {
            return kFailed;
        }
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : kFailed;
}

// Makes the namespaces; the body runs in a child, since only children get into a new PID namespace.
[[noreturn]] void EnterWorld(const std::function<void()> &body) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (unshare(CLONE_NEWNS | CLONE_NEWPID) != 0) {
        SkipWorld("no namespaces");
    }
    const pid_t first = fork();
    if (first == 0) {
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        RunBody(body);
    }
    _exit(first < 0 ? kFailed : StatusOf(first));
}
} // namespace

void SkipWorld(const char *reason) {
    printf("skipped: %s\n", reason);
    fflush(nullptr);
    _exit(kSkipped);
}

void RunInPrivateWorld(const std::function<void()> &body) {
    if (geteuid() != 0) {
        GTEST_SKIP() << "needs root";
    }
    if (access("/dev/fuse", R_OK | W_OK) != 0) {
        GTEST_SKIP() << "needs /dev/fuse";
    }
    if (!TestHasCallerMemory()) {
        GTEST_SKIP() << "needs process_vm_readv";
    }
    fflush(nullptr);
    const pid_t child = fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
        EnterWorld(body);
    }
    const int status = StatusOf(child);
    if (status == kSkipped) {
        GTEST_SKIP() << "what this test needs is not there, see above";
    }
    EXPECT_EQ(status, 0) << "failed in its private world, see above";
}
} // namespace vesk
