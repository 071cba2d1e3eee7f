#include "request/request_record.h"

#include "tests/support/config_fixture.h"

#include <cstddef>

namespace vesk {

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

} // namespace vesk
