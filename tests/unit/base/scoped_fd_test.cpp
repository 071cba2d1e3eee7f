#include "base/scoped_fd.h"

#include "tests/support/leak_checked_test.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <utility>

namespace vesk {
using ScopedFdTest = LeakCheckedTest;

TEST_F(ScopedFdTest, ClosesItsDescriptorWithItsScope) {
    int number = -1;
    {
        const ScopedFd file(open("/dev/null", O_RDONLY));
        number = file.Get();
        EXPECT_TRUE(file.IsOpen());
        EXPECT_NE(fcntl(number, F_GETFD), -1);
    }
    EXPECT_EQ(fcntl(number, F_GETFD), -1);
}

TEST_F(ScopedFdTest, HoldsNothingAfterAFailedOpen) {
    const ScopedFd file(open("/no/such", O_RDONLY));
    EXPECT_FALSE(file.IsOpen());
    EXPECT_EQ(file.Get(), -1);
}

TEST_F(ScopedFdTest, GivesItAwayAndTakesItOver) {
    ScopedFd first(open("/dev/null", O_RDONLY));
    const int number = first.Get();
    ScopedFd second(std::move(first));
    EXPECT_EQ(second.Get(), number);
    EXPECT_FALSE(first.IsOpen()); // NOLINT(bugprone-use-after-move): it is empty and may be used
    first = std::move(second);
    EXPECT_EQ(first.Get(), number);
    EXPECT_EQ(first.Release(), number);
    EXPECT_FALSE(first.IsOpen());
    EXPECT_NE(fcntl(number, F_GETFD), -1) << "the caller's now";
    const ScopedFd again(number);
}

TEST_F(ScopedFdTest, ClosesWhatItHeldWhenItIsGivenAnother) {
    ScopedFd file(open("/dev/null", O_RDONLY));
    const int number = file.Get();
    file = ScopedFd();
    EXPECT_FALSE(file.IsOpen());
    EXPECT_EQ(fcntl(number, F_GETFD), -1);
}
} // namespace vesk
