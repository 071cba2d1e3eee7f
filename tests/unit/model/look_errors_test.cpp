#include "base/log.h"
#include "tests/support/look_fixture.h"

namespace vesk {
using LookErrorsTest = LookTest;

TEST_F(LookErrorsTest, TheSameIsToldOnceAndInTheOrderOfTheLooks) {
    LookErrors errors;
    LookErrorAdd(&errors, "/v/b", "is damaged");
    LookErrorAdd(&errors, "/v/a", "is damaged");
    LookErrorAdd(&errors, "/v/b", "is gone");
    LookErrorAdd(&errors, "/v/b", "is damaged");
    EXPECT_EQ(TextsOf(errors), (Texts{"/v/b: is damaged", "/v/a: is damaged", "/v/b: is gone"}));
}

TEST_F(LookErrorsTest, WhatIsToldAnewLongAfterIsNotLookedFor) {
    LookErrors errors;
    for (int i = 0; i < 100000; ++i) {
        LookErrorAdd(&errors, "/v/" + std::to_string(i), "is gone");
        LookErrorAdd(&errors, "/v/" + std::to_string(i > 60 ? i - 60 : i), "is gone");
    }
    EXPECT_EQ(errors.list.size(), 100000U);
    EXPECT_EQ(errors.more, 0U);
}

TEST_F(LookErrorsTest, MoreThanAreListedAreCounted) {
    LookErrors errors;
    for (size_t i = 0; i < kLookErrorsMax + 3; ++i) {
        LookUnknownAdd(&errors, "/v/" + std::to_string(i), "is gone");
    }
    LookErrorAdd(&errors, "/v/" + std::to_string(kLookErrorsMax - 1), "is gone");
    EXPECT_EQ(errors.list.size(), kLookErrorsMax);
    EXPECT_EQ(errors.more, 3U);
}

TEST_F(LookErrorsTest, WhatIsUnknownStaysUnknownAlsoWhenItWasTold) {
    LookErrors errors;
    LookErrorAdd(&errors, "/v", "is gone");
    EXPECT_FALSE(errors.isUnknown);
    LookUnknownAdd(&errors, "/v", "is gone");
    EXPECT_EQ(TextsOf(errors), (Texts{"/v: is gone", "unknown"}));
    LookErrorAdd(&errors, "/v", "is damaged");
    EXPECT_TRUE(errors.isUnknown);
}

TEST_F(LookErrorsTest, TheLogsErrorsAreTakenOnceAndTheCauseStandsFirst) {
    EXPECT_EQ(LookLogTake("nothing told"), "nothing told");
    LogError("Can't open %s", "x");
    LogNotice("a notice");
    LogVerbose("talk");
    LogError("Cause of the caller \n");
    EXPECT_EQ(LookLogTake("nothing told"), "Can't open x: Cause of the caller");
    EXPECT_EQ(LookLogTake("nothing told"), "nothing told");
    LogError("one more");
    EXPECT_EQ(LookLogTake(""), "one more");
}

TEST_F(LookErrorsTest, NothingIsWrittenAnywhereMeanwhile) {
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    LogError("Can't open x");
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
}

TEST_F(LookErrorsTest, MoreErrorsThanAnybodyReadsAreNotKept) {
    for (int i = 0; i < 100000; ++i) {
        LogError("Can't open a file whose name is quite long: %d", i);
    }
    const std::string taken = LookLogTake("");
    EXPECT_EQ(taken.compare(0, 47, "Can't open a file whose name is quite long: 0: "), 0) << taken;
    EXPECT_LT(taken.size(), 1100U);
}
} // namespace vesk
