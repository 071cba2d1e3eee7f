#include "driver/device.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/open_file.h"
#include "tests/support/temp_dir.h"

#include <gtest/gtest.h>
#include <linux/fs.h>

namespace vesk {

namespace {

class DeviceGetSizeByteTest : public LeakCheckedTest {
protected:
    TempDir folder;
    std::string device = folder.Path("device");
    uint64_t size = 7;
};

} // namespace

TEST_F(DeviceGetSizeByteTest, GivesTheDriversSixtyFourBitAnswer) {
    CapturedLog log(3);
    WriteWhole(device, "");
    FakeLibc::onIoctl = [this](unsigned long request, void *data) {
        EXPECT_EQ(request, BLKGETSIZE64);
        EXPECT_EQ(data, &size);
        *static_cast<uint64_t *>(data) = 0x123456789ABCDEF0;
        return 0;
    };
    EXPECT_EQ(DeviceGetSizeByte(device.c_str(), &size), 0);
    EXPECT_EQ(size, 0x123456789ABCDEF0U);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(DeviceGetSizeByteTest, OpensTheDeviceReadOnly) {
    CapturedLog log;
    WriteWhole(device, "");
    int flags = -1;
    FakeLibc::onIoctl = [&](unsigned long, void *) {
        flags = OpenFileFlags(device);
        return 0;
    };
    ASSERT_EQ(DeviceGetSizeByte(device.c_str(), &size), 0);
    ASSERT_NE(flags, -1);
    EXPECT_EQ(flags & O_ACCMODE, O_RDONLY);
    EXPECT_EQ(OpenFileFlags(device), -1); // closed again
}

TEST_F(DeviceGetSizeByteTest, FailsOnADeviceThatIsMissing) {
    CapturedLog log;
    FakeLibc::onIoctl = [](unsigned long, void *) { return ADD_FAILURE() << "no request", 0; };
    EXPECT_EQ(DeviceGetSizeByte(device.c_str(), &size), -1);
    EXPECT_EQ(log.Text(), "tool: Can't open device (" + device + ")\n");
}

TEST_F(DeviceGetSizeByteTest, FailsOnAPlainFile) {
    CapturedLog log;
    WriteWhole(device, "no block device");
    EXPECT_EQ(DeviceGetSizeByte(device.c_str(), &size), -1);
    EXPECT_EQ(log.Text(), "tool: Can't get size of device (" + device + ")\n");
}

TEST_F(DeviceGetSizeByteTest, AnyAnswerOf0OrMoreIsSuccess) {
    CapturedLog log;
    WriteWhole(device, "");
    FakeLibc::onIoctl = [](unsigned long, void *) { return 5; };
    EXPECT_EQ(DeviceGetSizeByte(device.c_str(), &size), 0);
}

TEST_F(DeviceGetSizeByteTest, LogsInItsOwnName) {
    CapturedLog log(2);
    EXPECT_EQ(DeviceGetSizeByte("/no/such", &size), -1);
    EXPECT_TRUE(log.Has("DeviceGetSizeByte() [N] : ***** Can't open device (/no/such)"));
}

} // namespace vesk
