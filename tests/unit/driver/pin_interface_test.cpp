#include "driver/pin_interface.h"

#include <cstring>
#include <gtest/gtest.h>

namespace vesk {
TEST(PinInterface, RequestNumbersAreTheDrivers) {
    EXPECT_EQ(kPinIoctlSetBitmap, 65231U);
    EXPECT_EQ(kPinIoctlQueryBitmapSet, 2147811023U);
    EXPECT_EQ(kPinIoctlUnpinRanges, 65232U);
    EXPECT_EQ(kPinIoctlUnpinAll, 65233U);
    EXPECT_EQ(kPinIoctlQueryAllUnpinned, 2147811026U);
}

TEST(PinInterface, RangeRecordIsStartThenCountInLittleEndian) {
    const UnpinInfo range = {0x0102030405060708, 0x1112131415161718};
    const unsigned char expected[] = {8,    7,    6,    5,    4,    3,    2,    1,
                                      0x18, 0x17, 0x16, 0x15, 0x14, 0x13, 0x12, 0x11};
    ASSERT_EQ(sizeof(range), sizeof(expected));
    EXPECT_EQ(memcmp(&range, expected, sizeof(expected)), 0);
}

TEST(PinInterface, RangeListIs1024RecordsIn16384Bytes) {
    EXPECT_EQ(sizeof(UnpinList), 16384U);
    UnpinList list{};
    const auto *bytes = reinterpret_cast<const char *>(&list);
    EXPECT_EQ(reinterpret_cast<const char *>(&list.ranges[1023]) - bytes, 16368);
}
} // namespace vesk
