#include "config/request_queue.h"

#include "config/config_fixture.h"

#include <sys/stat.h>

class RequestQueueTest : public ConfigTest {
protected:
    int Add(const RequestRecord &record) const { return ConfigAddRequest(path_.c_str(), &record); }
    int AddReload() const { return Add(MakeRecord(requestReloadPinBlocks, "/volume1")); }
};

TEST_F(RequestQueueTest, TheFirstRequestCreatesTheFileWithNumber0) {
    CapturedLog log;
    EXPECT_EQ(AddReload(), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(Stored(), R"({
   "nextRequestNum" : 1,
   "requestQueue" : [ "0" ],
   "requests" : {
      "0" : {
         "data" : null,
         "mountPath" : "/volume1",
         "type" : "reloadPinBlocks"
      }
   }
}
)");
}

TEST_F(RequestQueueTest, AnEmptyObjectAndNullMembersCountAsAMissingFile) {
    for (const char *text :
         {"{}", "null", R"({"nextRequestNum" : null, "requestQueue" : null, "requests" : null})"}) {
        Store(text);
        EXPECT_EQ(AddReload(), 0);
        const Json::Value document = StoredDocument();
        EXPECT_EQ(document["nextRequestNum"], Json::Value(1)) << text;
        EXPECT_EQ(document["requestQueue"], ParseDocument(R"(["0"])")) << text;
        EXPECT_TRUE(document["requests"].isMember("0")) << text;
    }
}

TEST_F(RequestQueueTest, APinRequestStoresItsFileInodeList) {
    Store(exampleDocument);
    const std::string a = CreateFile("share/a");
    const std::string b = CreateFile("b");
    EXPECT_EQ(
        Add(MakeRecord(requestPinFiles, volume_, volume_ + "/share/a;" + volume_ + "/b")), 0);
    Json::Value expected = ParseDocument(exampleDocument);
    expected["nextRequestNum"] = 4;
    expected["requestQueue"].append("3");
    expected["requests"]["3"]["type"] = "pinFiles";
    expected["requests"]["3"]["mountPath"] = volume_;
    expected["requests"]["3"]["data"] = "share/a#" + a + ";b#" + b;
    EXPECT_EQ(StoredDocument(), expected);
}

TEST_F(RequestQueueTest, AnUnpinRequestStoresItsFileInodeList) {
    const std::string a = CreateFile("a");
    EXPECT_EQ(Add(MakeRecord(requestUnpinFiles, volume_, volume_ + "/a")), 0);
    EXPECT_EQ(StoredDocument()["requests"]["0"]["data"], Json::Value("a#" + a));
}

TEST_F(RequestQueueTest, OtherTypesAreStoredByNameWithNullData) {
    int number = 0;
    for (const char *name :
         {"unknown", "ack", "addPendingSpace", "removePendigSpace", "reloadPinBlocks"}) {
        EXPECT_EQ(Add(MakeRecord(StringToRequestType(name), "/volume1", "/volume1/a")), 0);
        const Json::Value request = StoredDocument()["requests"][std::to_string(number++)];
        EXPECT_EQ(request["type"], Json::Value(name));
        EXPECT_EQ(request["data"], Json::Value());
        EXPECT_TRUE(request.isMember("data"));
    }
}

TEST_F(RequestQueueTest, NumbersRunTo2147483645AndStartAgain) {
    const struct {
        int stored, number, next;
    } cases[] = {{0, 0, 1},
                 {7, 7, 8},
                 {2147483644, 2147483644, 2147483645},
                 {2147483645, 2147483645, 0},
                 {-5, -5, -4}};
    for (const auto &[stored, number, next] : cases) {
        Store("{\"nextRequestNum\" : " + std::to_string(stored) + "}");
        EXPECT_EQ(AddReload(), 0);
        EXPECT_EQ(StoredDocument()["nextRequestNum"], Json::Value(next));
        EXPECT_EQ(StoredDocument()["requestQueue"][0], Json::Value(std::to_string(number)));
    }
}

TEST_F(RequestQueueTest, ACounterThatIsANumberInAnotherGuiseIsTakenAsAnInteger) {
    Store("{\"nextRequestNum\" : 3.5}");
    EXPECT_EQ(AddReload(), 0);
    EXPECT_EQ(StoredDocument()["requestQueue"], ParseDocument(R"(["3"])"));
    Store("{\"nextRequestNum\" : true}");
    EXPECT_EQ(AddReload(), 0);
    EXPECT_EQ(StoredDocument()["requestQueue"], ParseDocument(R"(["1"])"));
}

TEST_F(RequestQueueTest, ANumberThatIsQueuedAlreadyIsAcceptedAgain) {
    Store(R"({"nextRequestNum" : 1, "requestQueue" : ["1"], "requests" : {"1" : {"type" : "ack"}}})");
    CapturedLog log;
    EXPECT_EQ(AddReload(), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(StoredDocument()["requestQueue"], ParseDocument(R"(["1", "1"])"));
    EXPECT_EQ(StoredDocument()["requests"]["1"]["type"], Json::Value("reloadPinBlocks"));
}

TEST_F(RequestQueueTest, AFileThatDoesNotExistRefusesTheRequest) {
    Store(exampleDocument);
    CapturedLog log;
    EXPECT_EQ(Add(MakeRecord(requestPinFiles, volume_, volume_ + "/missing")), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Stat file " + volume_ + "/missing error",
                                  "Cant' get inode number of file (" + volume_ + "/missing)",
                                  "Get relative paths failed",
                                  "Can't add request to json",
                              }));
    EXPECT_EQ(Stored(), exampleDocument);
}

TEST_F(RequestQueueTest, ARefusedFirstRequestCreatesNoFile) {
    CapturedLog log;
    EXPECT_EQ(Add(MakeRecord(requestUnpinFiles, volume_, "/elsewhere/a")), -1);
    EXPECT_EQ(Stored(), "");
    EXPECT_TRUE(log.Has("Get relative paths failed"));
}

TEST_F(RequestQueueTest, ATypeWithoutANameCannotBeAdded) {
    for (const int type : {7, -1, 2147483647}) {
        Store(exampleDocument);
        CapturedLog log;
        EXPECT_EQ(Add(MakeRecord(type, "/volume1")), -1);
        EXPECT_EQ(log.Messages(), (Messages{
                                      "Convert request type to string errror",
                                      "Can't add request to json",
                                  }));
        EXPECT_EQ(Stored(), exampleDocument);
    }
}

TEST_F(RequestQueueTest, AnUnreadableFileRefusesTheRequest) {
    Store("");
    CapturedLog log;
    EXPECT_EQ(AddReload(), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Prase file " + path_ + " error",
                                  "Can't read data from config file (" + path_ + ")",
                              }));
}

TEST_F(RequestQueueTest, AFileThatCannotBeWrittenRefusesTheRequest) {
    Store(exampleDocument);
    chmod(folder_.Path().c_str(), 0755);
    chmod(path_.c_str(), 0444);
    CapturedLog log;
    {
        const OrdinaryUser user;
        EXPECT_EQ(AddReload(), -1);
    }
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open config file (" + path_ + ")",
                                  "Can't write to files",
                              }));
    EXPECT_EQ(Stored(), exampleDocument);
}

TEST_F(RequestQueueTest, AtLevel2TheDocumentIsLogged) {
    CapturedLog log(2);
    ASSERT_EQ(AddReload(), 0);
    EXPECT_NE(log.Text().find("]: After request is added: jsConf:" + Stored() + "\n"),
              std::string::npos);
    EXPECT_EQ(MessagesOf(log, "JsonAddRequest"),
              Messages{"JsonAddRequest() [N]: After request is added: jsConf:{"});
}

TEST_F(RequestQueueTest, AtLevel2FailuresNameTheirFunctions) {
    CapturedLog log(2);
    EXPECT_EQ(Add(MakeRecord(requestPinFiles, volume_, "/elsewhere/a")), -1);
    EXPECT_EQ(MessagesOf(log, "JsonAddRequest"),
              Messages{"JsonAddRequest() [N] : ***** Get relative paths failed"});
    EXPECT_EQ(MessagesOf(log, "ConfigAddRequest"),
              Messages{"ConfigAddRequest() [N] : ***** Can't add request to json"});
}

TEST_F(RequestQueueTest, RemovingTakesQueueEntryAndRequest) {
    Json::Value root = ParseDocument(exampleDocument);
    CapturedLog log(2);
    EXPECT_EQ(JsonRemoveRequest(root, "1"), 0);
    EXPECT_EQ(log.Messages(), Messages{"JsonRemoveRequest() [N]: Remove request num = 1"});
    Json::Value expected = ParseDocument(exampleDocument);
    expected["requestQueue"] = ParseDocument(R"(["2"])");
    expected["requests"].removeMember("1");
    EXPECT_EQ(root, expected);
}

TEST_F(RequestQueueTest, RemovingWithoutAQueueFails) {
    for (const char *text : {"{}", R"({"requestQueue" : null, "requests" : {"1" : {}}})"}) {
        Json::Value root = ParseDocument(text);
        CapturedLog log;
        EXPECT_EQ(JsonRemoveRequest(root, "1"), -1);
        EXPECT_EQ(log.Messages(), Messages{"Can't read request queue"});
    }
}

TEST_F(RequestQueueTest, RemovingANumberThatIsNotOrTwiceInTheQueueFails) {
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

TEST_F(RequestQueueTest, RemovingANumberWithoutARequestFailsAfterTheQueueEntryWent) {
    Json::Value root = ParseDocument(R"({"requestQueue" : ["1", "2"], "requests" : {"2" : {}}})");
    CapturedLog log;
    EXPECT_EQ(JsonRemoveRequest(root, "1"), -1);
    EXPECT_EQ(log.Messages(), Messages{"Can't find request number (1) in config"});
    EXPECT_EQ(root["requestQueue"], ParseDocument(R"(["2"])"));
}

TEST_F(RequestQueueTest, RemovingANullRequestFails) {
    Json::Value root = ParseDocument(R"({"requestQueue" : ["1"], "requests" : {"1" : null}})");
    CapturedLog log(2);
    EXPECT_EQ(JsonRemoveRequest(root, "1"), -1);
    EXPECT_EQ(log.Messages(),
              (Messages{
                  "JsonRemoveRequest() [N]: Remove request num = 1",
                  "JsonRemoveRequest() [N] : ***** Remove request (1) from requests failed",
              }));
}

TEST_F(RequestQueueTest, CountingGivesTheDocumentAndTheQueuesLength) {
    Json::Value root;
    int count = -1;
    Store(exampleDocument);
    EXPECT_EQ(ConfigGetJsonAndNumRequest(path_.c_str(), &root, &count), 0);
    EXPECT_EQ(count, 2);
    EXPECT_EQ(root, ParseDocument(exampleDocument));
    Store("{}");
    EXPECT_EQ(ConfigGetJsonAndNumRequest(path_.c_str(), &root, &count), 0);
    EXPECT_EQ(count, 0);
    Store("[]");
    EXPECT_EQ(ConfigGetJsonAndNumRequest(path_.c_str(), &root, &count), -1);
}

TEST_F(RequestQueueTest, DroppingARequestRewritesTheFile) {
    Store(exampleDocument);
    CapturedLog log;
    EXPECT_EQ(ConfigDropErrorRequest(path_.c_str(), nullptr, "2"), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(Stored(), R"({
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
}
)");
}

TEST_F(RequestQueueTest, DroppingTheLastRequestLeavesANullQueueThatTakesTheNext) {
    Store(R"({"nextRequestNum" : 5, "requestQueue" : ["4"], "requests" : {"4" : {}}})");
    ASSERT_EQ(ConfigDropErrorRequest(path_.c_str(), nullptr, "4"), 0);
    EXPECT_EQ(StoredDocument(),
              ParseDocument(R"({"nextRequestNum" : 5, "requestQueue" : null, "requests" : {}})"));
    EXPECT_EQ(AddReload(), 0);
    EXPECT_EQ(StoredDocument()["requestQueue"], ParseDocument(R"(["5"])"));
}

TEST_F(RequestQueueTest, DroppingWithoutAFileFails) {
    CapturedLog log(2);
    EXPECT_EQ(ConfigDropErrorRequest(path_.c_str(), nullptr, "1"), -1);
    EXPECT_EQ(log.Messages(), Messages{"ConfigDropErrorRequest() [N] : ***** Can't find config file (" +
                                       path_ + ")"});
}

TEST_F(RequestQueueTest, DroppingFromADamagedFileFails) {
    Store("{");
    CapturedLog log;
    EXPECT_EQ(ConfigDropErrorRequest(path_.c_str(), nullptr, "1"), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Prase file " + path_ + " error",
                                  "Can't read data from config file (" + path_ + ")",
                              }));
    EXPECT_EQ(Stored(), "{");
}

TEST_F(RequestQueueTest, DroppingAnUnknownRequestFailsAndWritesNothing) {
    Store(exampleDocument);
    CapturedLog log;
    EXPECT_EQ(ConfigDropErrorRequest(path_.c_str(), nullptr, "7"), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Remove string error, count =0",
                                  "Can't remove request num (7) from request queue",
                                  "Can't remove request",
                              }));
    EXPECT_EQ(Stored(), exampleDocument);
}

TEST_F(RequestQueueTest, DroppingFromAFileThatCannotBeWrittenFails) {
    Store(exampleDocument);
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
    EXPECT_EQ(Stored(), exampleDocument);
}
