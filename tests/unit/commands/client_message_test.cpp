#include "commands/client_message.h"

#include "tests/unit/commands/client_fixture.h"

namespace vesk {

namespace {

const LogPlace kCaller{"Caller", 1};

} // namespace

TEST_F(ClientRequestsTest, ARequestIsSentWithItsFilesIfItHasAny) {
    const int queueId = MsgQueueGet(kMessageKeyFile);
    EXPECT_EQ(SendRequest(queueId, 2, "/volume1", "/volume1/a", kCaller), 0);
    EXPECT_EQ(OnlyMessage().text, RecordBytes(2, "/volume1", "/volume1/a"));
    EXPECT_EQ(SendRequest(queueId, 4, "/volume1", nullptr, kCaller), 0);
    EXPECT_EQ(OnlyMessage().text, RecordBytes(4, "/volume1"));
}

TEST_F(ClientRequestsTest, TextsThatFillTheirFieldsHaveNoNul) {
    const int queueId = MsgQueueGet(kMessageKeyFile);
    const std::string longText(3000, 'x');
    EXPECT_EQ(SendRequest(queueId, 1, longText.c_str(), longText.c_str(), kCaller), 0);
    EXPECT_EQ(OnlyMessage().text, std::string("\1\0\0\0", 4) + std::string(512 + 1024, 'x'));
}

TEST_F(ClientRequestsTest, ARequestThatCannotBeSentFailsAtTheCallersPlace) {
    CapturedLog log(2);
    EXPECT_EQ(SendRequest(-1, 1, "/volume1", nullptr, kCaller), -1);
    EXPECT_EQ(log.Messages().back(), "Caller() [N] : ***** Send message failed: Invalid argument");
}

} // namespace vesk
