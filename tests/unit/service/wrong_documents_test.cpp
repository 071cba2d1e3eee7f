// Configuration files of every wrong shape against every operation: each fails with its own
// message, leaves the file as it was byte for byte, lets the lock go and throws nothing.
#include "config/pinned_files.h"
#include "config/request_queue.h"
#include "service/next_request.h"
#include "tests/support/config_fixture.h"

#include <functional>
#include <sys/stat.h>
#include <vector>

namespace vesk {
namespace {
struct Operation {
    const char *name;
    int failure;
    const char *message; // %: the path
    std::function<int(const char *)> run;
    bool onlyVolumes = false; // that is what it looks at
};

const std::vector<Operation> &Operations() {
    static const RequestRecord reload = MakeRecord(kRequestReloadPinBlocks, "/volume1");
    static const RequestRecord pin = MakeRecord(kRequestPinFiles, "/volume1", "a#1");
    static const std::vector<Operation> operations = {
        {"add", -1, "Can't read data from config file (%)",
         [](const char *path) { return ConfigAddRequest(path, &reload); }},
        {"drop", -1, "Can't read data from config file (%)",
         [](const char *path) { return ConfigDropErrorRequest(path, &reload, "1"); }},
        {"finish", -1, "Can't read data from config file (%)",
         [](const char *path) { return ConfigUpdatedByFinishedRequest(path, &pin, "1"); }},
        {"remove volume", -1, "Can't read data from config file (%)",
         [](const char *path) { return ConfigRemovePinFileVolume(path, "/volume1"); }, true},
        {"select", static_cast<int>(NextRequest::Error), "Get request from config file (%) error",
         [](const char *path) {
             RequestRecord record{};
             std::string num;
             return static_cast<int>(ConfigParseAndGetNextAvailableRequest(path, &record, &num));
         }},
    };
    return operations;
}

std::string Nested(const std::string &open, const std::string &close) {
    std::string text;
    for (int i = 0; i < 5000; ++i) {
        text += open;
    }
    text += "1";
    for (int i = 0; i < 5000; ++i) {
        text += close;
    }
    return text;
}
} // namespace

class WrongDocumentsTest : public ConfigTest {
protected:
    void SetUp() override {
        ConfigTest::SetUp();
        FakeApplianceOneVolume("/dev/cachedev_0");
    }
    void ExpectRefused(const Operation &operation) {
        const std::string before = Stored();
        const std::string text = operation.message;
        const size_t mark = text.find('%');
        CapturedLog log;
        int result = 0;
        EXPECT_NO_THROW(result = operation.run(path_.c_str())) << operation.name << " " << before;
        EXPECT_EQ(result, operation.failure) << operation.name << " " << before;
        ASSERT_FALSE(log.Messages().empty()) << operation.name << " " << before;
        EXPECT_EQ(LastOf(log.Messages()), text.substr(0, mark) + path_ + text.substr(mark + 1))
            << operation.name << " " << before;
        EXPECT_EQ(Stored(), before) << operation.name;
    }
    void ExpectRefusedByAll() {
        for (const Operation &operation : Operations()) {
            ExpectRefused(operation);
        }
    }
};

TEST_F(WrongDocumentsTest, WrongTypesAreRefused) {
    const char *const texts[] = {
        "[]",
        "\"text\"",
        "7",
        "true",
        R"({"volumes" : []})",
        R"({"volumes" : ["/volume1"]})",
        R"({"volumes" : {"/volume1" : "a"}})",
        R"({"volumes" : {"/volume1" : {"files" : []}}})",
        R"({"volumes" : {"/volume1" : {"files" : ["1"]}}})",
    };
    for (const char *text : texts) {
        Store(text);
        ExpectRefusedByAll();
    }
}

TEST_F(WrongDocumentsTest, WrongTypesBesideTheVolumesAreRefusedByWhatLooksAtThem) {
    const char *const texts[] = {
        R"({"requestQueue" : {"0" : "1"}})",
        R"({"requestQueue" : "1"})",
        R"({"requestQueue" : [["1"]]})",
        R"({"requestQueue" : ["1"], "requests" : []})",
        R"({"requestQueue" : ["1"], "requests" : {"1" : 5}})",
        R"({"requestQueue" : ["1"], "requests" : {"1" : {"type" : {"a" : 1}}}})",
        R"({"requestQueue" : ["1"], "requests" : {"1" : {"type" : "ack", "mountPath" : [1]}}})",
        R"({"requestQueue" : ["1"], "requests" : {"1" : {"type" : "ack", "data" : {"a" : 1}}}})",
        R"({"nextRequestNum" : "3"})",
        R"({"nextRequestNum" : 2147483648})",
        R"({"nextRequestNum" : 1e30})",
        R"({"nextRequestNum" : 99999999999999999999999999})",
        R"({"nextRequestNum" : [3]})",
    };
    for (const char *text : texts) {
        Store(text);
        for (const Operation &operation : Operations()) {
            if (operation.onlyVolumes) {
                CapturedLog log;
                EXPECT_EQ(operation.run(path_.c_str()), 0) << text;
                EXPECT_EQ(log.Messages(), Messages{});
            } else {
                ExpectRefused(operation);
            }
        }
    }
}

TEST_F(WrongDocumentsTest, WhatDoesNotParseIsRefused) {
    for (const std::string &text :
         {std::string(), std::string(" "), std::string("\0\0\0\0", 4), std::string("\xff\xfe{}"),
          std::string("{\"requestQueue\" : [ \"1\", ]}"), Nested("[", "]"), Nested("{\"a\":", "}"),
          "{\"volumes\":{\"/volume1\":" + Nested("{\"files\":", "}") + "}}"}) {
        Store(text);
        ExpectRefusedByAll();
    }
}

TEST_F(WrongDocumentsTest, EveryTruncationIsRefused) {
    const std::string whole = kExampleDocument;
    for (size_t length = 0; length < whole.size() - 1; ++length) { // the last byte is a line feed
        Store(whole.substr(0, length));
        ExpectRefusedByAll();
    }
}

TEST_F(WrongDocumentsTest, ADirectoryIsRefused) {
    const std::string inside = path_ + "/inside";
    mkdir(path_.c_str(), 0755);
    WriteWhole(inside, "kept");
    ExpectRefusedByAll();
    EXPECT_EQ(ReadWhole(inside), "kept");
}

TEST_F(WrongDocumentsTest, AnUnreadableFileIsRefused) {
    Store(kExampleDocument);
    chmod(folder_.Path().c_str(), 0755);
    chmod(path_.c_str(), 0);
    for (const Operation &operation : Operations()) {
        CapturedLog log;
        {
            const OrdinaryUser user;
            EXPECT_EQ(operation.run(path_.c_str()), operation.failure) << operation.name;
        }
        EXPECT_EQ(FirstOf(log.Messages()), "Can't open file " + path_);
        chmod(path_.c_str(), 0600);
        EXPECT_EQ(Stored(), kExampleDocument);
        chmod(path_.c_str(), 0);
    }
}

// Bytes that are no UTF-8 are data to the parser: nothing may be thrown, whatever comes of them.
TEST_F(WrongDocumentsTest, InvalidUtf8ThrowsNothing) {
    const std::string text =
        "{\"requestQueue\":[\"\xff\xc0\"],\"requests\":{\"\xff\xc0\":{\"type\":"
        "\"\xfe\",\"mountPath\":\"/volume1\",\"data\":\"\x80\"}},"
        "\"volumes\":{\"/volume1\":{\"files\":{\"\xf5\":\"\xed\xa0\x80\"}}}}";
    for (const Operation &operation : Operations()) {
        Store(text);
        const CapturedLog log;
        EXPECT_NO_THROW(operation.run(path_.c_str())) << operation.name;
    }
}
} // namespace vesk
