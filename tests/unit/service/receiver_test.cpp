#include "service/receiver.h"

#include "service/receiver_rest.h"
#include "tests/unit/service/child_process.h"
#include "tests/unit/service/receiver_fixture.h"

#include <csignal>
#include <new>
#include <sys/msg.h>

namespace vesk {
namespace {
const bool kPrivateWorld = UsePrivateWorld();
} // namespace

TEST_F(ReceiverTest, RequestsAreStoredInTheOrderOfTheQueue) {
    const std::string a = CreateFile("a");
    const std::string b = CreateFile("b");
    Put(kRequestPinFiles, volume_, volume_ + "/a;" + volume_ + "/b");
    Put(kRequestUnpinFiles, volume_, volume_ + "/a");
    Put(kRequestReloadPinBlocks, "/volume2");
    Put(kRequestUnknown, "/volume3");
    Put(kRequestAck, "/volume4");
    PutEnd();
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(log.Messages(), (Messages{"Space UUID is not set", "Get wrong message format"}));
    Json::Value expected = ParseJson(R"({"nextRequestNum" : 5,
        "requestQueue" : ["0", "1", "2", "3", "4"],
        "requests" : {"2" : {"type" : "reloadPinBlocks", "mountPath" : "/volume2", "data" : null},
                      "3" : {"type" : "unknown", "mountPath" : "/volume3", "data" : null},
                      "4" : {"type" : "ack", "mountPath" : "/volume4", "data" : null}}})");
    expected["requests"]["0"]["type"] = "pinFiles";
    expected["requests"]["0"]["mountPath"] = volume_;
    expected["requests"]["0"]["data"] = "a#" + a + ";b#" + b;
    expected["requests"]["1"]["type"] = "unpinFiles";
    expected["requests"]["1"]["mountPath"] = volume_;
    expected["requests"]["1"]["data"] = "a#" + a;
    EXPECT_EQ(ParseJson(ReadWhole(config_)), expected);
}

TEST_F(ReceiverTest, AtLevel2EachMessageIsLogged) {
    Put(kRequestReloadPinBlocks, "/volume1");
    PutEnd();
    CapturedLog log(2);
    RunReceiver();
    EXPECT_EQ(MessagesOf(log, "GetRequests"),
              (Messages{
                  "GetRequests() [N] : +++++",
                  "GetRequests() [N]: Get server messsage queue id = " + std::to_string(queueId_),
                  "GetRequests() [N]: Get a new message. Request type = reloadPinBlocks",
                  "GetRequests() [N]: Signal a new request is added",
                  "GetRequests() [N]: Get a new message. Request type = reloadPinBlocks",
                  "GetRequests() [N] : ***** Get wrong message format",
                  "GetRequests() [N] : -----",
              }));
    EXPECT_EQ(ServerMsgQueueId, queueId_);
}

TEST_F(ReceiverTest, AnEmptyMountPathStopsItAndLaterRequestsStayUnread) {
    Put(kRequestPinFiles, "", "/volume1/a");
    Put(kRequestReloadPinBlocks, "/volume1");
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(log.Messages(), (Messages{"Space UUID is not set", "Get wrong message format"}));
    EXPECT_EQ(CountMessages(queueId_), 1);
    EXPECT_FALSE(std::filesystem::exists(config_));
}

TEST_F(ReceiverTest, APinWithoutFilesStopsIt) {
    Put(kRequestPinFiles, "/volume1");
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(log.Messages(), (Messages{"Should provide file paths", "Get wrong message format"}));
}

TEST_F(ReceiverTest, AFileThatDoesNotExistStopsIt) {
    Put(kRequestPinFiles, volume_, volume_ + "/missing");
    CapturedLog log(2);
    RunReceiver();
    const Messages messages = MessagesOf(log, "GetRequests");
    ASSERT_GE(messages.size(), 2U);
    EXPECT_EQ(messages.rbegin()[1],
              "GetRequests() [N] : ***** Can't add request to config (" + config_ + ")");
}

TEST_F(ReceiverTest, ADamagedConfigurationStopsItAndStaysAsItIs) {
    WriteWhole(config_, "[]");
    Put(kRequestReloadPinBlocks, "/volume1");
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't read data from config file (" + config_ + ")",
                                  "Can't add request to config (" + config_ + ")",
                              }));
    EXPECT_EQ(ReadWhole(config_), "[]");
}

TEST_F(ReceiverTest, MessagesOfOtherTypesStayInTheQueue) {
    Put(RecordBytes(kRequestReloadPinBlocks, "/other"), 2);
    Put(RecordBytes(kRequestReloadPinBlocks, "/other"), 99);
    Put(kRequestReloadPinBlocks, "/volume1");
    PutEnd();
    const CapturedLog log;
    RunReceiver();
    EXPECT_EQ(CountMessages(queueId_), 2);
    EXPECT_EQ(TakeMessage(queueId_).type, 2);
    EXPECT_EQ(TakeMessage(queueId_).type, 99);
    EXPECT_EQ(ParseJson(ReadWhole(config_))["requestQueue"].size(), 1U);
}

TEST_F(ReceiverTest, AQueueThatIsTakenAwayStopsIt) {
    // The queue goes while the receiver is at a message, before it asks for the next.
    FakeLibc::onRead = [this](int, long long, size_t) { msgctl(queueId_, IPC_RMID, nullptr); };
    WriteWhole(config_, "{}");
    Put(kRequestReloadPinBlocks, "/volume1");
    CapturedLog log;
    RunReceiver();
    FakeLibc::onRead = nullptr;
    EXPECT_EQ(log.Messages(), Messages{"Receive messaged failed: Invalid argument"});
    EXPECT_EQ(ParseJson(ReadWhole(config_))["requestQueue"].size(), 1U);
}

TEST_F(ReceiverTest, ALackOfMemoryHoldsTheMessageBackForASecond) {
    bool first = true;
    FakeLibc::onRead = [&first](int, long long, size_t) { // of the configuration
        if (first) {
            first = false;
            throw std::bad_alloc();
        }
    };
    WriteWhole(config_, "{}");
    Put(kRequestReloadPinBlocks, "/volume1");
    PutEnd();
    CapturedLog log;
    RunReceiver();
    FakeLibc::onRead = nullptr;
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Message is held back: std::bad_alloc",
                                  "Space UUID is not set",
                                  "Get wrong message format",
                              }));
    EXPECT_EQ(FakeLibc::sleeps, 1);
    EXPECT_EQ(ParseJson(ReadWhole(config_))["requestQueue"].size(), 1U);
}

TEST_F(ReceiverTest, OnceItHasEndedItIsNotWaitedFor) {
    PutEnd();
    ChildProcess child({1}, [this] {
        RunReceiver();
        bool waited = false;
        FakeLibc::onPause = [&waited] { waited = true; };
        ReceiverAwaitRest();
        return waited ? 1 : 0;
    });
    EXPECT_EQ(child.AwaitEnd(), 0);
    EXPECT_EQ(child.Messages(), (Messages{"Space UUID is not set", "Get wrong message format"}));
}

TEST_F(ReceiverTest, WithoutAQueueItEndsAtOnce) {
    WriteWhole(kMessageKeyFile, "");
    CapturedLog log(2);
    RunReceiver();
    EXPECT_EQ(ServerMsgQueueId, -1);
    EXPECT_EQ(MessagesOf(log, "GetRequests"),
              (Messages{
                  "GetRequests() [N] : +++++",
                  "GetRequests() [N] : ***** Create server messsage queue by file "
                  "(/var/run/veskcachepinfile-msg-server.key) failed",
                  "GetRequests() [N] : -----",
              }));
}

TEST_F(ReceiverTest, ItCreatesQueueAndKeyFileWhenItComesFirst) {
    EmptyPrivateWorld();
    // Its first look at a message is failed for it, or it would wait for ever.
    pthread_t thread{};
    const CapturedLog log;
    ASSERT_EQ(pthread_create(&thread, nullptr, Receive, const_cast<char *>(config_.c_str())), 0);
    while (ReadWhole(kMessageKeyFile).empty()) {
        sched_yield();
    }
    EXPECT_TRUE(PutMessage(MsgQueueGet(kMessageKeyFile), 1, ""));
    pthread_join(thread, nullptr);
    EXPECT_EQ(CountQueues(), 1);
}

using ReceiverDeathTest = ReceiverTest;

TEST_F(ReceiverDeathTest, AKeyFileWithoutANumberEndsTheProcess) {
    WriteWhole(kMessageKeyFile, "abc");
    EXPECT_EXIT(RunReceiver(), ::testing::KilledBySignal(SIGABRT), "invalid_argument");
}
} // namespace vesk
