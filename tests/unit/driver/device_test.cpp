#include "driver/device.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/open_file.h"
#include "tests/support/recorded_opens.h"
#include "tests/support/temp_dir.h"

#include <cerrno>
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

std::string Address(const void *data) {
    char text[32];
    snprintf(text, sizeof(text), "%p", data);
    return text;
}

class DoIoctlTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        WriteWhole(device, "");
    }
    TempDir folder;
    const std::string device = folder.Path("cachedev_0");
    int data = 1;
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
    const RecordedOpens opens;
    ASSERT_EQ(DeviceGetSizeByte(device.c_str(), &size), 0);
    ASSERT_NE(flags, -1);
    EXPECT_EQ(flags & O_ACCMODE, O_RDONLY);
    EXPECT_EQ(opens.FlagsOf(device), std::vector<int>{O_RDONLY | O_CLOEXEC});
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

TEST_F(DoIoctlTest, HandsTheRequestAndTheDataToTheDevice) {
    CapturedLog log;
    int calls = 0;
    FakeLibc::onIoctl = [&](unsigned long request, void *argument) {
        ++calls;
        EXPECT_EQ(request, 0x8004FECFUL);
        EXPECT_EQ(argument, &data);
        *static_cast<int *>(argument) = 7;
        return 0;
    };
    EXPECT_EQ(DoIoctl(device.c_str(), 0x8004FECF, &data, 4), 0);
    EXPECT_EQ(data, 7);
    EXPECT_EQ(calls, 1);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(DoIoctlTest, RequestWithoutDataIsIssuedOnce) {
    CapturedLog log;
    int calls = 0;
    FakeLibc::onIoctl = [&](unsigned long request, void *) {
        EXPECT_EQ(request, 0xFED1UL);
        ++calls;
        return 0;
    };
    EXPECT_EQ(DoIoctl(device.c_str(), 0xFED1, nullptr, 0), 0);
    EXPECT_EQ(calls, 1);
}

TEST_F(DoIoctlTest, OpensTheDeviceForReadingAndWritingForEachRequest) {
    CapturedLog log;
    int flags = -1;
    FakeLibc::onIoctl = [&](unsigned long, void *) {
        flags = OpenFileFlags(device);
        return 0;
    };
    const RecordedOpens opens;
    for (size_t i = 1; i <= 2; ++i) {
        ASSERT_EQ(DoIoctl(device.c_str(), 0xFED1, nullptr, 0), 0);
        ASSERT_NE(flags, -1);
        EXPECT_EQ(flags & O_ACCMODE, O_RDWR);
        EXPECT_EQ(opens.FlagsOf(device), std::vector<int>(i, O_RDWR | O_CLOEXEC));
        EXPECT_EQ(OpenFileFlags(device), -1); // closed again
    }
}

TEST_F(DoIoctlTest, EveryAnswerOf0OrMoreIsSuccess) {
    CapturedLog log;
    for (const int answer : {0, 1, 4096}) {
        FakeLibc::onIoctl = [answer](unsigned long, void *) { return answer; };
        EXPECT_EQ(DoIoctl(device.c_str(), 0xFED0, &data, 4), 0);
    }
    EXPECT_EQ(log.Text(), "");
}

TEST_F(DoIoctlTest, FailedRequestIsToldWithNumberDataSizePathAndResult) {
    CapturedLog log;
    FakeLibc::onIoctl = [](unsigned long, void *) { return -3; };
    EXPECT_EQ(DoIoctl(device.c_str(), 0xFED0, &data, 16384), -1);
    EXPECT_EQ(log.Text(), "tool: Ioctl Error: Send ioctl 65232 Data (" + Address(&data) +
                              ") size (16384) to " + device + ", ret=-3\n\n");
}

TEST_F(DoIoctlTest, FailedRequestWithoutDataShowsTheNullAddress) {
    CapturedLog log;
    FakeLibc::onIoctl = [](unsigned long, void *) { return -1; };
    EXPECT_EQ(DoIoctl(device.c_str(), 0xFED1, nullptr, 0), -1);
    EXPECT_EQ(log.Text(), "tool: Ioctl Error: Send ioctl 65233 Data (" + Address(nullptr) +
                              ") size (0) to " + device + ", ret=-1\n\n");
}

TEST_F(DoIoctlTest, RequestNumberWithTheHighestBitIsShownNegative) {
    CapturedLog log;
    FakeLibc::onIoctl = [](unsigned long, void *) { return -1; };
    EXPECT_EQ(DoIoctl(device.c_str(), 0x8004FED2, &data, 4), -1);
    EXPECT_EQ(log.Text(), "tool: Ioctl Error: Send ioctl -2147156270 Data (" + Address(&data) +
                              ") size (4) to " + device + ", ret=-1\n\n");
}

TEST_F(DoIoctlTest, PlainFileRefusesTheRequest) {
    CapturedLog log;
    EXPECT_EQ(DoIoctl(device.c_str(), 0xFED0, &data, 4), -1);
    EXPECT_EQ(log.Text(), "tool: Ioctl Error: Send ioctl 65232 Data (" + Address(&data) +
                              ") size (4) to " + device + ", ret=-1\n\n");
}

TEST_F(DoIoctlTest, DeviceThatCannotBeOpenedGetsNoRequest) {
    FakeLibc::onIoctl = [](unsigned long, void *) { return ADD_FAILURE() << "a request", 0; };
    CapturedLog log;
    EXPECT_EQ(DoIoctl("/no/such", 0xFED0, &data, 4), -1);
    EXPECT_EQ(log.Text(), "tool: Open device path (/no/such) error\n\n");
    // A folder cannot be opened for writing.
    EXPECT_EQ(DoIoctl(folder.Path().c_str(), 0xFED0, &data, 4), -1);
}

TEST_F(DoIoctlTest, IsTracedAtLevel2) {
    CapturedLog log(2);
    FakeLibc::onIoctl = [](unsigned long, void *) { return 0; };
    EXPECT_EQ(DoIoctl(device.c_str(), 0xFED0, &data, 4), 0);
    EXPECT_EQ(DoIoctl("/no/such", 0xFED0, &data, 4), -1);
    EXPECT_EQ(log.Messages(),
              (std::vector<std::string>{"DoIoctl() [N] : +++++", "DoIoctl() [N] : -----",
                                        "DoIoctl() [N] : +++++",
                                        "DoIoctl() [N] : ***** Open device path (/no/such) error",
                                        "", "DoIoctl() [N] : -----"}));
}

TEST_F(DoIoctlTest, CallersFailureIsLoggedAtItsPlaceBehindItsCause) {
    int result = 5;
    FakeLibc::onIoctl = [&result](unsigned long, void *) { return result; };
    CapturedLog log(2);
    EXPECT_EQ(DoIoctlOrSay("No answer", device.c_str(), 7, &data, 4, {"Caller", 1}), 0);
    EXPECT_EQ(log.Count("Caller() [N] : ***** No answer"), 0);
    result = -1;
    EXPECT_EQ(DoIoctlOrSay("No answer", device.c_str(), 7, &data, 4, {"Caller", 1}), -1);
    EXPECT_EQ(log.Messages().back(), "Caller() [N] : ***** No answer");
    EXPECT_EQ(log.Count("DoIoctl() [N] : -----"), 2);
}
} // namespace vesk
