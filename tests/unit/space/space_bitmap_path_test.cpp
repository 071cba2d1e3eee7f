#include "space/space.h"

#include "base/malloc_text.h"
#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"

#include <cerrno>
#include <gtest/gtest.h>

namespace vesk {
namespace {
using SpaceBitmapPathTest = LeakCheckedTest;

std::string PathBelow(const std::string &referencePath) {
    return MallocText(BitmapGetPathByReferencePath(referencePath.c_str())).get();
}
} // namespace

TEST_F(SpaceBitmapPathTest, LiesInTheTopDirectoryOfTheVolume) {
    CapturedLog log(3);
    EXPECT_EQ(PathBelow("/volume1"), "/volume1/veskcachepinfile.bitmap");
    EXPECT_EQ(PathBelow(""), "/veskcachepinfile.bitmap");
    EXPECT_EQ(PathBelow("/vol%s"), "/vol%s/veskcachepinfile.bitmap");
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceBitmapPathTest, IsCutTo511Characters) {
    const std::string name = "/veskcachepinfile.bitmap"; // 24 characters
    const std::string fits(487, 'v');
    EXPECT_EQ(PathBelow(fits), fits + name);
    EXPECT_EQ(PathBelow(fits + "v"), fits + "v/veskcachepinfile.bitma");
    EXPECT_EQ(PathBelow(std::string(600, 'v')), std::string(511, 'v'));
}

TEST_F(SpaceBitmapPathTest, OfASpaceIsBelowItsReferencePath) {
    CapturedLog log;
    FakeApplianceOneVolume("/dev/mapper/cachedev_0");
    EXPECT_STREQ(MallocText(SpaceGetBitmapPath("uuid-1")).get(),
                 "/volume1/veskcachepinfile.bitmap");
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SpaceBitmapPathTest, OfAnUnknownSpaceIsAnError) {
    CapturedLog log;
    EXPECT_EQ(SpaceGetBitmapPath("uuid-9"), nullptr);
    EXPECT_EQ(log.Text(), "tool: Can't get reference path\n");
    CapturedLog marked(2);
    EXPECT_EQ(SpaceGetBitmapPath("uuid-9"), nullptr);
    EXPECT_TRUE(marked.Has("SpaceGetBitmapPath() [N] : ***** Can't get reference path"));
}

TEST_F(SpaceBitmapPathTest, RunningOutOfMemoryIsAnError) {
    FakeApplianceOneVolume("/dev/mapper/cachedev_0");
    CapturedLog log;
    FakeLibc::Fail("strdup", ENOMEM, 3); // behind the UUID in the library and the reference path
    EXPECT_EQ(SpaceGetBitmapPath("uuid-1"), nullptr);
    EXPECT_EQ(log.Text(), "tool: Can't get bitmap path\n");
}
} // namespace vesk
