// The file cycles of config/pinned_files.h.
#include "config/pinned_files.h"

#include "tests/support/config_fixture.h"

#include <sys/stat.h>

namespace vesk {
class PinnedFilesCycleTest : public ConfigTest {
protected:
    int Finish(const RequestRecord &record, const std::string &num) const {
        return ConfigUpdatedByFinishedRequest(path_.c_str(), &record, num);
    }
    int RemoveVolume(const char *mountPath = "/volume1") const {
        return ConfigRemovePinFileVolume(path_.c_str(), mountPath);
    }
    // Everybody may look, nobody may write.
    void MakeReadOnly() const {
        chmod(folder_.Path().c_str(), 0755);
        chmod(path_.c_str(), 0444);
    }
    const RequestRecord pin_ = MakeRecord(kRequestPinFiles, "/volume1", "share/b.bin#5678");
};

TEST_F(PinnedFilesCycleTest, RecordsAndQueueChangeInOneWrite) {
    Store(kExampleDocument);
    CapturedLog log;
    FakeLibc::Count("rename");
    EXPECT_EQ(Finish(pin_, "1"), 0);
    EXPECT_EQ(FakeLibc::Calls("rename"), 1);
    EXPECT_EQ(log.Messages(), Messages{});
    ExpectStored(R"({
   "nextRequestNum" : 3,
   "requestQueue" : [ "2" ],
   "requests" : {
      "2" : {
         "data" : null,
         "mountPath" : "/volume1",
         "type" : "reloadPinBlocks"
      }
   },
   "volumes" : {
      "/volume1" : {
         "files" : {
            "1234" : "share/a.txt",
            "5678" : "share/b.bin"
         }
      }
   }
})");
}

TEST_F(PinnedFilesCycleTest, PinAndUnpinOfTheSameFileLeaveNoVolume) {
    Store(R"({"requestQueue" : ["0", "1"], "requests" : {"0" : {}, "1" : {}}})");
    EXPECT_EQ(Finish(MakeRecord(kRequestPinFiles, "/volume1", "a#1"), "0"), 0);
    EXPECT_EQ(StoredDocument()["volumes"],
              ParseDocument(R"({"/volume1" : {"files" : {"1" : "a"}}})"));
    EXPECT_EQ(Finish(MakeRecord(kRequestUnpinFiles, "/volume1", "a#1"), "1"), 0);
    EXPECT_EQ(StoredDocument(),
              ParseDocument(R"({"requestQueue" : null, "requests" : {}, "volumes" : {}})"));
}

TEST_F(PinnedFilesCycleTest, AReloadOnlyLeavesTheQueue) {
    Store(kExampleDocument);
    EXPECT_EQ(Finish(MakeRecord(kRequestReloadPinBlocks, "/volume1"), "2"), 0);
    EXPECT_EQ(StoredDocument()["requestQueue"], ParseDocument(R"(["1"])"));
    EXPECT_EQ(StoredDocument()["volumes"], ParseDocument(kExampleDocument)["volumes"]);
}

TEST_F(PinnedFilesCycleTest, WithoutAFileItFails) {
    CapturedLog log;
    EXPECT_EQ(Finish(pin_, "1"), -1);
    EXPECT_EQ(log.Messages(), Messages{"Can't find config file (" + path_ + ")"});
    EXPECT_EQ(Stored(), kNoFile);
}

TEST_F(PinnedFilesCycleTest, WithADamagedFileItFails) {
    Store("");
    CapturedLog log;
    EXPECT_EQ(Finish(pin_, "1"), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Prase file " + path_ + " error",
                                  "Can't read data from config file (" + path_ + ")",
                              }));
}

TEST_F(PinnedFilesCycleTest, AListThatDoesNotParseFailsAndWritesNothing) {
    Store(kExampleDocument);
    CapturedLog log;
    EXPECT_EQ(Finish(MakeRecord(kRequestPinFiles, "/volume1", "b"), "1"), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Parse file inode from string (b) failed",
                                  "Can't get file infos",
                                  "Can't update pin file list",
                              }));
    EXPECT_EQ(Stored(), kExampleDocument);
}

TEST_F(PinnedFilesCycleTest, TheRecordsComeBeforeTheRequest) {
    Store(kExampleDocument);
    CapturedLog log;
    EXPECT_EQ(Finish(MakeRecord(kRequestPinFiles, "/volume1", "b"), "7"), -1); // nor is it queued
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Parse file inode from string (b) failed",
                                  "Can't get file infos",
                                  "Can't update pin file list",
                              }));
}

TEST_F(PinnedFilesCycleTest, ARequestThatIsNotQueuedFailsAndWritesNothing) {
    Store(kExampleDocument);
    CapturedLog log(2);
    EXPECT_EQ(Finish(pin_, "7"), -1);
    EXPECT_EQ(MessagesOf(log, "ConfigUpdatedByFinishedRequest"),
              Messages{"ConfigUpdatedByFinishedRequest() [N] : ***** Can't remove request"});
    EXPECT_EQ(Stored(), kExampleDocument);
}

TEST_F(PinnedFilesCycleTest, AFileThatCannotBeWrittenFails) {
    Store(kExampleDocument);
    MakeReadOnly();
    CapturedLog log;
    {
        const OrdinaryUser user;
        EXPECT_EQ(Finish(pin_, "1"), -1);
    }
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open config file (" + path_ + ")",
                                  "Write json data to config (" + path_ + ") failed",
                              }));
    EXPECT_EQ(Stored(), kExampleDocument);
}

TEST_F(PinnedFilesCycleTest, RemovingAVolumeWithoutAFileSucceedsAndCreatesNothing) {
    CapturedLog log(2);
    EXPECT_EQ(RemoveVolume(), 0);
    EXPECT_EQ(log.Messages(),
              Messages{"ConfigRemovePinFileVolume() [N]: No config file (" + path_ + "), skip it"});
    EXPECT_EQ(Stored(), kNoFile);
}

TEST_F(PinnedFilesCycleTest, RemovingAVolumeKeepsItsQueuedRequests) {
    Store(kExampleDocument);
    CapturedLog log;
    EXPECT_EQ(RemoveVolume(), 0);
    EXPECT_EQ(log.Messages(), Messages{"Remove pin file volume (/volume1) from config file"});
    Json::Value expected = ParseDocument(kExampleDocument);
    expected["volumes"] = Json::Value(Json::objectValue);
    EXPECT_EQ(StoredDocument(), expected);
}

TEST_F(PinnedFilesCycleTest, RemovingAVolumeIsANoticeAtLevel2) {
    Store(kExampleDocument);
    CapturedLog log(2);
    EXPECT_EQ(RemoveVolume(), 0);
    EXPECT_EQ(MessagesOf(log, "ConfigRemovePinFileVolume"),
              Messages{"ConfigRemovePinFileVolume() [N] : Remove pin file volume (/volume1) from "
                       "config file"});
}

TEST_F(PinnedFilesCycleTest, RemovingAnAbsentVolumeWritesNothing) {
    Store("  {}");
    CapturedLog log(2);
    EXPECT_EQ(RemoveVolume(), 0);
    EXPECT_EQ(
        MessagesOf(log, "ConfigRemovePinFileVolume"),
        Messages{"ConfigRemovePinFileVolume() [N]: Volume (/volume1) deson't has pin files, no "
                 "need to remove"});
    EXPECT_EQ(Stored(), "  {}");
}

TEST_F(PinnedFilesCycleTest, RemovingAVolumeFromADamagedFileFails) {
    Store("[1]");
    CapturedLog log;
    EXPECT_EQ(RemoveVolume(), -1);
    EXPECT_EQ(log.Messages(), Messages{"Can't read data from config file (" + path_ + ")"});
    EXPECT_EQ(Stored(), "[1]");
}

TEST_F(PinnedFilesCycleTest, RemovingAVolumeFromAFileThatCannotBeWrittenFails) {
    Store(kExampleDocument);
    MakeReadOnly();
    CapturedLog log;
    {
        const OrdinaryUser user;
        EXPECT_EQ(RemoveVolume(), -1);
    }
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open config file (" + path_ + ")",
                                  "Write json data to config (" + path_ + ") failed",
                              }));
    EXPECT_EQ(Stored(), kExampleDocument);
}
} // namespace vesk
