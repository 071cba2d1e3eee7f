// Records that no well-meaning client sends.
#include "service/receiver.h"

#include "tests/unit/service/receiver_fixture.h"

#include <climits>

namespace vesk {
using ReceiverRecordTest = ReceiverTest;

TEST_F(ReceiverRecordTest, ATypeWithoutANameStopsIt) {
    for (const int type : {7, -1, INT_MAX}) {
        Put(type, "/volume1", "/volume1/a");
        CapturedLog log;
        RunReceiver();
        EXPECT_EQ(log.Messages(), (Messages{
                                      "Convert request type to string errror",
                                      "Can't add request to json",
                                      "Can't add request to config (" + config_ + ")",
                                  }));
        EXPECT_FALSE(std::filesystem::exists(config_));
    }
    Put(7, "/volume1");
    CapturedLog log(2);
    RunReceiver();
    EXPECT_TRUE(log.Has("GetRequests() [N]: Get a new message. Request type = (null)"));
}

TEST_F(ReceiverRecordTest, PathsAreDataAndNeverFormats) {
    Put(kRequestReloadPinBlocks, "/%s%n%d");
    const std::string inode = CreateFile("100%s");
    Put(kRequestPinFiles, volume_, volume_ + "/100%s");
    Put(kRequestAddPendingSpace, "/%n%n");
    PutEnd();
    CapturedLog log(2);
    RunReceiver();
    const Json::Value document = ParseJson(ReadWhole(config_));
    EXPECT_EQ(document["requests"]["0"]["mountPath"], Json::Value("/%s%n%d"));
    EXPECT_EQ(document["requests"]["1"]["data"], Json::Value("100%s#" + inode));
    EXPECT_TRUE(ServiceIsPendingSpace("/%n%n"));
}

TEST_F(ReceiverRecordTest, TextsWithoutTheirNulEndAtTheirLastByte) {
    Put(kRequestReloadPinBlocks, std::string(512, 'm'), std::string(1024, 'd'));
    Put(kRequestPinFiles, volume_, std::string(1024, 'd'));
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(ParseJson(ReadWhole(config_))["requests"]["0"]["mountPath"],
              Json::Value(std::string(511, 'm')));
    EXPECT_EQ(FirstOf(log.Messages()), "Failed to Get relative path (Volume path=" + volume_ +
                                           " File path=" + std::string(1023, 'd'));
}

TEST_F(ReceiverRecordTest, AShortMessageInheritsNothingFromTheOneBefore) {
    const std::string inode = CreateFile("a");
    Put(kRequestPinFiles, volume_, volume_ + "/a");
    Put(RecordBytes(kRequestReloadPinBlocks, "/volume2").substr(0, 4 + 8)); // no NUL
    Put(RecordBytes(kRequestPinFiles, volume_).substr(0, 4 + volume_.size()));
    CapturedLog log;
    RunReceiver();
    const Json::Value document = ParseJson(ReadWhole(config_));
    EXPECT_EQ(document["requests"]["0"]["data"], Json::Value("a#" + inode));
    EXPECT_EQ(document["requests"]["1"]["mountPath"], Json::Value("/volume2"));
    EXPECT_EQ(log.Messages(), (Messages{"Should provide file paths", "Get wrong message format"}));
}

TEST_F(ReceiverRecordTest, AnEmptyMessageStopsIt) {
    Put(std::string());
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(log.Messages(), (Messages{"Space UUID is not set", "Get wrong message format"}));
}

TEST_F(ReceiverRecordTest, AMessageThatIsTooLongStopsIt) {
    Put(std::string(1541, 'x'));
    CapturedLog log(2);
    RunReceiver();
    EXPECT_TRUE(
        log.Has("GetRequests() [N] : ***** Receive messaged failed: Argument list too long"));
    EXPECT_EQ(CountMessages(queueId_), 1);
}
} // namespace vesk
