#include "base/scoped_fd.h"

#include "tests/support/leak_checked_test.h"

#include <fcntl.h>
#include <gtest/gtest.h>

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
