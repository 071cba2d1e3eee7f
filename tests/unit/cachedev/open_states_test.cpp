#include "cachedev/open_states.h"

#include "cachedev/state_json.h"
#include "tests/support/test_device.h"

#include <gtest/gtest.h>

#include <stdexcept>

namespace vesk {
TEST(OpenStatesTest, AnOpenFileKeepsShowingItsMoment) {
    TestDevice test(4 * kBlockBytes, 2);
    OpenStates states{StateJsonOf};
    const uint64_t before = OpenStatesOpen(states, test.device);
    TestTouch(test.device, {0, 1, 2});
    const uint64_t after = OpenStatesOpen(states, test.device);
    EXPECT_NE(before, 0U);
    EXPECT_NE(before, after);
    EXPECT_NE(OpenStatesContent(states, before)->find("\"misses\":0"), std::string::npos);
    EXPECT_NE(OpenStatesContent(states, after)->find("\"misses\":3"), std::string::npos);
}

TEST(OpenStatesTest, AClosedFileIsGoneButNotUnderAReader) {
    TestDevice test(4 * kBlockBytes, 2);
    OpenStates states{StateJsonOf};
    const uint64_t handle = OpenStatesOpen(states, test.device);
    const StateContent reading = OpenStatesContent(states, handle);
    OpenStatesClose(states, handle);
    OpenStatesClose(states, handle);
    OpenStatesClose(states, 0);
    EXPECT_THROW(OpenStatesContent(states, handle), std::out_of_range);
    ASSERT_FALSE(reading->empty());
    EXPECT_EQ(reading->back(), '\n');
    EXPECT_NE(OpenStatesOpen(states, test.device), handle); // never used again
}

TEST(OpenStatesTest, EachFileShowsItsOwn) {
    TestDevice test(16 * kBlockBytes + 512, 2);
    OpenStates states{CacheDeviceCachedBits};
    const uint64_t before = OpenStatesOpen(states, test.device);
    TestTouch(test.device, {9, 16});
    const uint64_t after = OpenStatesOpen(states, test.device);
    EXPECT_EQ(*OpenStatesContent(states, before), std::string("\0\0\0", 3));
    EXPECT_EQ(*OpenStatesContent(states, after), std::string("\x00\x02\x01", 3));
    EXPECT_EQ(OpenStatesBytes(states, test.device), 3U);
}

TEST(OpenStatesTest, ShowsALengthWithoutMakingTheContentEachTime) {
    TestDevice test(4 * kBlockBytes, 2);
    OpenStates states{StateJsonOf};
    const uint64_t first = OpenStatesBytes(states, test.device);
    EXPECT_GT(first, 0U);
    const uint64_t handle = OpenStatesOpen(states, test.device);
    EXPECT_EQ(OpenStatesContent(states, handle)->size(), first);
    TestTouch(test.device, {0, 1});
    EXPECT_EQ(OpenStatesBytes(states, test.device), first);
}
} // namespace vesk
