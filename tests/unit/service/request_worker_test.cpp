#include "service/request_worker.h"

#include "tests/unit/service/handler_fixture.h"

#include "request/tool_parameters.h"

#include <json/reader.h>
#include <new>
#include <pthread.h>
#include <sstream>
#include <thread>

namespace vesk {
namespace {
std::string Compact(const std::string &text) {
    Json::Value root;
    std::string errors;
    std::istringstream stream(text);
    EXPECT_TRUE(Json::parseFromStream(Json::CharReaderBuilder(), stream, &root, &errors)) << errors;
    return root.toStyledString();
}
} // namespace

class RequestWorkerTest : public HandlerTest {
protected:
    // Queues requests of the test's volume: pairs of type name and data ("null" for none).
    void Queue(const std::vector<std::pair<std::string, std::string>> &requests) const {
        std::string queue;
        std::string members;
        int number = 0;
        for (const auto &[type, data] : requests) {
            const std::string comma = number == 0 ? "" : ", ";
            const std::string name = "\"" + std::to_string(number++) + "\"";
            queue += comma + name;
            members += comma + name + R"( : {"type" : ")" + type + R"(", "mountPath" : ")" +
                       volume_ + R"(", "data" : )" + (data == "null" ? data : "\"" + data + "\"") +
                       "}";
        }
        WriteWhole(config_, R"({"nextRequestNum" : )" + std::to_string(number) +
                                R"(, "requestQueue" : [)" + queue + R"(], "requests" : {)" +
                                members + "}}");
    }
    WorkResult HandleAndModify(int type, const std::string &data, const std::string &num) {
        RequestRecord record = Record(type, data);
        return HandleRequestAndModifyConfig(config_.c_str(), &record, num);
    }
    // The worker on a thread of its own, until it ends.
    void RunWorker() {
        ToolParameters parameters;
        parameters.configPath = config_.c_str();
        pthread_t thread{};
        ASSERT_EQ(pthread_create(&thread, nullptr, DoRequests, &parameters), 0);
        void *result = &thread;
        ASSERT_EQ(pthread_join(thread, &result), 0);
        EXPECT_EQ(result, nullptr);
    }
    // In the n-th pause the configuration is damaged, which ends the worker.
    void EndInPause(int pause) {
        FakeLibc::onSleep = [this, pause] {
            if (FakeLibc::sleeps >= pause) {
                WriteWhole(config_, "");
            }
        };
    }
    const std::string config_ = folder_.Path("conf.json");
    const Messages end_ = {"Prase file " + config_ + " error",
                           "Get request from config file (" + config_ + ") error",
                           "Get request error"};
};

TEST_F(RequestWorkerTest, ADoneRequestIsRecordedAndRemoved) {
    Queue({{"pinFiles", "a#1"}, {"reloadPinBlocks", "null"}});
    CapturedLog log;
    EXPECT_EQ(HandleAndModify(kRequestPinFiles, "a#1", "0"), WorkResult::Done);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(Compact(ReadWhole(config_)), Compact(R"({"nextRequestNum" : 2,
        "requestQueue" : ["1"], "requests" : {"1" : {"type" : "reloadPinBlocks", "mountPath" : ")" +
                                                   volume_ + R"(", "data" : null}},
        "volumes" : {")" + volume_ + R"(" : {"files" : {"1" : "a"}}}})"));
}

TEST_F(RequestWorkerTest, ADoneRequestThatCannotBeRecordedStaysAndIsDone) {
    Queue({{"pinFiles", "a#1"}});
    const std::string before = ReadWhole(config_);
    CapturedLog log(2);
    EXPECT_EQ(HandleAndModify(kRequestPinFiles, "a#1", "7"), WorkResult::Done);
    EXPECT_EQ(
        MessagesOf(log, "HandleRequestAndModifyConfig"),
        (Messages{
            "HandleRequestAndModifyConfig() [N]: Handle request (num = 7)",
            "HandleRequestAndModifyConfig() [N] : ***** Can't remove request (7) from config file",
        }));
    EXPECT_EQ(ReadWhole(config_), before);
}

TEST_F(RequestWorkerTest, AFailedRequestIsDropped) {
    Queue({{"pinFiles", "x#77"}});
    CapturedLog log;
    EXPECT_EQ(HandleAndModify(kRequestPinFiles, "x#77", "0"), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Get mapping result fail.",
                                  "Can't add file (" + volume_ + "/x) inode (77) to bitmap",
                                  "Handle request failed",
                                  "Handle request error (num = 0, type = pinFiles), drop it.",
                              }));
    EXPECT_EQ(Compact(ReadWhole(config_)),
              Compact(R"({"nextRequestNum" : 1, "requestQueue" : null, "requests" : {}})"));
}

TEST_F(RequestWorkerTest, AFailedRequestThatCannotBeDroppedStays) {
    Queue({{"pinFiles", "x#77"}});
    const std::string before = ReadWhole(config_);
    CapturedLog log(2);
    EXPECT_EQ(HandleAndModify(kRequestPinFiles, "x#77", "7"), WorkResult::Failed);
    EXPECT_EQ(MessagesOf(log, "HandleRequestAndModifyConfig"),
              (Messages{
                  "HandleRequestAndModifyConfig() [N]: Handle request (num = 7)",
                  "HandleRequestAndModifyConfig() [N] : ***** Handle request error (num = 7, type "
                  "= pinFiles), drop it.",
                  "HandleRequestAndModifyConfig() [N] : ***** Can't drop request",
              }));
    EXPECT_EQ(ReadWhole(config_), before);
}

TEST_F(RequestWorkerTest, ARequestWithoutATypeNameIsDroppedWithoutPrintingANull) {
    Queue({{"ack", "null"}});
    CapturedLog log;
    EXPECT_EQ(HandleAndModify(7, "", "0"), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Convert request type to string errror",
                                  "Convert request type to string errror",
                                  "Get unhandle request ((null))",
                                  "Handle request failed",
                                  "Bitmap is already NULL",
                                  "Handle request error (num = 0, type = (null)), drop it.",
                              }));
}

TEST_F(RequestWorkerTest, AnInterruptedRequestStaysUntouched) {
    Queue({{"pinFiles", "a#1"}});
    const std::string before = ReadWhole(config_);
    SetPending();
    CapturedLog log(2);
    EXPECT_EQ(HandleAndModify(kRequestPinFiles, "a#1", "0"), WorkResult::Interrupted);
    EXPECT_EQ(MessagesOf(log, "HandleRequestAndModifyConfig"),
              (Messages{
                  "HandleRequestAndModifyConfig() [N]: Handle request (num = 0)",
                  "HandleRequestAndModifyConfig() [N]: Handle request interruped (num = 0, type = "
                  "pinFiles)",
              }));
    EXPECT_EQ(ReadWhole(config_), before);
}

TEST_F(RequestWorkerTest, RequestsAreCarriedOutOneByOneWithASecondBetween) {
    Queue({{"pinFiles", "a#1;b#2"}, {"reloadPinBlocks", "null"}, {"unpinFiles", "a#1"}});
    EndInPause(3);
    CapturedLog log;
    RunWorker();
    Messages expected = {
        "Handle request (type=pinFiles files=a#1;b#2) OK ",
        "Handle request (type=reloadPinBlocks) OK ",
        "Handle request (type=unpinFiles files=a#1) OK ",
    };
    expected.insert(expected.end(), end_.begin(), end_.end());
    EXPECT_EQ(log.Messages(), expected);
    EXPECT_EQ(FakeLibc::sleeps, 3);
}

TEST_F(RequestWorkerTest, AFailedRequestIsFollowedByTheNextWithoutAPause) {
    Queue({{"pinFiles", "x#77"}, {"ack", "null"}, {"reloadPinBlocks", "null"}});
    EndInPause(1);
    CapturedLog log;
    RunWorker();
    EXPECT_EQ(FakeLibc::sleeps, 1);
    const Messages messages = log.Messages();
    EXPECT_EQ(log.Count("Handle request error (num = 0, type = pinFiles), drop it."), 1);
    EXPECT_EQ(log.Count("Handle request error (num = 1, type = ack), drop it."), 1);
    ASSERT_GE(messages.size(), 4U);
    EXPECT_EQ(*(messages.end() - 4), "Handle request (type=reloadPinBlocks) OK ");
}

TEST_F(RequestWorkerTest, AnInterruptedRequestRunsAgainWhenItsVolumeIsFree) {
    Queue({{"pinFiles", "b#2"}});
    bool first = true;
    device_->onRead = [this, &first] {
        if (first) {
            SetPending();
        }
        first = false;
    };
    std::vector<std::string> configs;
    FakeLibc::onSleep = [this, &configs] {
        configs.push_back(ReadWhole(config_));
        if (FakeLibc::sleeps == 3) { // interrupted, then passed over twice
            std::string path = volume_;
            ServiceRemovePendingSpaceAtomic(&path[0]);
        } else if (FakeLibc::sleeps == 4) {
            WriteWhole(config_, "");
        }
    };
    const std::string before = ReadWhole(config_);
    CapturedLog log;
    RunWorker();
    Messages expected = {
        "Handle request (0). Get interrupted !",
        "Handle request (type=pinFiles files=b#2) OK ",
    };
    expected.insert(expected.end(), end_.begin(), end_.end());
    EXPECT_EQ(log.Messages(), expected);
    ASSERT_EQ(configs.size(), 4U);
    EXPECT_EQ(configs[0], before);
    EXPECT_EQ(configs[2], before);
    EXPECT_EQ(device_->events, (Events{
                                   "bitmap 0802 file 0802",
                                   "read 196608+4096",
                                   "bitmap 0802 file 0802",
                                   "read 196608+4096",
                                   "read 589824+8192",
                               }));
}

// The test of the pending list that a drop makes looks at the record that is still to be filled.
TEST_F(RequestWorkerTest, EachChoiceBeginsWithAnEmptyRecord) {
    WriteWhole(config_, R"({"requestQueue" : ["0", "1"], "requests" : {
        "0" : {"type" : "reloadPinBlocks", "mountPath" : ")" +
                            volume_ + R"("},
        "1" : {"type" : "reloadPinBlocks", "mountPath" : "/of/no/cache"}}})");
    FakeLibc::onSleep = [this] {
        if (FakeLibc::sleeps == 1) { // request 0 is done
            SetPending();
        } else { // request 1 is dropped
            WriteWhole(config_, "");
        }
    };
    CapturedLog log;
    RunWorker();
    EXPECT_TRUE(ServiceIsPendingSpace(volume_.c_str()));
    Messages expected = {
        "Handle request (type=reloadPinBlocks) OK ",
        "Can't get space uuid from mount path (/of/no/cache)",
        "Drop requests finish",
    };
    expected.insert(expected.end(), end_.begin(), end_.end());
    EXPECT_EQ(log.Messages(), expected);
}

TEST_F(RequestWorkerTest, ALackOfMemoryPutsTheChoiceOffForASecond) {
    Queue({{"reloadPinBlocks", "null"}});
    EndInPause(2);
    bool first = true;
    FakeAppliance::onConfigLookup = [&first] {
        if (first) {
            first = false;
            throw std::bad_alloc();
        }
    };
    CapturedLog log;
    RunWorker();
    Messages expected = {
        "Request is put off: std::bad_alloc",
        "Handle request (type=reloadPinBlocks) OK ",
    };
    expected.insert(expected.end(), end_.begin(), end_.end());
    EXPECT_EQ(log.Messages(), expected);
    EXPECT_EQ(FakeLibc::sleeps, 2);
}

TEST_F(RequestWorkerTest, ALackOfMemoryGivesOthersTheirTurnAndEndsAfterTenTries) {
    const std::string other = folder_.Path("volume2");
    std::filesystem::create_directory(other);
    FakeAppliance::spaces.push_back({"/dev/space2", other, "uuid-2"});
    FakeAppliance::caches.push_back({"uuid-2", "/dev/ssd2", device_->Path()});
    const std::string reload = R"({"type" : "reloadPinBlocks", "mountPath" : ")";
    WriteWhole(config_, R"({"nextRequestNum" : 3, "requestQueue" : ["0", "1", "2"], "requests" : {
        "0" : )" + reload + volume_ +
                            R"("}, "1" : )" + reload + volume_ + R"("}, "2" : )" + reload + other +
                            R"("}}})");
    WriteWhole(bitmapFile_, std::string(2, '\0'));
    // As long as the first request is there, the volume's bitmap cannot be looked at.
    FakeLibc::onOpen = [this](const std::string &path, int, unsigned) {
        if (path == bitmapFile_ && ReadWhole(config_).find(R"("0")") != std::string::npos) {
            throw std::bad_alloc();
        }
    };
    // After each failure but the first and the last nothing else can be done.
    EndInPause(1 + 1 + 2 * 8 + 1);
    CapturedLog log;
    RunWorker();
    FakeLibc::onOpen = nullptr;
    const std::string putOff = "Request is put off: std::bad_alloc";
    const std::string done = "Handle request (type=reloadPinBlocks) OK ";
    Messages expected = {putOff, done};
    expected.insert(expected.end(), 8, putOff);
    expected.insert(expected.end(),
                    {"Handle request error (num = 0, type = reloadPinBlocks), drop it.", done});
    expected.insert(expected.end(), end_.begin(), end_.end());
    EXPECT_EQ(log.Messages(), expected);
}

TEST_F(RequestWorkerTest, AtLevel2TheThreadIsTracedAndItsMessagesAreItsOwn) {
    Queue({{"reloadPinBlocks", "null"}});
    EndInPause(1);
    CapturedLog log(2);
    RunWorker();
    EXPECT_EQ(MessagesOf(log, "DoRequests"),
              (Messages{
                  "DoRequests() [N] : +++++",
                  "DoRequests() [N] : Handle request (type=reloadPinBlocks) OK ",
                  "DoRequests() [N] : ***** Get request error",
                  "DoRequests() [N] : -----",
              }));
}

TEST_F(RequestWorkerTest, AnEmptyQueueIsWaitedOnWithoutPolling) {
    EndInPause(1);
    CapturedLog log(2);
    std::thread worker([this] { RunWorker(); });
    while (!log.Has("ConfigParseAndGetNextAvailableRequest() [N]: Go to block mode")) {
        std::this_thread::yield();
    }
    ServiceLock(); // to be had only while the worker waits
    EXPECT_EQ(FakeLibc::sleeps, 0);
    Queue({{"reloadPinBlocks", "null"}});
    ServiceUnlock();
    ServiceSignalRequest();
    worker.join();
    EXPECT_EQ(FakeLibc::sleeps, 1);
    EXPECT_TRUE(log.Has("DoRequests() [N] : Handle request (type=reloadPinBlocks) OK "));
}

TEST_F(RequestWorkerTest, ASelectionErrorEndsTheThread) {
    WriteWhole(config_, "[]");
    CapturedLog log;
    RunWorker();
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Get request from config file (" + config_ + ") error",
                                  "Get request error",
                              }));
    EXPECT_EQ(FakeLibc::sleeps, 0);
}
} // namespace vesk
