// What the warming tests share: a cache device, its volume and the pending-space list.
#pragma once

#include "tests/support/captured_log.h"
#include "tests/support/fake_appliance.h"
#include "tests/support/fake_cache_device.h"
#include "tests/support/fake_libc.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/messages_of.h"

#include "state/service_state.h"

#include <gtest/gtest.h>
#include <memory>

namespace vesk {
class WarmingTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        ASSERT_EQ(ServiceStateInitialize(), 0);
    }
    // A device of this size (bytes) behind /volume1.
    void UseDevice(uint64_t bytes) {
        device_ = std::make_unique<FakeCacheDevice>(bytes);
        FakeApplianceOneVolume(device_->Path());
    }
    static void SetPending() {
        char path[] = "/volume1";
        ASSERT_EQ(ServiceAddPendingSpaceAtomic(path), 0);
    }
    std::unique_ptr<FakeCacheDevice> device_;
};

#define SKIP_WITHOUT_DIRECT_READS()                                                                \
    if (!FakeCacheDevice::TakesDirectReads()) {                                                    \
        GTEST_SKIP() << "neither the current folder nor one for temporary files takes direct "     \
                        "reads";                                                                   \
    }                                                                                              \
    static_assert(true, "a semicolon follows")
} // namespace vesk
