// A volume against the fakes: a mount point that is a folder, an SSD that is a file, and a cache
// device whose driver answers as the test says.
#pragma once

#include "driver/pin_interface.h"
#include "model/volume_look.h"
#include "tests/support/look_fixture.h"

#include <cerrno>
#include <filesystem>
#include <linux/fs.h>
#include <set>

namespace vesk {
class VolumeTest : public LookTest {
protected:
    void SetUp() override {
        LookTest::SetUp();
        std::filesystem::create_directory(mountPath_);
        WriteWhole(device_, "");
        WriteWhole(ssd_, std::string(5 * 65536 + 65535, 'x'));
        FakeApplianceOneVolume(device_, mountPath_);
        FakeAppliance::caches[0].ssdPath = ssd_;
        FakeLibc::onIoctl = [this](unsigned long request, void *data) {
            if (refused_.count(request) > 0) {
                errno = EIO;
                return -1;
            }
            switch (request) {
            case BLKGETSIZE64: *static_cast<uint64_t *>(data) = deviceBytes_; break;
            case kPinIoctlQueryBitmapSet: *static_cast<int *>(data) = bitmapSet_; break;
            case kPinIoctlQueryAllUnpinned: *static_cast<int *>(data) = allUnpinned_; break;
            default: ADD_FAILURE() << "a request that changes something: " << request;
            }
            return 0;
        };
    }
    std::string BitmapPath() const { return mountPath_ + "/veskcachepinfile.bitmap"; }

    const TempDir folder_;
    const std::string mountPath_ = folder_.Path("volume1");
    const std::string device_ = folder_.Path("cachedev_0");
    const std::string ssd_ = folder_.Path("ssd");
    uint64_t deviceBytes_ = 3 * 8 * 65536 + 5 * 65536; // a bitmap of three bytes
    int bitmapSet_ = 1;
    int allUnpinned_ = 0;
    std::set<unsigned long> refused_; // requests that the driver answers with EIO
};
} // namespace vesk
