#include "service/put_off.h"

#include <gtest/gtest.h>

namespace vesk {
TEST(PutOff, TheVolumeOfAFailedRequestIsPassedOverUntilTheEnd) {
    PutOffRequests putOff;
    EXPECT_FALSE(PutOffPasses(putOff, "/volume1"));
    EXPECT_TRUE(PutOffNote(&putOff, "0", "/volume1"));
    EXPECT_TRUE(PutOffPasses(putOff, "/volume1"));
    EXPECT_FALSE(PutOffPasses(putOff, "/volume2"));
    EXPECT_FALSE(PutOffPasses(putOff, "/volume"));
    PutOffEnd(&putOff);
    EXPECT_FALSE(PutOffPasses(putOff, "/volume1"));
}

TEST(PutOff, TheTenthFailureIsTheLast) {
    PutOffRequests putOff;
    for (int i = 0; i < 9; ++i) {
        EXPECT_TRUE(PutOffNote(&putOff, "0", "/volume1")) << i;
        EXPECT_TRUE(PutOffNote(&putOff, "1", "/volume2")) << i;
        PutOffEnd(&putOff);
    }
    EXPECT_FALSE(PutOffNote(&putOff, "0", "/volume1"));
    EXPECT_FALSE(PutOffPasses(putOff, "/volume1"));
    EXPECT_EQ(putOff.tries.size(), 1U);
    EXPECT_FALSE(PutOffNote(&putOff, "1", "/volume2"));
}

TEST(PutOff, ARequestThatIsForgottenBeginsAnew) {
    PutOffRequests putOff;
    for (int i = 0; i < 9; ++i) {
        EXPECT_TRUE(PutOffNote(&putOff, "0", "/volume1"));
    }
    EXPECT_TRUE(PutOffNote(&putOff, "1", "/volume2"));
    PutOffForget(&putOff, "0");
    EXPECT_FALSE(PutOffPasses(putOff, "/volume2")) << "its turn has come again";
    EXPECT_TRUE(PutOffNote(&putOff, "0", "/volume1"));
}
} // namespace vesk
