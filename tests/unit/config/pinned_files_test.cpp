#include "config/pinned_files.h"

#include "tests/support/config_fixture.h"

namespace vesk {
class PinnedFilesTest : public ConfigTest {
protected:
    static int Update(Json::Value &root, int type, const std::string &data) {
        const RequestRecord record = MakeRecord(type, "/volume1", data);
        return JsonUpdatePinFileInfo(root, &record);
    }
};

TEST_F(PinnedFilesTest, PinningRecordsEachFileByItsInode) {
    Json::Value root;
    EXPECT_EQ(Update(root, kRequestPinFiles, "share/a.txt#1234;b#4294967295"), 0);
    EXPECT_EQ(root, ParseDocument(R"({"volumes" : {"/volume1" : {"files" :
        {"1234" : "share/a.txt", "4294967295" : "b"}}}})"));
}

TEST_F(PinnedFilesTest, PinningTwiceKeepsTheFirstPath) {
    Json::Value root;
    EXPECT_EQ(Update(root, kRequestPinFiles, "a#1"), 0);
    CapturedLog log(2);
    EXPECT_EQ(Update(root, kRequestPinFiles, "renamed#1;b#2"), 0);
    EXPECT_EQ(root, ParseDocument(R"({"volumes" : {"/volume1" : {"files" :
        {"1" : "a", "2" : "b"}}}})"));
    EXPECT_EQ(MessagesOf(log, "JsonUpdatePinFileInfo"),
              (Messages{
                  "JsonUpdatePinFileInfo() [N]: mount path = /volume1 request = Request "
                  "type=pinFiles mountPath=/volume1 data=renamed#1;b#2",
                  "JsonUpdatePinFileInfo() [N]: No need to add file (renamed) to pin file list",
                  "JsonUpdatePinFileInfo() [N]: Add file (b) to pin file list",
              }));
}

TEST_F(PinnedFilesTest, UnpinningTheLastFileRemovesTheVolume) {
    Json::Value root = ParseDocument(kExampleDocument);
    CapturedLog log(2);
    EXPECT_EQ(Update(root, kRequestUnpinFiles, "share/a.txt#1234;b#2"), 0);
    EXPECT_EQ(root["volumes"], ParseDocument("{}"));
    EXPECT_EQ(
        MessagesOf(log, "JsonUpdatePinFileInfo"),
        (Messages{
            "JsonUpdatePinFileInfo() [N]: mount path = /volume1 request = Request type=unpinFiles "
            "mountPath=/volume1 data=share/a.txt#1234;b#2",
            "JsonUpdatePinFileInfo() [N]: Remove file (share/a.txt) from pin file list",
            "JsonUpdatePinFileInfo() [N]: No need to remove file (b) from pin file list",
            "JsonUpdatePinFileInfo() [N]: Remove volume (/volume1)",
        }));
}

TEST_F(PinnedFilesTest, UnpinningOneOfTwoKeepsTheOther) {
    Json::Value root;
    Update(root, kRequestPinFiles, "a#1;b#2");
    EXPECT_EQ(Update(root, kRequestUnpinFiles, "a#1"), 0);
    EXPECT_EQ(root, ParseDocument(R"({"volumes" : {"/volume1" : {"files" : {"2" : "b"}}}})"));
}

TEST_F(PinnedFilesTest, OtherVolumesKeepTheirRecords) {
    Json::Value root = ParseDocument(R"({"volumes" : {"/volume2" : {"files" : {"1" : "a"}}}})");
    EXPECT_EQ(Update(root, kRequestUnpinFiles, "a#1"), 0);
    EXPECT_EQ(root, ParseDocument(R"({"volumes" : {"/volume2" : {"files" : {"1" : "a"}}}})"));
}

TEST_F(PinnedFilesTest, UnpinningOnAVolumeWithoutRecordsLeavesNone) {
    for (const char *text :
         {"null", R"({"volumes" : {}})", R"({"volumes" : {"/volume1" : null}})"}) {
        Json::Value root = ParseDocument(text);
        EXPECT_EQ(Update(root, kRequestUnpinFiles, "a#1"), 0);
        EXPECT_EQ(root, ParseDocument(R"({"volumes" : {}})"));
    }
}

TEST_F(PinnedFilesTest, AnEmptyPinLeavesNoVolume) {
    Json::Value root;
    EXPECT_EQ(Update(root, kRequestPinFiles, ""), 0);
    EXPECT_EQ(root, ParseDocument(R"({"volumes" : {}})"));
}

TEST_F(PinnedFilesTest, OtherTypesChangeNothing) {
    Json::Value root;
    CapturedLog log(2);
    EXPECT_EQ(Update(root, kRequestReloadPinBlocks, "x"), 0);
    EXPECT_TRUE(root.isNull());
    EXPECT_EQ(MessagesOf(log, "JsonUpdatePinFileInfo"),
              (Messages{
                  "JsonUpdatePinFileInfo() [N]: mount path = /volume1 request = Request "
                  "type=reloadPinBlocks mountPath=/volume1 data=x",
                  "JsonUpdatePinFileInfo() [N]: No need to update pin file list",
              }));
}

TEST_F(PinnedFilesTest, AListThatDoesNotParseFails) {
    Json::Value root;
    CapturedLog log;
    EXPECT_EQ(Update(root, kRequestPinFiles, "a#1;b"), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Parse file inode from string (b) failed",
                                  "Can't get file infos",
                              }));
}

TEST_F(PinnedFilesTest, RemovingAVolumeAnswers2WhenItWasThere) {
    Json::Value root = ParseDocument(kExampleDocument);
    EXPECT_EQ(JsonRemovePinFileVolume(root, "/volume1"), 2);
    EXPECT_EQ(root["volumes"], ParseDocument("{}"));
}

TEST_F(PinnedFilesTest, RemovingAnAbsentVolumeAnswers1) {
    Json::Value root = ParseDocument(R"({"requestQueue" : []})");
    EXPECT_EQ(JsonRemovePinFileVolume(root, "/volume1"), 1);
    EXPECT_TRUE(root.isMember("volumes"));
    EXPECT_TRUE(root["volumes"].isNull());
    Json::Value other = ParseDocument(kExampleDocument);
    EXPECT_EQ(JsonRemovePinFileVolume(other, "/volume"), 1);
    EXPECT_EQ(other, ParseDocument(kExampleDocument));
}

TEST_F(PinnedFilesTest, ANullVolumeCountsAsAbsent) {
    Json::Value root = ParseDocument(R"({"volumes" : {"/volume1" : null}})");
    EXPECT_EQ(JsonRemovePinFileVolume(root, "/volume1"), 1);
}
} // namespace vesk
