#include "act/change_lock.h"

#include "act/interrupt.h"
#include "tests/support/ordinary_user.h"
#include "tests/support/temp_dir.h"

#include <cerrno>
#include <csignal>
#include <gtest/gtest.h>
#include <sys/stat.h>

namespace vesk {
namespace {
class ChangeLockTest : public testing::Test {
protected:
    ChangeLock Take(std::optional<unsigned> seconds = std::nullopt) {
        told_ = 0;
        return ChangeLockTake(
            Deadline(seconds), [this] { ++told_; }, run_.c_str());
    }
    const TempDir folder_;
    const std::string run_ = folder_.Path("run");
    int told_ = 0;
};
} // namespace

TEST_F(ChangeLockTest, TheFirstHasItAndTheSecondWaitsUpToItsTime) {
    ChangeLock first = Take();
    EXPECT_EQ(first.error, 0);
    EXPECT_EQ(told_, 0);
    EXPECT_EQ(Take(0).error, EAGAIN);
    EXPECT_EQ(told_, 1);
    first.file = ScopedFd();
    EXPECT_EQ(Take(0).error, 0);
    EXPECT_EQ(told_, 0);
}

TEST_F(ChangeLockTest, OnlyItsMakerMayOpenIt) {
    EXPECT_EQ(Take().error, 0);
    struct stat status {};
    ASSERT_EQ(stat((run_ + "/lock").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0600U);
    SKIP_WITHOUT_ROOT();
    chmod(folder_.Path().c_str(), 0755);
    const OrdinaryUser user;
    EXPECT_EQ(Take().error, EACCES);
}

TEST_F(ChangeLockTest, ALinkInItsPlaceIsNotFollowed) {
    ASSERT_EQ(mkdir(run_.c_str(), 0755), 0);
    ASSERT_EQ(symlink("elsewhere", (run_ + "/lock").c_str()), 0);
    EXPECT_EQ(Take().error, ELOOP);
}

TEST_F(ChangeLockTest, ASignalEndsTheWait) {
    const ChangeLock first = Take();
    struct sigaction before {};
    sigaction(SIGINT, nullptr, &before);
    InterruptBegin();
    raise(SIGINT);
    EXPECT_EQ(Take().error, EINTR);
    InterruptBegin();
    sigaction(SIGINT, &before, nullptr);
}
} // namespace vesk
