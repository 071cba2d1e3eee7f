#include "config/request_queue.h"

#include "tests/support/config_fixture.h"

#include <sys/stat.h>

namespace vesk {
class RequestRemovalTest : public ConfigTest {};

TEST_F(RequestRemovalTest, RemovingTakesQueueEntryAndRequest) {
    Json::Value root = ParseDocument(kExampleDocument);
    CapturedLog log(2);
    EXPECT_EQ(JsonRemoveRequest(root, "1"), 0);
    EXPECT_EQ(log.Messages(), Messages{"JsonRemoveRequest() [N]: Remove request num = 1"});
    Json::Value expected = ParseDocument(kExampleDocument);
    expected["requestQueue"] = ParseDocument(R"(["2"])");
    expected["requests"].removeMember("1");
    EXPECT_EQ(root, expected);
}

TEST_F(RequestRemovalTest, RemovingWithoutAQueueFails) {
    for (const char *text : {"{}", R"({"requestQueue" : null, "requests" : {"1" : {}}})"}) {
        Json::Value root = ParseDocument(text);
        CapturedLog log;
        EXPECT_EQ(JsonRemoveRequest(root, "1"), -1);
        EXPECT_EQ(log.Messages(), Messages{"Can't read request queue"});
    }
}

TEST_F(RequestRemovalTest, RemovingANumberThatIsNotOrTwiceInTheQueueFails) {
    Json::Value root = ParseDocument(R"({"requestQueue" : ["1", "1"], "requests" : {"1" : {}}})");
    CapturedLog log;
    EXPECT_EQ(JsonRemoveRequest(root, "1"), -1);
    EXPECT_EQ(JsonRemoveRequest(root, "7"), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Remove string error, count =2",
                                  "Can't remove request num (1) from request queue",
                                  "Remove string error, count =0",
                                  "Can't remove request num (7) from request queue",
                              }));
    EXPECT_EQ(root["requestQueue"], ParseDocument(R"(["1", "1"])"));
}

TEST_F(RequestRemovalTest, RemovingANumberWithoutARequestFailsAfterTheQueueEntryWent) {
    Json::Value root = ParseDocument(R"({"requestQueue" : ["1", "2"], "requests" : {"2" : {}}})");
    CapturedLog log;
    EXPECT_EQ(JsonRemoveRequest(root, "1"), -1);
    EXPECT_EQ(log.Messages(), Messages{"Can't find request number (1) in config"});
    EXPECT_EQ(root["requestQueue"], ParseDocument(R"(["2"])"));
}

TEST_F(RequestRemovalTest, RemovingANullRequestFails) {
    Json::Value root = ParseDocument(R"({"requestQueue" : ["1"], "requests" : {"1" : null}})");
    CapturedLog log(2);
    EXPECT_EQ(JsonRemoveRequest(root, "1"), -1);
    EXPECT_EQ(log.Messages(),
              (Messages{
                  "JsonRemoveRequest() [N]: Remove request num = 1",
                  "JsonRemoveRequest() [N] : ***** Remove request (1) from requests failed",
              }));
}

TEST_F(RequestRemovalTest, CountingGivesTheDocumentAndTheQueuesLength) {
    Json::Value root;
    int count = -1;
    Store(kExampleDocument);
    const ServiceLockGuard lock;
    EXPECT_EQ(ConfigGetJsonAndNumRequest(path_.c_str(), &root, &count), 0);
    EXPECT_EQ(count, 2);
    EXPECT_EQ(root, ParseDocument(kExampleDocument));
    Store("{}");
    EXPECT_EQ(ConfigGetJsonAndNumRequest(path_.c_str(), &root, &count), 0);
    EXPECT_EQ(count, 0);
    Store("[]");
    EXPECT_EQ(ConfigGetJsonAndNumRequest(path_.c_str(), &root, &count), -1);
}

TEST_F(RequestRemovalTest, DroppingARequestRewritesTheFile) {
    Store(kExampleDocument);
    CapturedLog log;
    EXPECT_EQ(ConfigDropErrorRequest(path_.c_str(), nullptr, "2"), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    ExpectStored(R"({
   "nextRequestNum" : 3,
   "requestQueue" : [ "1" ],
   "requests" : {
      "1" : {
         "data" : "share/b.bin#5678",
         "mountPath" : "/volume1",
         "type" : "pinFiles"
      }
   },
   "volumes" : {
      "/volume1" : {
         "files" : {
            "1234" : "share/a.txt"
         }
      }
   }
})");
}

TEST_F(RequestRemovalTest, DroppingTheLastRequestLeavesANullQueueThatTakesTheNext) {
    Store(R"({"nextRequestNum" : 5, "requestQueue" : ["4"], "requests" : {"4" : {}}})");
    ASSERT_EQ(ConfigDropErrorRequest(path_.c_str(), nullptr, "4"), 0);
    EXPECT_EQ(StoredDocument(),
              ParseDocument(R"({"nextRequestNum" : 5, "requestQueue" : null, "requests" : {}})"));
    const RequestRecord reload = MakeRecord(kRequestReloadPinBlocks, "/volume1");
    EXPECT_EQ(ConfigAddRequest(path_.c_str(), &reload), 0);
    EXPECT_EQ(StoredDocument()["requestQueue"], ParseDocument(R"(["5"])"));
}

TEST_F(RequestRemovalTest, DroppingWithoutAFileFails) {
    CapturedLog log(2);
    EXPECT_EQ(ConfigDropErrorRequest(path_.c_str(), nullptr, "1"), -1);
    EXPECT_EQ(
        log.Messages(),
        Messages{"ConfigDropErrorRequest() [N] : ***** Can't find config file (" + path_ + ")"});
    EXPECT_EQ(Stored(), kNoFile);
}

TEST_F(RequestRemovalTest, DroppingFromADamagedFileFails) {
    Store("{");
    CapturedLog log;
    EXPECT_EQ(ConfigDropErrorRequest(path_.c_str(), nullptr, "1"), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Prase file " + path_ + " error",
                                  "Can't read data from config file (" + path_ + ")",
                              }));
    EXPECT_EQ(Stored(), "{");
}

TEST_F(RequestRemovalTest, DroppingAnUnknownRequestFailsAndWritesNothing) {
    Store(kExampleDocument);
    CapturedLog log;
    EXPECT_EQ(ConfigDropErrorRequest(path_.c_str(), nullptr, "7"), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Remove string error, count =0",
                                  "Can't remove request num (7) from request queue",
                                  "Can't remove request",
                              }));
    EXPECT_EQ(Stored(), kExampleDocument);
}

TEST_F(RequestRemovalTest, DroppingFromAFileThatCannotBeWrittenFails) {
    Store(kExampleDocument);
    chmod(folder_.Path().c_str(), 0755);
    chmod(path_.c_str(), 0444);
    CapturedLog log;
    {
        const OrdinaryUser user;
        EXPECT_EQ(ConfigDropErrorRequest(path_.c_str(), nullptr, "1"), -1);
    }
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open config file (" + path_ + ")",
                                  "Write json data to config (" + path_ + ") failed",
                              }));
    EXPECT_EQ(Stored(), kExampleDocument);
}
} // namespace vesk
