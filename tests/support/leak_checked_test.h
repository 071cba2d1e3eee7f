// The fixture of tests that drive the tool's code against the fakes: everything starts as declared,
// and at the end nothing may be left: no record of the appliance's libraries, no open descriptor.
//
// Messages go to standard output, never to the machine's log; hold a CapturedLog to read them. Each
// must be one of the tool's, of the right class and place (message_check.h).
#pragma once

#include "tests/support/fake_appliance.h"
#include "tests/support/fake_libc.h"
#include "tests/support/message_check.h"

#include "base/log.h"

#include <filesystem>
#include <gtest/gtest.h>
#include <iterator>

namespace vesk {
inline long CountOpenDescriptors() {
    using Folder = std::filesystem::directory_iterator;
    return static_cast<long>(std::distance(Folder("/proc/self/fd"), Folder()));
}

class LeakCheckedTest : public ::testing::Test {
protected:
    void SetUp() override {
        LogToSyslog = 0;
        LogLevel = 1;
        FakeAppliance::Reset();
        FakeLibc::Reset();
        CheckMessages();
        descriptors_ = CountOpenDescriptors();
    }
    void TearDown() override {
        EXPECT_EQ(FakeAppliance::liveSpaceLists, 0);
        EXPECT_EQ(FakeAppliance::liveConfigs, 0);
        EXPECT_EQ(FakeAppliance::liveStats, 0);
        EXPECT_EQ(FakeAppliance::liveDevices, 0);
        EXPECT_EQ(CountOpenDescriptors(), descriptors_);
        CheckNoMessages();
        FakeLibc::Reset();
    }

private:
    long descriptors_ = 0;
};
} // namespace vesk
