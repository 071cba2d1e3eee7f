#include "config/json_file.h"

#include "tests/support/config_fixture.h"

#include <filesystem>
#include <sys/stat.h>

namespace vesk {
class JsonFileTest : public ConfigTest {};

TEST_F(JsonFileTest, TheExampleDocumentRoundTrips) {
    Store(kExampleDocument);
    Json::Value root;
    ASSERT_EQ(ReadFileToJson(path_, &root), 0);
    ASSERT_EQ(WriteJsonToFile(root, path_.c_str()), 0);
    const std::string written = Stored();
    EXPECT_EQ(written, root.toStyledString());
    Json::Value again;
    ASSERT_EQ(ReadFileToJson(path_, &again), 0);
    EXPECT_EQ(again, ParseDocument(kExampleDocument));
    ASSERT_EQ(WriteJsonToFile(again, path_.c_str()), 0);
    EXPECT_EQ(Stored(), written);
}

TEST_F(JsonFileTest, ALongerFileIsReplacedWhole) {
    Store(std::string(100000, 'x'));
    ASSERT_EQ(WriteJsonToFile(Json::Value(1), path_.c_str()), 0);
    EXPECT_EQ(Stored(), "1\n");
}

TEST_F(JsonFileTest, ReadingAMissingFileFails) {
    CapturedLog log;
    Json::Value root;
    EXPECT_EQ(ReadFileToJson(path_, &root), -1);
    EXPECT_EQ(log.Messages(), Messages{"Can't open file " + path_});
    EXPECT_EQ(Stored(), kNoFile);
}

TEST_F(JsonFileTest, ReadingAnUnreadableFileFails) {
    Store("{}");
    chmod(path_.c_str(), 0);
    chmod(folder_.Path().c_str(), 0755);
    CapturedLog log;
    Json::Value root;
    {
        const OrdinaryUser user;
        EXPECT_EQ(ReadFileToJson(path_, &root), -1);
    }
    EXPECT_EQ(log.Messages(), Messages{"Can't open file " + path_});
}

TEST_F(JsonFileTest, ReadingAnEmptyFileFails) {
    Store("");
    CapturedLog log;
    Json::Value root;
    EXPECT_EQ(ReadFileToJson(path_, &root), -1);
    EXPECT_EQ(log.Messages(), Messages{"Prase file " + path_ + " error"});
}

TEST_F(JsonFileTest, ReadingADirectoryFails) {
    CapturedLog log;
    Json::Value root;
    EXPECT_EQ(ReadFileToJson(volume_, &root), -1);
    EXPECT_EQ(log.Messages(), Messages{"Prase file " + volume_ + " error"});
}

TEST_F(JsonFileTest, ADocumentNested5000DeepFails) {
    Json::Value root;
    for (const auto &[open, close] : {std::pair("[", "]"), std::pair("{\"a\":", "}")}) {
        std::string text;
        for (int i = 0; i < 5000; ++i) {
            text += open;
        }
        text += "1";
        for (int i = 0; i < 5000; ++i) {
            text += close;
        }
        Store(text);
        CapturedLog log;
        EXPECT_EQ(ReadFileToJson(path_, &root), -1);
        EXPECT_EQ(log.Messages(), Messages{"Prase file " + path_ + " error"});
    }
}

TEST_F(JsonFileTest, WhatIsNotJsonFails) {
    const char *const texts[] = {"{\"a\":1,}", "[1,]",        "\xEF\xBB\xBF{}", "{'a':1}",
                                 "{\"a\" 1}",  "{\"a\":nan}", "{\"a\":1e999}",  "{1:2}",
                                 "\xff\xfe",   " \n\t ",      "{\"a\":+3}",     "+3"};
    for (const char *text : texts) {
        Store(text);
        CapturedLog log;
        Json::Value root;
        EXPECT_EQ(ReadFileToJson(path_, &root), -1) << text;
        EXPECT_EQ(log.Messages(), Messages{"Prase file " + path_ + " error"}) << text;
        EXPECT_EQ(Stored(), text);
    }
}

TEST_F(JsonFileTest, EveryTruncationOfADocumentFails) {
    const std::string whole = kExampleDocument;
    for (size_t length = 0; length < whole.size() - 1; ++length) { // the last byte is a line feed
        Store(whole.substr(0, length));
        CapturedLog log;
        Json::Value root;
        ASSERT_EQ(ReadFileToJson(path_, &root), -1) << length;
        ASSERT_EQ(log.Messages(), Messages{"Prase file " + path_ + " error"}) << length;
    }
}

TEST_F(JsonFileTest, CommentsAndAnyLayoutAreRead) {
    Store("// kept by hand\n{\"requestQueue\":[/* one */ 1],\n\n\"nextRequestNum\"   :7}");
    Json::Value root;
    ASSERT_EQ(ReadFileToJson(path_, &root), 0);
    EXPECT_EQ(root["nextRequestNum"].asInt(), 7);
    EXPECT_TRUE(root["requestQueue"].isArray());
}

TEST_F(JsonFileTest, TextBehindTheDocumentIsLeftAlone) {
    for (const char *text : {"{\"a\":1} {", "{\"a\":1}    ", "{\"a\":1}\n]]", "{\"a\":1}xyz"}) {
        Store(text);
        CapturedLog log;
        Json::Value root;
        EXPECT_EQ(ReadFileToJson(path_, &root), 0) << text;
        EXPECT_EQ(root, ParseDocument("{\"a\" : 1}")) << text;
        EXPECT_EQ(log.Messages(), Messages{});
    }
}

TEST_F(JsonFileTest, CommentsStayInTheFile) {
    Store("// before\n{\"a\":1, // behind a\n/* before b */\"b\":2}");
    Json::Value root;
    ASSERT_EQ(ReadFileToJson(path_, &root), 0);
    root["c"] = 3;
    ASSERT_EQ(WriteJsonToFile(root, path_.c_str()), 0);
    EXPECT_EQ(Stored(), "\n// before\n{\n\t\"a\" : 1, // behind a\n\t/* before b */\n\t\"b\" : 2,"
                        "\n\t\"c\" : 3\n}\n");
}

TEST_F(JsonFileTest, WritingCreatesAMissingFile) {
    ASSERT_EQ(WriteJsonToFile(ParseDocument("{\"a\" : 1}"), path_.c_str()), 0);
    EXPECT_EQ(StoredDocument(), ParseDocument("{\"a\" : 1}"));
}

TEST_F(JsonFileTest, TheTextIsTheLibrarysStyledOne) {
    for (const char *text : {"{}", "null", "[]", "{\"a\":[1,2,[3,{\"b\":\"\\u00e9\"}]],\"c\":1.5}",
                             "// before\n{\"a\":1 // behind\n}\n", kExampleDocument}) {
        WriteWhole(path_, text);
        Json::Value root;
        ASSERT_EQ(ReadFileToJson(path_, &root), 0) << text;
        ASSERT_EQ(WriteJsonToFile(root, path_.c_str()), 0);
        EXPECT_EQ(ReadWhole(path_), root.toStyledString());
    }
}

TEST_F(JsonFileTest, EmptyVolumesStayInTheFile) {
    ASSERT_EQ(WriteJsonToFile(ParseDocument("{\"volumes\" : {}}"), path_.c_str()), 0);
    EXPECT_EQ(StoredDocument(), ParseDocument("{\"volumes\" : {}}"));
}

TEST_F(JsonFileTest, WritingBelowAMissingFolderFails) {
    const std::string path = folder_.Path("missing/conf.json");
    CapturedLog log;
    EXPECT_EQ(WriteJsonToFile(Json::Value(), path.c_str()), -1);
    EXPECT_EQ(log.Messages(), Messages{"Can't open config file (" + path + ")"});
}

TEST_F(JsonFileTest, WritingOverADirectoryFails) {
    CapturedLog log;
    EXPECT_EQ(WriteJsonToFile(Json::Value(), volume_.c_str()), -1);
    EXPECT_EQ(log.Messages(), Messages{"Can't open config file (" + volume_ + ")"});
}

TEST_F(JsonFileTest, AWriteThatFailsIsNotReportedAndLosesNothing) {
    Store(kExampleDocument);
    CapturedLog log;
    FakeLibc::FailFrom("write", 28 /* ENOSPC */);
    const int result = WriteJsonToFile(Json::Value("new"), path_.c_str());
    FakeLibc::Reset();
    EXPECT_EQ(result, 0);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(Stored(), kExampleDocument);
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(folder_.Path()),
                            std::filesystem::directory_iterator()),
              2); // the document and the volume's folder
}

TEST_F(JsonFileTest, AtLevel2BothAreTraced) {
    Store("{}");
    CapturedLog log(2);
    Json::Value root;
    ReadFileToJson(path_, &root);
    WriteJsonToFile(root, path_.c_str());
    ReadFileToJson(volume_, &root);
    ReadFileToJson("/missing", &root);
    WriteJsonToFile(root, "/missing/x");
    EXPECT_EQ(log.Messages(),
              (Messages{
                  "ReadFileToJson() [N] : +++++",
                  "ReadFileToJson() [N] : -----",
                  "WriteJsonToFile() [N] : +++++",
                  "WriteJsonToFile() [N] : -----",
                  "ReadFileToJson() [N] : +++++",
                  "ReadFileToJson() [N] : ***** Prase file " + volume_ + " error",
                  "ReadFileToJson() [N] : -----",
                  "ReadFileToJson() [N] : +++++",
                  "ReadFileToJson() [N] : ***** Can't open file /missing",
                  "ReadFileToJson() [N] : -----",
                  "WriteJsonToFile() [N] : +++++",
                  "WriteJsonToFile() [N] : ***** Can't open config file (/missing/x)",
                  "WriteJsonToFile() [N] : -----",
              }));
}
} // namespace vesk
