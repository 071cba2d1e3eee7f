#include "driver/unpin_ranges.h"

#include "tests/support/unpin_ranges_fixture.h"

namespace vesk {
namespace {
using SendUnpinInfoToDriverTest = UnpinRangesTest;

int Send(uint64_t count) {
    std::vector<UnpinInfo> ranges;
    for (uint64_t i = 0; i < count; ++i) {
        ranges.push_back(Range(i));
    }
    return SendUnpinInfoToDriver(kDevice, ranges);
}
} // namespace

TEST_F(SendUnpinInfoToDriverTest, SendsNothingForAnEmptyList) {
    CapturedLog log;
    EXPECT_EQ(SendUnpinInfoToDriver("/no/such", {}), 0);
    ASSERT_NO_FATAL_FAILURE(ExpectSent({}));
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SendUnpinInfoToDriverTest, FirstRecordIsTheseBytes) {
    CapturedLog log;
    EXPECT_EQ(SendUnpinInfoToDriver(kDevice, {{0x1122334455667788, 0x80}}), 0);
    ASSERT_EQ(sent.size(), 1U);
    const char record[] = "\x88\x77\x66\x55\x44\x33\x22\x11\x80\0\0\0\0\0\0";
    EXPECT_EQ(sent[0].substr(0, 16), std::string(record, 16));
    EXPECT_EQ(sent[0].substr(16), std::string(16368, '\0'));
}

TEST_F(SendUnpinInfoToDriverTest, EndsAShortListByAZeroRecord) {
    CapturedLog log;
    EXPECT_EQ(Send(1023), 0);
    ASSERT_NO_FATAL_FAILURE(ExpectSent({Request(0, 1023)}));
    EXPECT_EQ(sent[0].substr(16368), std::string(16, '\0'));
}

TEST_F(SendUnpinInfoToDriverTest, SendsAFullListWithoutAZeroRecord) {
    CapturedLog log;
    EXPECT_EQ(Send(1024), 0);
    ASSERT_NO_FATAL_FAILURE(ExpectSent({Request(0, 1024)}));
    EXPECT_NE(sent[0].substr(16368), std::string(16, '\0'));
}

TEST_F(SendUnpinInfoToDriverTest, DropsTheRangeThatArrivesAtAFullList) {
    CapturedLog log;
    EXPECT_EQ(Send(1025), 0);
    ASSERT_NO_FATAL_FAILURE(ExpectSent({Request(0, 1024)}));
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SendUnpinInfoToDriverTest, BeginsTheSecondListBehindTheDroppedRange) {
    CapturedLog log;
    EXPECT_EQ(Send(1026), 0);
    ASSERT_NO_FATAL_FAILURE(ExpectSent({Request(0, 1024), Request(1025, 1026)}));
}

TEST_F(SendUnpinInfoToDriverTest, SendsTwoFullLists) {
    CapturedLog log;
    EXPECT_EQ(Send(2049), 0);
    ASSERT_NO_FATAL_FAILURE(ExpectSent({Request(0, 1024), Request(1025, 2049)}));
}

TEST_F(SendUnpinInfoToDriverTest, DropsEvery1025thRange) {
    CapturedLog log;
    EXPECT_EQ(Send(2050), 0);
    ASSERT_NO_FATAL_FAILURE(ExpectSent({Request(0, 1024), Request(1025, 2049)}));
    sent.clear();
    EXPECT_EQ(Send(3075), 0);
    ASSERT_NO_FATAL_FAILURE(
        ExpectSent({Request(0, 1024), Request(1025, 2049), Request(2050, 3074)}));
    sent.clear();
    EXPECT_EQ(Send(3076), 0);
    ASSERT_NO_FATAL_FAILURE(ExpectSent(
        {Request(0, 1024), Request(1025, 2049), Request(2050, 3074), Request(3075, 3076)}));
}

TEST_F(SendUnpinInfoToDriverTest, RangesOfZerosAreSentAsTheyAre) {
    CapturedLog log;
    EXPECT_EQ(SendUnpinInfoToDriver(kDevice, {{0, 0}, {5, 0}}), 0);
    ASSERT_EQ(sent.size(), 1U);
    std::string expected(16384, '\0');
    expected[16] = 5;
    EXPECT_TRUE(sent[0] == expected);
}

TEST_F(SendUnpinInfoToDriverTest, StopsAtTheFirstListThatIsRefused) {
    refused = 1;
    CapturedLog log;
    EXPECT_EQ(Send(3000), -1);
    EXPECT_EQ(sent.size(), 1U);
    EXPECT_EQ(log.Count("Send unpin inctl to driver failed"), 1);
}

TEST_F(SendUnpinInfoToDriverTest, FailsWhenTheLastListIsRefused) {
    refused = 2;
    CapturedLog log(2);
    EXPECT_EQ(Send(1026), -1);
    EXPECT_EQ(sent.size(), 2U);
    const Messages messages = log.Messages();
    EXPECT_EQ(messages.at(messages.size() - 2),
              "SendUnpinInfoToDriver() [N] : ***** Send unpin inctl to driver failed");
    EXPECT_EQ(LastOf(messages), "SendUnpinInfoToDriver() [N] : -----");
}

TEST_F(SendUnpinInfoToDriverTest, TellsEveryListAtLevel2) {
    CapturedLog log(2);
    EXPECT_EQ(SendUnpinInfoToDriver(kDevice, {{128, 256}, {UINT64_MAX, 1}}), 0);
    EXPECT_EQ(log.Messages(),
              (Messages{"SendUnpinInfoToDriver() [N] : +++++",
                        "SendUnpinInfoToDriver() [N]: Pass range to driver start",
                        "SendUnpinInfoToDriver() [N]: Send unpin inctl to driver, size=16384",
                        "DumpRanges() [N] : Unpin range [0] start sector = 128 num sectors = 256",
                        "DumpRanges() [N] : Unpin range [1] start sector = 18446744073709551615 "
                        "num sectors = 1",
                        "DoIoctl() [N] : +++++", "DoIoctl() [N] : -----",
                        "SendUnpinInfoToDriver() [N] : -----"}));
}

TEST_F(SendUnpinInfoToDriverTest, TellsAFullListToo) {
    CapturedLog log(2);
    EXPECT_EQ(Send(1026), 0);
    EXPECT_EQ(log.Count("SendUnpinInfoToDriver() [N]: Send unpin inctl to driver, size=16384"), 2);
    // 1024 ranges and one.
    const std::string first = "start sector = 72339069014638592 num sectors = 144678138029277184";
    EXPECT_EQ(log.Count("DumpRanges() [N] : Unpin range [0] " + first), 1);
    EXPECT_TRUE(log.Has("DumpRanges() [N] : Unpin range [1023] start sector = 72339069014639615 "
                        "num sectors = 144678138029280253"));
    EXPECT_TRUE(log.Has("DumpRanges() [N] : Unpin range [0] start sector = 72339069014639617 "
                        "num sectors = 144678138029280259"));
}

TEST(DumpRanges, LogsEveryRangeAtEveryLevel) {
    const UnpinInfo ranges[] = {{0, 0}, {UINT64_MAX, UINT64_MAX}};
    CapturedLog log;
    DumpRanges(ranges, 2);
    DumpRanges(ranges, 0);
    EXPECT_EQ(log.Text(), "tool: Unpin range [0] start sector = 0 num sectors = 0\n"
                          "tool: Unpin range [1] start sector = 18446744073709551615 num sectors "
                          "= 18446744073709551615\n");
    CapturedLog marked(2);
    DumpRanges(ranges, 1);
    EXPECT_EQ(marked.Messages(),
              Messages{"DumpRanges() [N] : Unpin range [0] start sector = 0 num sectors = 0"});
}

TEST_F(SendUnpinInfoToDriverTest, OneListIsSentAsItIs) {
    UnpinList list{};
    list.ranges[0] = Range(3);
    CapturedLog log;
    EXPECT_EQ(SendUnpinList(kDevice, &list, {"Caller", 1}), 0);
    ExpectSent({Request(3, 4)});
    EXPECT_EQ(log.Text(), "");
}

TEST_F(SendUnpinInfoToDriverTest, OneListThatIsRefusedFailsAtTheCallersPlace) {
    refused = 1;
    UnpinList list{};
    CapturedLog log(2);
    EXPECT_EQ(SendUnpinList(kDevice, &list, {"Caller", 1}), -1);
    EXPECT_EQ(log.Messages().back(), "Caller() [N] : ***** Send unpin inctl to driver failed");
}
} // namespace vesk
