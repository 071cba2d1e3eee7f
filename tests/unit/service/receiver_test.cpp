#include "service/receiver.h"

#include "service/queue_fixture.h"

#include "config/request_type.h"
#include "service/message_queue.h"
#include "service/service_state.h"

#include <cerrno>
#include <climits>
#include <csignal>
#include <filesystem>
#include <json/reader.h>
#include <pthread.h>
#include <sstream>
#include <sys/msg.h>
#include <sys/stat.h>

namespace {

const bool privateWorld = UsePrivateWorld();

Json::Value Parse(const std::string &text) {
    Json::Value root;
    std::string errors;
    std::istringstream stream(text);
    EXPECT_TRUE(Json::parseFromStream(Json::CharReaderBuilder(), stream, &root, &errors)) << errors;
    return root;
}

} // namespace

// The receiver on a thread of its own. What is put into the queue before it starts is handled in
// order; it ends at the first record that it refuses.
class ReceiverTest : public QueueTest {
protected:
    void SetUp() override {
        QueueTest::SetUp();
        if (IsSkipped()) {
            return;
        }
        ASSERT_EQ(ServiceStateInitialize(), 0);
        std::filesystem::create_directory(volume_);
        queueId_ = MsgQueueGet(messageKeyFile);
        ASSERT_NE(queueId_, -1);
    }
    static void *Receive(void *configPath) { GetRequests(static_cast<const char *>(configPath)); }

    void Put(const std::string &text, long type = 1) const {
        ASSERT_TRUE(PutMessage(queueId_, type, text));
    }
    void Put(int type, const std::string &mountPath, const std::string &data = "") const {
        Put(RecordBytes(type, mountPath, data));
    }
    // Puts a record that ends the receiver behind the others.
    void PutEnd() const { Put(requestReloadPinBlocks, ""); }

    void RunReceiver() {
        pthread_t thread{};
        ASSERT_EQ(pthread_create(&thread, nullptr, Receive, const_cast<char *>(config_.c_str())),
                  0);
        void *result = &thread;
        ASSERT_EQ(pthread_join(thread, &result), 0);
        EXPECT_EQ(result, nullptr);
    }
    std::string CreateFile(const std::string &name) const {
        WriteWhole(volume_ + "/" + name, "x");
        struct stat status {};
        EXPECT_EQ(stat((volume_ + "/" + name).c_str(), &status), 0);
        return std::to_string(static_cast<uint32_t>(status.st_ino));
    }
    const std::string config_ = folder_.Path("conf.json");
    const std::string volume_ = folder_.Path("volume1");
    int queueId_ = -1;
};

TEST_F(ReceiverTest, RequestsAreStoredInTheOrderOfTheQueue) {
    const std::string a = CreateFile("a");
    const std::string b = CreateFile("b");
    Put(requestPinFiles, volume_, volume_ + "/a;" + volume_ + "/b");
    Put(requestUnpinFiles, volume_, volume_ + "/a");
    Put(requestReloadPinBlocks, "/volume2");
    Put(requestUnknown, "/volume3");
    Put(requestAck, "/volume4");
    PutEnd();
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(log.Messages(), (Messages{"Space UUID is not set", "Get wrong message format"}));
    Json::Value expected = Parse(R"({"nextRequestNum" : 5,
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
    EXPECT_EQ(Parse(ReadWhole(config_)), expected);
}

TEST_F(ReceiverTest, AtLevel2EachMessageIsLogged) {
    Put(requestReloadPinBlocks, "/volume1");
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
    Put(requestPinFiles, "", "/volume1/a");
    Put(requestReloadPinBlocks, "/volume1");
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(log.Messages(), (Messages{"Space UUID is not set", "Get wrong message format"}));
    EXPECT_EQ(CountMessages(queueId_), 1);
    EXPECT_FALSE(std::filesystem::exists(config_));
}

TEST_F(ReceiverTest, APinWithoutFilesStopsIt) {
    Put(requestPinFiles, "/volume1");
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(log.Messages(), (Messages{"Should provide file paths", "Get wrong message format"}));
}

TEST_F(ReceiverTest, ATypeWithoutANameStopsIt) {
    for (const int type : {7, -1, INT_MAX}) {
        Put(type, "/volume1", "/volume1/a");
        CapturedLog log;
        RunReceiver();
        EXPECT_EQ(log.Messages(), (Messages{
                                      "Convert request type to string errror",
                                      "Can't add request to json",
                                      "Can't add request to config (" + config_ + ")",
                                  }));
        EXPECT_FALSE(std::filesystem::exists(config_));
    }
    Put(7, "/volume1");
    CapturedLog log(2);
    RunReceiver();
    EXPECT_TRUE(log.Has("GetRequests() [N]: Get a new message. Request type = (null)"));
}

TEST_F(ReceiverTest, AFileThatDoesNotExistStopsIt) {
    Put(requestPinFiles, volume_, volume_ + "/missing");
    CapturedLog log(2);
    RunReceiver();
    EXPECT_EQ(MessagesOf(log, "GetRequests").rbegin()[1],
              "GetRequests() [N] : ***** Can't add request to config (" + config_ + ")");
}

TEST_F(ReceiverTest, ADamagedConfigurationStopsItAndStaysAsItIs) {
    WriteWhole(config_, "[]");
    Put(requestReloadPinBlocks, "/volume1");
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't read data from config file (" + config_ + ")",
                                  "Can't add request to config (" + config_ + ")",
                              }));
    EXPECT_EQ(ReadWhole(config_), "[]");
}

TEST_F(ReceiverTest, PathsAreDataAndNeverFormats) {
    Put(requestReloadPinBlocks, "/%s%n%d");
    const std::string inode = CreateFile("100%s");
    Put(requestPinFiles, volume_, volume_ + "/100%s");
    Put(requestAddPendingSpace, "/%n%n");
    PutEnd();
    CapturedLog log(2);
    RunReceiver();
    const Json::Value document = Parse(ReadWhole(config_));
    EXPECT_EQ(document["requests"]["0"]["mountPath"], Json::Value("/%s%n%d"));
    EXPECT_EQ(document["requests"]["1"]["data"], Json::Value("100%s#" + inode));
    EXPECT_TRUE(ServiceIsPendingSpace("/%n%n"));
}

TEST_F(ReceiverTest, TextsWithoutTheirNulEndAtTheirLastByte) {
    Put(requestReloadPinBlocks, std::string(512, 'm'), std::string(1024, 'd'));
    Put(requestPinFiles, volume_, std::string(1024, 'd'));
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(Parse(ReadWhole(config_))["requests"]["0"]["mountPath"],
              Json::Value(std::string(511, 'm')));
    EXPECT_EQ(log.Messages().front(), "Failed to Get relative path (Volume path=" + volume_ +
                                          " File path=" + std::string(1023, 'd'));
}

TEST_F(ReceiverTest, AShortMessageInheritsNothingFromTheOneBefore) {
    const std::string inode = CreateFile("a");
    Put(requestPinFiles, volume_, volume_ + "/a");
    Put(RecordBytes(requestReloadPinBlocks, "/volume2").substr(0, 4 + 8)); // no NUL
    Put(RecordBytes(requestPinFiles, volume_).substr(0, 4 + volume_.size()));
    CapturedLog log;
    RunReceiver();
    const Json::Value document = Parse(ReadWhole(config_));
    EXPECT_EQ(document["requests"]["0"]["data"], Json::Value("a#" + inode));
    EXPECT_EQ(document["requests"]["1"]["mountPath"], Json::Value("/volume2"));
    EXPECT_EQ(log.Messages(), (Messages{"Should provide file paths", "Get wrong message format"}));
}

TEST_F(ReceiverTest, AnEmptyMessageStopsIt) {
    Put(std::string());
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(log.Messages(), (Messages{"Space UUID is not set", "Get wrong message format"}));
}

TEST_F(ReceiverTest, AMessageThatIsTooLongStopsIt) {
    Put(std::string(1541, 'x'));
    CapturedLog log(2);
    RunReceiver();
    EXPECT_TRUE(
        log.Has("GetRequests() [N] : ***** Receive messaged failed: Argument list too long"));
    EXPECT_EQ(CountMessages(queueId_), 1);
}

TEST_F(ReceiverTest, MessagesOfOtherTypesStayInTheQueue) {
    Put(RecordBytes(requestReloadPinBlocks, "/other"), 2);
    Put(RecordBytes(requestReloadPinBlocks, "/other"), 99);
    Put(requestReloadPinBlocks, "/volume1");
    PutEnd();
    const CapturedLog log;
    RunReceiver();
    EXPECT_EQ(CountMessages(queueId_), 2);
    EXPECT_EQ(TakeMessage(queueId_).type, 2);
    EXPECT_EQ(TakeMessage(queueId_).type, 99);
    EXPECT_EQ(Parse(ReadWhole(config_))["requestQueue"].size(), 1U);
}

TEST_F(ReceiverTest, PendingSpaceMessagesChangeTheListAndNothingElse) {
    Put(requestAddPendingSpace, "/volume1");
    Put(requestAddPendingSpace, "/volume1");
    Put(requestAddPendingSpace, "/volume2");
    Put(requestAddPendingSpace, "");
    Put(requestRemovePendigSpace, "/volume2");
    Put(requestRemovePendigSpace, "/volume2");
    PutEnd();
    CapturedLog log(2);
    RunReceiver();
    EXPECT_EQ(
        MessagesOf(log, "GetRequests"),
        (Messages{
            "GetRequests() [N] : +++++",
            "GetRequests() [N]: Get server messsage queue id = " + std::to_string(queueId_),
            "GetRequests() [N]: Get a new message. Request type = addPendingSpace",
            "GetRequests() [N]: Get a new message. Request type = addPendingSpace",
            "GetRequests() [N]: Space (/volume1) is already in pending list",
            "GetRequests() [N]: Get a new message. Request type = addPendingSpace",
            "GetRequests() [N]: Get a new message. Request type = addPendingSpace",
            "GetRequests() [N]: Get a new message. Request type = removePendigSpace",
            "GetRequests() [N]: Get a new message. Request type = removePendigSpace",
            "GetRequests() [N] : Space (/volume2) is not in pending list. Could be a new space",
            "GetRequests() [N]: Get a new message. Request type = reloadPinBlocks",
            "GetRequests() [N] : ***** Get wrong message format",
            "GetRequests() [N] : -----",
        }));
    EXPECT_TRUE(ServiceIsPendingSpace("/volume1"));
    EXPECT_FALSE(ServiceIsPendingSpace("/volume2"));
    EXPECT_TRUE(ServiceIsPendingSpace("")); // these are not checked as requests are
    EXPECT_FALSE(std::filesystem::exists(config_));
}

TEST_F(ReceiverTest, RemovingWhatIsNotPendingIsANotice) {
    Put(requestRemovePendigSpace, "/volume1");
    PutEnd();
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Space (/volume1) is not in pending list. Could be a new space",
                                  "Space UUID is not set",
                                  "Get wrong message format",
                              }));
}

TEST_F(ReceiverTest, AQueueThatIsTakenAwayStopsIt) {
    // The queue goes while the receiver is at a message, before it asks for the next.
    FakeLibc::onRead = [this](int, long long, size_t) { msgctl(queueId_, IPC_RMID, nullptr); };
    WriteWhole(config_, "{}");
    Put(requestReloadPinBlocks, "/volume1");
    CapturedLog log;
    RunReceiver();
    FakeLibc::onRead = nullptr;
    EXPECT_EQ(log.Messages(), Messages{"Receive messaged failed: Invalid argument"});
    EXPECT_EQ(Parse(ReadWhole(config_))["requestQueue"].size(), 1U);
}

TEST_F(ReceiverTest, WithoutAQueueItEndsAtOnce) {
    WriteWhole(messageKeyFile, "");
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
    while (ReadWhole(messageKeyFile).empty()) {
        sched_yield();
    }
    EXPECT_TRUE(PutMessage(MsgQueueGet(messageKeyFile), 1, ""));
    pthread_join(thread, nullptr);
    EXPECT_EQ(CountQueues(), 1);
}

using ReceiverDeathTest = ReceiverTest;

TEST_F(ReceiverDeathTest, AKeyFileWithoutANumberEndsTheProcess) {
    WriteWhole(messageKeyFile, "abc");
    EXPECT_EXIT(RunReceiver(), ::testing::KilledBySignal(SIGABRT), "invalid_argument");
}
