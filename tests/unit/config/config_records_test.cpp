#include "config/config_records.h"

#include "tests/support/config_fixture.h"

#include <sys/stat.h>

namespace vesk {
namespace {
class ConfigRecordsTest : public ConfigTest {
protected:
    // The records of this document, read twice over, so that nothing of the first reading is left.
    ConfigRecords Read(const std::string &document) {
        Store(document);
        ConfigRecords records;
        EXPECT_EQ(ConfigReadRecords(path_.c_str(), &records), 0);
        const ConfigRecords first = records;
        EXPECT_EQ(ConfigReadRecords(path_.c_str(), &records), 0);
        EXPECT_EQ(records.problems, first.problems);
        EXPECT_EQ(records.volumes.size(), first.volumes.size());
        EXPECT_EQ(records.requests.size(), first.requests.size());
        return records;
    }
    static Messages Volumes(const ConfigRecords &records) {
        Messages texts;
        for (const RecordedVolume &volume : records.volumes) {
            std::string text = volume.mountPath + ":";
            for (const RecordedFile &file : volume.files) {
                text += " " + file.relativePath + "#" + std::to_string(file.inode);
            }
            texts.push_back(text);
        }
        return texts;
    }
    static Messages Requests(const ConfigRecords &records) {
        Messages texts;
        for (const StoredRequest &request : records.requests) {
            texts.push_back(request.number + " " + RequestTypeToString(request.type) + " " +
                            request.mountPath + " \"" + request.data + "\"");
        }
        return texts;
    }
    Messages Problems(const std::string &document) { return Read(document).problems; }
};
} // namespace

TEST_F(ConfigRecordsTest, ADocumentIsItsRecordsAndItsRequests) {
    CapturedLog log;
    const ConfigRecords records = Read(kExampleDocument);
    EXPECT_FALSE(records.isMissing);
    EXPECT_EQ(Volumes(records), Messages{"/volume1: share/a.txt#1234"});
    EXPECT_EQ(Requests(records), (Messages{"1 pinFiles /volume1 \"share/b.bin#5678\"",
                                           "2 reloadPinBlocks /volume1 \"\""}));
    EXPECT_EQ(records.problems, Messages{});
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(Stored(), kExampleDocument); // as it was
}

TEST_F(ConfigRecordsTest, AMissingFileIsAnEmptyDocumentAndStaysMissing) {
    ConfigRecords records;
    records.problems.emplace_back("old");
    EXPECT_EQ(ConfigReadRecords(path_.c_str(), &records), 0);
    EXPECT_TRUE(records.isMissing);
    EXPECT_EQ(records.problems, Messages{});
    EXPECT_EQ(Stored(), kNoFile);
    EXPECT_FALSE(Read("{}").isMissing);
}

TEST_F(ConfigRecordsTest, WhatCannotBeReadIsAFailureWithoutRecords) {
    CapturedLog log;
    ConfigRecords records;
    for (const char *text : {"", "{", "{\"volumes\": {}", "\xFF"}) {
        records.problems.emplace_back("old");
        Store(text);
        EXPECT_EQ(ConfigReadRecords(path_.c_str(), &records), -1) << text;
        EXPECT_EQ(records.problems, Messages{});
    }
    EXPECT_EQ(log.Messages(), Messages(4, "Prase file " + path_ + " error"));
    EXPECT_EQ(ConfigReadRecords(folder_.Path().c_str(), &records), -1);
    std::filesystem::remove(path_);
    ASSERT_EQ(mkfifo(path_.c_str(), 0600), 0);
    EXPECT_EQ(ConfigReadRecords(path_.c_str(), &records), -1);
    EXPECT_FALSE(records.isMissing);
}

TEST_F(ConfigRecordsTest, WhatIsNoObjectIsAFailure) {
    for (const char *text : {"[]", "null"}) {
        CapturedLog log(2);
        Store(text);
        ConfigRecords records;
        EXPECT_EQ(ConfigReadRecords(path_.c_str(), &records), -1) << text;
        EXPECT_EQ(LastOf(log.Messages()),
                  "ConfigReadRecords() [N] : ***** Config file (" + path_ + ") is no JSON object");
    }
}

TEST_F(ConfigRecordsTest, MembersThatAreAbsentOrNullAreEmpty) {
    for (const char *text :
         {"{}", R"({"volumes": null, "requestQueue": null, "requests": null})",
          R"({"volumes": {}, "requestQueue": [], "requests": {}, "nextRequestNum": 4})"}) {
        const ConfigRecords records = Read(text);
        EXPECT_EQ(records.problems, Messages{}) << text;
        EXPECT_EQ(records.volumes.size() + records.requests.size(), 0U) << text;
    }
}

TEST_F(ConfigRecordsTest, MembersOfAnotherTypeAreToldAndTheOthersRead) {
    EXPECT_EQ(Problems(R"({"volumes": [], "requestQueue": {}, "requests": "x"})"),
              (Messages{"\"volumes\" has another type than it should have",
                        "\"requestQueue\" has another type than it should have",
                        "\"requests\" has another type than it should have"}));
    const ConfigRecords records = Read(R"({"volumes": {"/v": {"files": {"5": "a"}}},
                                           "requests": 7})");
    EXPECT_EQ(Volumes(records), Messages{"/v: a#5"});
    EXPECT_EQ(records.problems, Messages{"\"requests\" has another type than it should have"});
}

TEST_F(ConfigRecordsTest, VolumesOfAnotherShapeAreToldAndTheOthersRead) {
    const ConfigRecords records =
        Read(R"({"volumes": {"/a": [], "/b": null, "/c": {"files": []}, "/d": {"files": null},
                             "/e": {}, "/f": {"files": {"5": "a"}}, "/g": "x"}})");
    EXPECT_EQ(Volumes(records), (Messages{"/a:", "/c:", "/d:", "/e:", "/f: a#5", "/g:"}));
    for (const RecordedVolume &volume : records.volumes) {
        const bool isDamaged =
            volume.mountPath == "/a" || volume.mountPath == "/c" || volume.mountPath == "/g";
        EXPECT_EQ(volume.areFilesKnown, !isDamaged) << volume.mountPath;
        EXPECT_EQ(volume.isWhole, !isDamaged) << volume.mountPath;
    }
    EXPECT_EQ(records.problems,
              (Messages{"volume /a is no object",
                        "volume /c: \"files\" has another type than it should have",
                        "volume /g is no object"}));
}

TEST_F(ConfigRecordsTest, RecordsOfAnotherShapeAreToldAndTheOthersRead) {
    const ConfigRecords records = Read(R"({"volumes": {"/v": {"files": {
        "": "a", "-1": "b", "4294967295": "c", "4294967296": "d", "18446744073709551621": "e",
        "5x": "f", " 5": "g", "6": "", "7": null, "8": {}, "9": ["h"], "10": 11, "0": "i",
        "0012": "j", "13": "k\u0000l"}}}})");
    EXPECT_EQ(Volumes(records), Messages{"/v: 11#10 c#4294967295 i#0 j#12"});
    Messages expected;
    for (const char *name :
         {"", " 5", "-1", "13", "18446744073709551621", "4294967296", "5x", "6", "7", "8", "9"}) {
        expected.push_back(std::string("volume /v: record \"") + name + "\" names no file");
    }
    EXPECT_EQ(records.problems, expected);
}

TEST_F(ConfigRecordsTest, FilesStandInOrderOfTheirPathsAndThoseOfOnePathOfTheirInodes) {
    const ConfigRecords records = Read(R"({"volumes": {"/w": {"files": {"1": "z", "2": "a"}},
        "/v": {"files": {"100": "b", "20": "b", "3": "b", "4": "a/b", "5": "a-b", "6": "B"}}}})");
    EXPECT_EQ(Volumes(records), (Messages{"/v: B#6 a-b#5 a/b#4 b#3 b#20 b#100", "/w: a#2 z#1"}));
}

TEST_F(ConfigRecordsTest, RequestsStandInTheOrderOfTheirService) {
    const ConfigRecords records = Read(R"({"requestQueue": ["10", 9, "2"], "requests": {
        "2": {"type": "pinFiles", "mountPath": "/v", "data": "a#1"},
        "9": {"type": "unpinFiles", "mountPath": "/v", "data": "b#2"},
        "10": {"type": "ack", "mountPath": "/w"}}})");
    EXPECT_EQ(Requests(records),
              (Messages{"10 ack /w \"\"", "9 unpinFiles /v \"b#2\"", "2 pinFiles /v \"a#1\""}));
    EXPECT_EQ(records.problems, Messages{});
}

TEST_F(ConfigRecordsTest, RequestsOfAnotherShapeAreToldAndTheOthersRead) {
    const ConfigRecords records = Read(R"({
        "requestQueue": ["1", "2", "3", "4", "5", "6", "7", "8", "9", "10", null, {}],
        "requests": {
        "2": null, "3": [], "4": {}, "5": {"type": "pinFiles", "mountPath": "/v"},
        "6": {"type": "pinFiles", "data": "a#1"}, "7": {"type": "other", "mountPath": "/v"},
        "8": {"type": ["pinFiles"], "mountPath": "/v"},
        "9": {"type": "unpinFiles", "mountPath": "/v", "data": {}},
        "10": {"type": "pinFiles", "mountPath": "/v", "data": "a#1"}}})");
    EXPECT_EQ(Requests(records), Messages{"10 pinFiles /v \"a#1\""});
    Messages expected;
    for (int number = 1; number <= 9; ++number) {
        expected.push_back("request " + std::to_string(number) + " cannot be used");
    }
    expected.insert(expected.end(), 2, "\"requestQueue\" holds what is no number of a request");
    EXPECT_EQ(records.problems, expected);
}

TEST_F(ConfigRecordsTest, RequestsThatAreNotQueuedAreTold) {
    EXPECT_EQ(Problems(R"({"requestQueue": ["2", {}], "requests": {
        "1": {"type": "ack", "mountPath": "/v"}, "2": {"type": "ack", "mountPath": "/v"},
        "22": null}})"),
              (Messages{"\"requestQueue\" holds what is no number of a request",
                        "request 1 is not in \"requestQueue\"",
                        "request 22 is not in \"requestQueue\""}));
}
} // namespace vesk
