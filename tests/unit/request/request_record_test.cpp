#include "request/request_record.h"

#include "tests/support/config_fixture.h"

#include <climits>
#include <cstddef>

namespace vesk {
class RequestTypeTest : public ConfigTest {};
class RequestRecordTest : public ConfigTest {};

TEST_F(RequestRecordTest, LayoutIsTheMessageText) {
    EXPECT_EQ(sizeof(RequestRecord), 1540U);
    EXPECT_EQ(offsetof(RequestRecord, type), 0U);
    EXPECT_EQ(offsetof(RequestRecord, mountPath), 4U);
    EXPECT_EQ(offsetof(RequestRecord, data), 516U);
}

TEST_F(RequestRecordTest, TextNamesTypeMountPathAndData) {
    const RequestRecord record = MakeRecord(kRequestPinFiles, "/volume1", "a%s#1;b#2");
    std::string text = "old";
    RequestToString(&text, &record);
    EXPECT_EQ(text, "Request type=pinFiles mountPath=/volume1 data=a%s#1;b#2");
}

TEST_F(RequestRecordTest, ALongTextIsCutAt1023Characters) {
    const RequestRecord record =
        MakeRecord(kRequestAck, std::string(511, 'm'), std::string(1023, 'd'));
    std::string text;
    RequestToString(&text, &record);
    const std::string head = "Request type=ack mountPath=" + std::string(511, 'm') + " data=";
    EXPECT_EQ(text, head + std::string(1023 - head.size(), 'd'));
}

TEST_F(RequestRecordTest, ATypeWithoutANameIsShownWithoutPrintingANull) {
    const RequestRecord record = MakeRecord(7, "/volume1");
    CapturedLog log;
    std::string text;
    RequestToString(&text, &record);
    EXPECT_EQ(text, "Request type=(null) mountPath=/volume1 data=");
    EXPECT_EQ(log.Messages(), Messages{"Convert request type to string errror"});
}

TEST_F(RequestTypeTest, EveryValueHasItsName) {
    CapturedLog log;
    EXPECT_STREQ(RequestTypeToString(0), "unknown");
    EXPECT_STREQ(RequestTypeToString(1), "pinFiles");
    EXPECT_STREQ(RequestTypeToString(2), "unpinFiles");
    EXPECT_STREQ(RequestTypeToString(3), "ack");
    EXPECT_STREQ(RequestTypeToString(4), "addPendingSpace");
    EXPECT_STREQ(RequestTypeToString(5), "removePendigSpace");
    EXPECT_STREQ(RequestTypeToString(6), "reloadPinBlocks");
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(RequestTypeTest, ValuesOutsideTheTableGiveNullAndAMessage) {
    for (const int type : {7, 8, INT_MAX, -1, INT_MIN}) {
        CapturedLog log;
        EXPECT_EQ(RequestTypeToString(type), nullptr) << type;
        EXPECT_EQ(log.Messages(), Messages{"Convert request type to string errror"}) << type;
    }
    CapturedLog log(2);
    RequestTypeToString(7);
    EXPECT_EQ(log.Messages(),
              Messages{"RequestTypeToString() [N] : ***** Convert request type to string errror"});
}

TEST_F(RequestTypeTest, LogLinesShowANameOrNull) {
    CapturedLog log;
    EXPECT_STREQ(RequestTypeForLog(6), "reloadPinBlocks");
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_STREQ(RequestTypeForLog(7), "(null)");
    EXPECT_EQ(log.Messages(), Messages{"Convert request type to string errror"});
}

TEST_F(RequestTypeTest, EveryNameHasItsValue) {
    for (int type = 0; type <= 6; ++type) {
        EXPECT_EQ(StringToRequestType(RequestTypeToString(type)), type);
    }
}

TEST_F(RequestTypeTest, OtherNamesAreUnknownWithoutAMessage) {
    CapturedLog log(3);
    for (const char *name : {"", "pinfiles", "pinFiles ", "pinFile", "removePendingSpace", "7"}) {
        EXPECT_EQ(StringToRequestType(name), 0) << name;
    }
    EXPECT_EQ(StringToRequestType(std::string("pinFiles\0", 9)), 0);
    EXPECT_EQ(log.Messages(), Messages{});
}
} // namespace vesk
