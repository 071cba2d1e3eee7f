// What the command tests share: one volume with its cache device and its bitmap file.
#pragma once

#include "tests/support/captured_log.h"
#include "tests/support/fake_appliance.h"
#include "tests/support/fake_cache_device.h"
#include "tests/support/fake_libc.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/messages_of.h"
#include "tests/support/temp_dir.h"

#include <filesystem>
#include <gtest/gtest.h>
#include <memory>

namespace vesk {
using Events = std::vector<std::string>;

class CommandsTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        std::filesystem::create_directory(volume_);
        device_ = std::make_unique<FakeCacheDevice>(1 << 20); // 16 blocks, 2 bytes of bitmap
        device_->bitmapFile = bitmapFile_;
        FakeApplianceOneVolume(device_->Path(), volume_);
    }
    const char *Volume() const { return volume_.c_str(); }
    const TempDir folder_;
    const std::string volume_ = folder_.Path("volume1");
    const std::string bitmapFile_ = volume_ + "/veskcachepinfile.bitmap";
    std::unique_ptr<FakeCacheDevice> device_;
};
} // namespace vesk
