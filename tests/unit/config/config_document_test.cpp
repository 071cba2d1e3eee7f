#include "config/config_document.h"

#include "tests/support/config_fixture.h"

class ConfigDocumentTest : public ConfigTest {};

TEST_F(ConfigDocumentTest, DocumentedShapesAreAccepted) {
    const char *const texts[] = {
        exampleDocument,
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
    Store(exampleDocument);
    Json::Value root;
    CapturedLog log;
    EXPECT_EQ(ConfigReadDocument(path_.c_str(), &root), 0);
    EXPECT_EQ(root, ParseDocument(exampleDocument));
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(ConfigDocumentTest, ReadingReportsNothingItselfAboutAShape) {
    Store("[]");
    Json::Value root;
    CapturedLog log;
    EXPECT_EQ(ConfigReadDocument(path_.c_str(), &root), -1);
    EXPECT_EQ(log.Messages(), Messages{});
}
