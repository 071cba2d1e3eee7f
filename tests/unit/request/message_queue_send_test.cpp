// Sending and waiting for an acknowledgement.
#include "request/message_queue.h"

#include "tests/support/queue_fixture.h"

#include "request/request_record.h"

#include <cerrno>
#include <cstring>

namespace vesk {
namespace {
const LogPlace kCaller{"Caller", 1};
} // namespace

class MessageQueueSendTest : public QueueTest {
protected:
    void SetUp() override {
        QueueTest::SetUp();
        if (!IsSkipped()) {
            queueId_ = MsgQueueGet(KeyFile());
        }
    }
    static RequestMessage Message(int type, const std::string &mountPath) {
        RequestMessage message{};
        message.messageType = 1;
        message.record.type = type;
        snprintf(message.record.mountPath, sizeof(message.record.mountPath), "%s",
                 mountPath.c_str());
        return message;
    }
    int Send(int queueId) const {
        const RequestMessage message = Message(kRequestReloadPinBlocks, "/volume1");
        return MsgQueueSend(queueId, &message, kRequestMessageBytes);
    }
    void FillQueue() const {
        for (int i = 0; i < 1024; ++i) {
            ASSERT_TRUE(PutMessage(queueId_, 1, std::string(1540, 'x')));
        }
    }
    int queueId_ = -1;
};

TEST_F(MessageQueueSendTest, AMessageArrivesByteForByte) {
    CapturedLog log(2);
    EXPECT_EQ(Send(queueId_), 0);
    const std::string id = std::to_string(queueId_);
    EXPECT_EQ(log.Messages(),
              (Messages{
                  "MsgQueueSend() [N]: Send to message queue (id = " + id + ") msg type = 1",
                  "MsgQueueSend() [N]: Send to message queue (id = " + id + ") OK",
              }));
    const RawMessage message = TakeMessage(queueId_);
    EXPECT_EQ(message.type, 1);
    EXPECT_EQ(message.text, RecordBytes(6, "/volume1"));
    EXPECT_EQ(FakeLibc::sleeps, 0);
}

TEST_F(MessageQueueSendTest, TheQueueHolds1024Requests) {
    FillQueue();
    EXPECT_FALSE(PutMessage(queueId_, 1, std::string(1540, 'x')));
    EXPECT_EQ(errno, EAGAIN);
    EXPECT_EQ(CountMessages(queueId_), 1024);
}

TEST_F(MessageQueueSendTest, AFullQueueFailsAfterThreeSeconds) {
    FillQueue();
    CapturedLog log;
    errno = 0;
    EXPECT_EQ(Send(queueId_), -1);
    EXPECT_STREQ(strerror(errno), "Resource temporarily unavailable");
    EXPECT_EQ(FakeLibc::sleeps, 3);
    EXPECT_EQ(log.Messages(), Messages{"Send message timeout (3 seconds)"});
    EXPECT_EQ(CountMessages(queueId_), 1024);
}

TEST_F(MessageQueueSendTest, AnInvalidQueueFailsAfterThreeSeconds) {
    CapturedLog log(2);
    errno = 0;
    EXPECT_EQ(Send(-1), -1);
    EXPECT_STREQ(strerror(errno), "Invalid argument");
    EXPECT_EQ(FakeLibc::sleeps, 3);
    EXPECT_EQ(log.Messages(),
              (Messages{
                  "MsgQueueSend() [N]: Send to message queue (id = -1) msg type = 1",
                  "MsgQueueSend() [N]: Send to message queue (id = -1) msg type = 1",
                  "MsgQueueSend() [N]: Send to message queue (id = -1) msg type = 1",
                  "MsgQueueSend() [N] : ***** Send message timeout (3 seconds)",
              }));
}

TEST_F(MessageQueueSendTest, TheReasonIsThatOfTheLastTryAndNotOfThePauseBehindIt) {
    FakeLibc::onSleep = [] { errno = EINTR; };
    const CapturedLog log;
    EXPECT_EQ(Send(-1), -1);
    EXPECT_EQ(errno, EINVAL);
}

TEST_F(MessageQueueSendTest, RoomThatComesMeanwhileIsUsed) {
    FillQueue();
    FakeLibc::onSleep = [this] { TakeMessage(queueId_); };
    CapturedLog log;
    EXPECT_EQ(Send(queueId_), 0);
    EXPECT_EQ(FakeLibc::sleeps, 1);
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(MessageQueueSendTest, TheThirdTryCounts) {
    FakeLibc::FailFrom("msgsnd", EINTR);
    int slept = 0;
    FakeLibc::onSleep = [&slept] {
        if (++slept == 2) {
            FakeLibc::Fail("msgsnd", 0);
        }
    };
    EXPECT_EQ(Send(queueId_), 0);
    EXPECT_EQ(slept, 2);
}

TEST_F(MessageQueueSendTest, WithoutAnAcknowledgementTheWaitEndsAfterThreeSeconds) {
    CapturedLog log(2);
    EXPECT_EQ(WaitForAck(queueId_, 2), -1);
    EXPECT_EQ(FakeLibc::sleeps, 3);
    EXPECT_EQ(log.Messages(),
              (Messages{
                  "WaitForAck() [N] : +++++",
                  "WaitForAck() [N]: Wait for ack. Secound = 1",
                  "WaitForAck() [N]: Wait for ack. Secound = 2",
                  "WaitForAck() [N]: Wait for ack. Secound = 3",
                  "WaitForAck() [N] : ***** Can't get ack messages (Wait for 3 sceounds)",
                  "WaitForAck() [N] : -----",
              }));
}

TEST_F(MessageQueueSendTest, AnAcknowledgementEndsTheWait) {
    FakeLibc::onSleep = [this] {
        if (FakeLibc::sleeps == 2) {
            PutMessage(queueId_, 2, RecordBytes(kRequestAck, "/volume1"));
        }
    };
    CapturedLog log(2);
    EXPECT_EQ(WaitForAck(queueId_, 2), 0);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "WaitForAck() [N] : +++++",
                                  "WaitForAck() [N]: Wait for ack. Secound = 1",
                                  "WaitForAck() [N]: Wait for ack. Secound = 2",
                                  "WaitForAck() [N]: Get message",
                                  "WaitForAck() [N]: Get ACK from servier",
                                  "WaitForAck() [N] : -----",
                              }));
}

TEST_F(MessageQueueSendTest, AnyOtherAnswerIsWrong) {
    PutMessage(queueId_, 1, RecordBytes(kRequestAck, "/volume1")); // not the type waited for
    PutMessage(queueId_, 2, RecordBytes(kRequestPinFiles, "/volume1"));
    CapturedLog log;
    EXPECT_EQ(WaitForAck(queueId_, 2), -1);
    EXPECT_EQ(log.Messages(), Messages{"Get wrong request"});
    EXPECT_EQ(CountMessages(queueId_), 1);
}

TEST_F(MessageQueueSendTest, ARequestIsSentWithItsFilesIfItHasAny) {
    EXPECT_EQ(SendRequest(queueId_, 2, "/volume1", "/volume1/a", kCaller), 0);
    EXPECT_EQ(TakeMessage(queueId_).text, RecordBytes(2, "/volume1", "/volume1/a"));
    EXPECT_EQ(SendRequest(queueId_, 4, "/volume1", nullptr, kCaller), 0);
    EXPECT_EQ(TakeMessage(queueId_).text, RecordBytes(4, "/volume1"));
    EXPECT_EQ(CountMessages(queueId_), 0);
}

TEST_F(MessageQueueSendTest, TextsThatFillTheirFieldsHaveNoNul) {
    const std::string longText(3000, 'x');
    EXPECT_EQ(SendRequest(queueId_, 1, longText.c_str(), longText.c_str(), kCaller), 0);
    const RawMessage message = TakeMessage(queueId_);
    EXPECT_EQ(message.type, 1);
    EXPECT_EQ(message.text, std::string("\1\0\0\0", 4).append(512 + 1024, 'x'));
}

TEST_F(MessageQueueSendTest, AMountPathOf512CharactersIsSentWhole) {
    for (const size_t length : {size_t{511}, size_t{512}}) {
        const std::string mountPath(length, 'm');
        EXPECT_EQ(SendRequest(queueId_, 6, mountPath.c_str(), nullptr, kCaller), 0);
        EXPECT_EQ(TakeMessage(queueId_).text, RecordBytes(6, mountPath));
    }
}

TEST_F(MessageQueueSendTest, ARequestThatCannotBeSentFailsAtTheCallersPlace) {
    CapturedLog log(2);
    EXPECT_EQ(SendRequest(-1, 1, "/volume1", nullptr, kCaller), -1);
    ASSERT_FALSE(log.Messages().empty());
    EXPECT_EQ(log.Messages().back(), "Caller() [N] : ***** Send message failed: Invalid argument");
}
} // namespace vesk
