#include "config/config_document.h"

#include "tests/support/config_fixture.h"

#include <cerrno>

namespace vesk {
class ConfigDocumentTest : public ConfigTest {};

TEST_F(ConfigDocumentTest, DocumentedShapesAreAccepted) {
    const char *const texts[] = {
        kExampleDocument,
        "null",
        "{}",
        R"({"nextRequestNum" : null, "requestQueue" : null, "requests" : null, "volumes" : null})",
        R"({"nextRequestNum" : 2147483647, "requestQueue" : [], "requests" : {}, "volumes" : {}})",
        R"({"nextRequestNum" : -5})",
        R"({"requests" : {"1" : null}, "volumes" : {"/volume1" : null}})",
        R"({"requests" : {"1" : {}}, "volumes" : {"/volume1" : {"files" : null}}})",
        R"({"requestQueue" : [1, null, true], "requests" : {"1" : {"type" : 1, "data" : 2.5}}})",
        R"({"other" : ["what", {"is" : "not"}, "ours"]})",
        R"({"volumes" : {"/volume1" : {"files" : {"7" : ["not", "looked", "at"]}, "x" : []}}})",
    };
    for (const char *text : texts) {
        EXPECT_TRUE(ConfigHasShape(ParseDocument(text))) << text;
    }
}

TEST_F(ConfigDocumentTest, OtherShapesAreRefused) {
    const char *const texts[] = {
        "[]",
        "[{}]",
        "\"text\"",
        "5",
        "true",
        R"({"nextRequestNum" : "3"})",
        R"({"nextRequestNum" : 2147483648})",
        R"({"nextRequestNum" : -2147483649})",
        R"({"nextRequestNum" : 1e30})",
        R"({"nextRequestNum" : []})",
        R"({"nextRequestNum" : {}})",
        R"({"requestQueue" : {}})",
        R"({"requestQueue" : "1"})",
        R"({"requestQueue" : 1})",
        R"({"requestQueue" : [["1"]]})",
        R"({"requestQueue" : ["1", {}]})",
        R"({"requests" : []})",
        R"({"requests" : "1"})",
        R"({"requests" : {"1" : 5}})",
        R"({"requests" : {"1" : "pinFiles"}})",
        R"({"requests" : {"1" : []}})",
        R"({"requests" : {"1" : {"type" : {}}}})",
        R"({"requests" : {"1" : {"mountPath" : []}}})",
        R"({"requests" : {"1" : {"data" : {"a" : "b"}}}})",
        R"({"volumes" : []})",
        R"({"volumes" : "/volume1"})",
        R"({"volumes" : {"/volume1" : "files"}})",
        R"({"volumes" : {"/volume1" : 1}})",
        R"({"volumes" : {"/volume1" : []}})",
        R"({"volumes" : {"/volume1" : {"files" : []}}})",
        R"({"volumes" : {"/volume1" : {"files" : "a"}}})",
    };
    for (const char *text : texts) {
        EXPECT_FALSE(ConfigHasShape(ParseDocument(text))) << text;
        Store(text);
        Json::Value root;
        EXPECT_EQ(ConfigReadDocument(path_.c_str(), &root), -1) << text;
    }
}

TEST_F(ConfigDocumentTest, ReadingGivesTheWholeTree) {
    Store(kExampleDocument);
    Json::Value root;
    CapturedLog log;
    EXPECT_EQ(ConfigReadDocument(path_.c_str(), &root), 0);
    EXPECT_EQ(root, ParseDocument(kExampleDocument));
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(ConfigDocumentTest, ReadingReportsNothingItselfAboutAShape) {
    Store("[]");
    Json::Value root;
    CapturedLog log;
    EXPECT_EQ(ConfigReadDocument(path_.c_str(), &root), -1);
    EXPECT_EQ(log.Messages(), Messages{});
}

namespace {
const LogPlace kCaller{"Caller", 1};

const char *AddMember(Json::Value &root) {
    root["new"] = 1;
    return nullptr;
}

const char *NotReached(Json::Value & /*root*/) {
    ADD_FAILURE() << "there was nothing to change";
    return nullptr;
}
} // namespace

TEST_F(ConfigDocumentTest, AnUpdateReadsChangesAndWrites) {
    CapturedLog log;
    for (const MissingConfig missing :
         {MissingConfig::Created, MissingConfig::IsAnError, MissingConfig::Skipped}) {
        Store(R"({"old" : 2})");
        EXPECT_EQ(ConfigUpdate(path_.c_str(), missing, AddMember, kCaller), 0);
        ExpectStored(R"({"old" : 2, "new" : 1})");
    }
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(ConfigDocumentTest, AnUpdateOfAMissingFileHasThreeOutcomes) {
    CapturedLog log(2);
    EXPECT_EQ(ConfigUpdate(path_.c_str(), MissingConfig::Skipped, NotReached, kCaller), 0);
    EXPECT_EQ(ConfigUpdate(path_.c_str(), MissingConfig::IsAnError, NotReached, kCaller), -1);
    EXPECT_EQ(log.Messages(),
              (Messages{"Caller() [N]: No config file (" + path_ + "), skip it",
                        "Caller() [N] : ***** Can't find config file (" + path_ + ")"}));
    EXPECT_EQ(Stored(), kNoFile);
    EXPECT_EQ(ConfigUpdate(path_.c_str(), MissingConfig::Created, AddMember, kCaller), 0);
    ExpectStored(R"({"new" : 1})");
}

TEST_F(ConfigDocumentTest, OnlyAnUpdateThatCreatesTakesAFailedLookUpForAFile) {
    Store(R"({"old" : 2})");
    const Messages expected[] = {{}, {"Can't find config file (" + path_ + ")"}, {}};
    const MissingConfig missing[] = {MissingConfig::Created, MissingConfig::IsAnError,
                                     MissingConfig::Skipped};
    for (int i = 0; i < 3; ++i) {
        FakeLibc::Fail("stat", EIO);
        CapturedLog log;
        EXPECT_EQ(ConfigUpdate(path_.c_str(), missing[i], i == 0 ? AddMember : NotReached, kCaller),
                  i == 1 ? -1 : 0);
        EXPECT_EQ(log.Messages(), expected[i]);
    }
    ExpectStored(R"({"old" : 2, "new" : 1})");
}

TEST_F(ConfigDocumentTest, AnUpdateThatFailsOrChangesNothingWritesNothing) {
    Store("{}");
    CapturedLog log(2);
    const auto fail = [](Json::Value &root) {
        root["half"] = 1;
        return "Can't be changed";
    };
    const auto leave = [](Json::Value &root) {
        root["half"] = 1;
        return "";
    };
    EXPECT_EQ(ConfigUpdate(path_.c_str(), MissingConfig::Created, fail, kCaller), -1);
    EXPECT_EQ(ConfigUpdate(path_.c_str(), MissingConfig::Created, leave, kCaller), 0);
    EXPECT_EQ(Stored(), "{}");
    EXPECT_EQ(MessagesOf(log, "Caller"), Messages{"Caller() [N] : ***** Can't be changed"});
}

TEST_F(ConfigDocumentTest, AnUpdateOfADamagedFileKeepsIt) {
    Store("[]");
    CapturedLog log(2);
    EXPECT_EQ(ConfigUpdate(path_.c_str(), MissingConfig::Created, NotReached, kCaller), -1);
    EXPECT_EQ(MessagesOf(log, "Caller"),
              Messages{"Caller() [N] : ***** Can't read data from config file (" + path_ + ")"});
    EXPECT_EQ(Stored(), "[]");
}

TEST_F(ConfigDocumentTest, AFailedWriteNamesTheFileUnlessItMayHaveBeenCreated) {
    const std::string path = folder_.Path("no/such/conf.json");
    CapturedLog log(2);
    EXPECT_EQ(ConfigWrite({}, path.c_str(), MissingConfig::Created, kCaller), -1);
    EXPECT_EQ(ConfigWrite({}, path.c_str(), MissingConfig::IsAnError, kCaller), -1);
    EXPECT_EQ(ConfigWrite({}, path.c_str(), MissingConfig::Skipped, kCaller), -1);
    const std::string named =
        "Caller() [N] : ***** Write json data to config (" + path + ") failed";
    EXPECT_EQ(MessagesOf(log, "Caller"),
              (Messages{"Caller() [N] : ***** Can't write to files", named, named}));
}
} // namespace vesk
