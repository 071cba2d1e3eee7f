// What the tests of handlers and worker share: one volume with its cache device, files on it whose
// extents are scripted, and the volume's bitmap file.
#pragma once

#include "tests/support/captured_log.h"
#include "tests/support/fake_appliance.h"
#include "tests/support/fake_cache_device.h"
#include "tests/support/fake_libc.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/messages_of.h"
#include "tests/support/temp_dir.h"

#include "request/request_record.h"
#include "state/service_state.h"

#include <cstdio>
#include <filesystem>
#include <gtest/gtest.h>
#include <map>
#include <memory>

namespace vesk {
using Events = std::vector<std::string>;

class HandlerTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        ASSERT_EQ(ServiceStateInitialize(), 0);
        std::filesystem::create_directory(volume_);
        device_ = std::make_unique<FakeCacheDevice>(1 << 20); // 16 blocks, 2 bytes of bitmap
        device_->bitmapFile = bitmapFile_;
        FakeApplianceOneVolume(device_->Path(), volume_);
        FakeAppliance::onLookup = [this](const std::string &, uint64_t inode, int,
                                         FileMappingTable &table) {
            const auto found = extents_.find(inode);
            if (found == extents_.end()) {
                return -1;
            }
            table.entries = found->second;
            return 0;
        };
        if (!FakeCacheDevice::TakesDirectReads()) {
            GTEST_SKIP() << "neither the current folder nor one for temporary files takes direct "
                            "reads";
        }
    }
    RequestRecord Record(int type, const std::string &data = "") const {
        RequestRecord record{};
        record.type = type;
        snprintf(record.mountPath, sizeof(record.mountPath), "%s", volume_.c_str());
        snprintf(record.data, sizeof(record.data), "%s", data.c_str());
        return record;
    }
    void SetPending() const {
        std::string path = volume_;
        ASSERT_EQ(ServiceAddPendingSpaceAtomic(&path[0]), 0);
    }

    const TempDir folder_;
    const std::string volume_ = folder_.Path("volume1");
    const std::string bitmapFile_ = volume_ + "/veskcachepinfile.bitmap";
    std::unique_ptr<FakeCacheDevice> device_;
    // By inode. File 1 lies in block 0, file 2 in blocks 3 and 9.
    std::map<uint64_t, std::vector<FileMappingEntry>> extents_ = {
        {1, {FakeExtent(0, 8, 16)}},
        {2, {FakeExtent(0, 8, 384), FakeExtent(8, 16, 1152)}},
    };
};
} // namespace vesk
