// The device object through which a file's extents are looked up.
#include "space/file_extents.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"

#include <gtest/gtest.h>
#include <memory>

namespace vesk {
namespace {
using Messages = std::vector<std::string>;
using CreateDeviceTest = LeakCheckedTest;
} // namespace

TEST_F(CreateDeviceTest, AsksForTheDeviceOfThePathAndGivesAnOwnedObject) {
    CapturedLog log(3);
    const std::unique_ptr<FileSystemDevice> device(CreateFileSystemDeviceByFilePath("/volume1"));
    EXPECT_NE(device, nullptr);
    EXPECT_EQ(FakeAppliance::askedPath, "/volume1");
    EXPECT_EQ(FakeAppliance::liveDevices, 1);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(CreateDeviceTest, FailsWhenTheDevicePathCannotBeFound) {
    FakeAppliance::devicePathResult = -1;
    CapturedLog log;
    EXPECT_EQ(CreateFileSystemDeviceByFilePath("/volume1"), nullptr);
    EXPECT_EQ(log.Text(), "tool: Get device path of file fail. File path = \"/volume1\"\n");
}

TEST_F(CreateDeviceTest, FailsWhenThereIsNoDevice) {
    FakeAppliance::devicePathResult = 1;
    CapturedLog log;
    EXPECT_EQ(CreateFileSystemDeviceByFilePath("/volume1"), nullptr);
    EXPECT_EQ(log.Text(), "tool: Device path of file not found. File path = \"/volume1\"\n");
}

TEST_F(CreateDeviceTest, FailsWhenTheDeviceCannotBeUsed) {
    FakeAppliance::devicePath = "/dev/md2";
    FakeAppliance::createFails = true;
    CapturedLog log(2);
    EXPECT_EQ(CreateFileSystemDeviceByFilePath("/volume1"), nullptr);
    EXPECT_EQ(log.Messages(), Messages{"CreateFileSystemDeviceByFilePath() [N] : ***** Create file "
                                       "system device \"/dev/md2\" fail."});
}

TEST_F(CreateDeviceTest, EveryOtherResultGoesOn) {
    CapturedLog log;
    for (const int result : {-2, 2}) {
        FakeAppliance::devicePathResult = result;
        EXPECT_NE(std::unique_ptr<FileSystemDevice>(CreateFileSystemDeviceByFilePath("/volume1")),
                  nullptr);
    }
    EXPECT_EQ(log.Text(), "");
}
} // namespace vesk
