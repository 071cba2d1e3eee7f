#include "config/request_queue.h"

#include "tests/support/config_fixture.h"

#include <sys/stat.h>

namespace vesk {
class RequestQueueTest : public ConfigTest {
protected:
    int Add(const RequestRecord &record) const { return ConfigAddRequest(path_.c_str(), &record); }
    int AddReload() const { return Add(MakeRecord(kRequestReloadPinBlocks, "/volume1")); }
};

TEST_F(RequestQueueTest, TheFirstRequestCreatesTheFileWithNumber0) {
    CapturedLog log;
    EXPECT_EQ(AddReload(), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    ExpectStored(R"({
   "nextRequestNum" : 1,
   "requestQueue" : [ "0" ],
   "requests" : {
      "0" : {
         "data" : null,
         "mountPath" : "/volume1",
         "type" : "reloadPinBlocks"
      }
   }
})");
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
    Store(kExampleDocument);
    const std::string a = CreateFile("share/a");
    const std::string b = CreateFile("b");
    EXPECT_EQ(Add(MakeRecord(kRequestPinFiles, volume_, volume_ + "/share/a;" + volume_ + "/b")),
              0);
    Json::Value expected = ParseDocument(kExampleDocument);
    expected["nextRequestNum"] = 4;
    expected["requestQueue"].append("3");
    expected["requests"]["3"]["type"] = "pinFiles";
    expected["requests"]["3"]["mountPath"] = volume_;
    expected["requests"]["3"]["data"] = "share/a#" + a + ";b#" + b;
    EXPECT_EQ(StoredDocument(), expected);
}

TEST_F(RequestQueueTest, AnUnpinRequestStoresItsFileInodeList) {
    const std::string a = CreateFile("a");
    EXPECT_EQ(Add(MakeRecord(kRequestUnpinFiles, volume_, volume_ + "/a")), 0);
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
    Store(
        R"({"nextRequestNum" : 1, "requestQueue" : ["1"], "requests" : {"1" : {"type" : "ack"}}})");
    CapturedLog log;
    EXPECT_EQ(AddReload(), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(StoredDocument()["requestQueue"], ParseDocument(R"(["1", "1"])"));
    EXPECT_EQ(StoredDocument()["requests"]["1"]["type"], Json::Value("reloadPinBlocks"));
}

TEST_F(RequestQueueTest, AFileThatDoesNotExistRefusesTheRequest) {
    Store(kExampleDocument);
    CapturedLog log;
    EXPECT_EQ(Add(MakeRecord(kRequestPinFiles, volume_, volume_ + "/missing")), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Stat file " + volume_ + "/missing error",
                                  "Cant' get inode number of file (" + volume_ + "/missing)",
                                  "Get relative paths failed",
                                  "Can't add request to json",
                              }));
    EXPECT_EQ(Stored(), kExampleDocument);
}

TEST_F(RequestQueueTest, ARefusedFirstRequestCreatesNoFile) {
    CapturedLog log;
    EXPECT_EQ(Add(MakeRecord(kRequestUnpinFiles, volume_, "/elsewhere/a")), -1);
    EXPECT_EQ(Stored(), kNoFile);
    EXPECT_TRUE(log.Has("Get relative paths failed"));
}

TEST_F(RequestQueueTest, ATypeWithoutANameCannotBeAdded) {
    for (const int type : {7, -1, 2147483647}) {
        Store(kExampleDocument);
        CapturedLog log;
        EXPECT_EQ(Add(MakeRecord(type, "/volume1")), -1);
        EXPECT_EQ(log.Messages(), (Messages{
                                      "Convert request type to string errror",
                                      "Can't add request to json",
                                  }));
        EXPECT_EQ(Stored(), kExampleDocument);
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

TEST_F(RequestQueueTest, AFileThatCannotBeLookedUpIsNotTakenForAMissingOne) {
    Store(kExampleDocument);
    FakeLibc::Fail("stat", EIO);
    EXPECT_EQ(AddReload(), 0);
    EXPECT_EQ(StoredDocument()["volumes"], ParseDocument(kExampleDocument)["volumes"]);
}

TEST_F(RequestQueueTest, AFileThatCannotBeWrittenRefusesTheRequest) {
    Store(kExampleDocument);
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
    EXPECT_EQ(Stored(), kExampleDocument);
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
    EXPECT_EQ(Add(MakeRecord(kRequestPinFiles, volume_, "/elsewhere/a")), -1);
    EXPECT_EQ(MessagesOf(log, "JsonAddRequest"),
              Messages{"JsonAddRequest() [N] : ***** Get relative paths failed"});
    EXPECT_EQ(MessagesOf(log, "ConfigAddRequest"),
              Messages{"ConfigAddRequest() [N] : ***** Can't add request to json"});
}
} // namespace vesk
