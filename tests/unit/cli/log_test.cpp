#include "cli/log.h"

#include "support/captured_log.h"
#include "support/fake_appliance.h"
#include "support/fake_libc.h"

#include "platform/space_cache.h"

#include <gtest/gtest.h>
#include <unistd.h>

TEST(Log, ErrorAtLevel1IsShort) {
    CapturedLog log;
    LogError("Invalid input");
    EXPECT_EQ(log.Text(), "tool: Invalid input\n");
}

TEST(Smoke, FakesAnswer) {
    FakeApplianceOneVolume("/dev/c");
    EXPECT_EQ(SpaceHasCacheAndSupportPin("/volume1"), 1);
    FakeLibc::Reset();
    sleep(5);
    EXPECT_EQ(FakeLibc::sleeps, 1);
}
