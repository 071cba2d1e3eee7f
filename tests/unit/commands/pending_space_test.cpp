#include "commands/commands.h"

#include "tests/unit/commands/client_fixture.h"

namespace vesk {
TEST_F(ClientRequestsTest, PendingSpaceRequestsAlwaysFailAfterThreeSeconds) {
    for (const auto &request : {AddPendingSpaceRequest, RemovePendingSpaceRequest}) {
        FakeLibc::sleeps = 0;
        CapturedLog log;
        EXPECT_EQ(request(Volume()), -1);
        EXPECT_EQ(log.Messages(), (Messages{
                                      "Send message timeout (3 seconds)",
                                      "Send message failed: Invalid argument",
                                  }));
        EXPECT_EQ(FakeLibc::sleeps, 3);
    }
    const int queueId = MsgQueueGet(kMessageKeyFile); // made, but never sent to
    EXPECT_EQ(CountQueues(), 1);
    EXPECT_EQ(CountMessages(queueId), 0);
}

TEST_F(ClientRequestsTest, APendingSpaceRequestShowsTheIdentifierThatItUses) {
    CapturedLog log(2);
    EXPECT_EQ(AddPendingSpaceRequest(Volume()), -1);
    EXPECT_EQ(MessagesOf(log, "SetSpaceStateRequest"),
              (Messages{
                  "SetSpaceStateRequest() [N] : +++++",
                  "SetSpaceStateRequest() [N]: Get server message queue id = -1",
                  "SetSpaceStateRequest() [N] : ***** Send message failed: Invalid argument",
                  "SetSpaceStateRequest() [N] : -----",
              }));
    EXPECT_EQ(FirstOf(MessagesOf(log, "MsgQueueSend")),
              "MsgQueueSend() [N]: Send to message queue (id = -1) msg type = 1");
}

TEST_F(ClientRequestsTest, APendingSpaceRequestDoesNotMindAMissingQueue) {
    MsgQueueGet(kMessageKeyFile);
    WriteWhole(kMessageKeyFile, "7");
    CapturedLog log;
    EXPECT_EQ(AddPendingSpaceRequest(Volume()), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open message queue: No such file or directory",
                                  "Send message timeout (3 seconds)",
                                  "Send message failed: Invalid argument",
                              }));
}

TEST_F(ClientRequestsTest, OtherPendingSpaceTypesAreRefusedBehindTheVolume) {
    for (const int type : {0, 1, 2, 3, 6}) {
        CapturedLog log;
        EXPECT_EQ(SetSpaceStateRequest(Volume(), type), -1);
        EXPECT_EQ(log.Messages(),
                  Messages{std::string("Unhandle request type = ") + RequestTypeToString(type)});
    }
    FakeAppliance::caches.clear();
    CapturedLog log;
    EXPECT_EQ(SetSpaceStateRequest(Volume(), kRequestAck), -1);
    EXPECT_EQ(log.Messages(), Messages{"Volume (" + volume_ + ") doesn't support pin"});
    EXPECT_EQ(FakeLibc::sleeps, 0);
    ExpectUntouchedQueue();
}
} // namespace vesk
