#include "commands/commands.h"

#include "tests/unit/commands/client_fixture.h"

namespace vesk {
namespace {
const bool kPrivateWorld = UsePrivateWorld();
} // namespace

TEST_F(ClientRequestsTest, APinSendsTheFilesAsTyped) {
    const ToolParameters parameters = Parameters("/volume1/a;/volume1/b c;;%s");
    CapturedLog log;
    EXPECT_EQ(PinFilesRequest(&parameters), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    const RawMessage message = OnlyMessage();
    EXPECT_EQ(message.type, 1);
    EXPECT_EQ(message.text, RecordBytes(1, volume_, "/volume1/a;/volume1/b c;;%s"));
}

TEST_F(ClientRequestsTest, AnUnpinSendsTheFilesAsTyped) {
    const ToolParameters parameters = Parameters("/volume1/a");
    EXPECT_EQ(UnpinFilesRequest(&parameters), 0);
    EXPECT_EQ(OnlyMessage().text, RecordBytes(2, volume_, "/volume1/a"));
}

TEST_F(ClientRequestsTest, AReloadSendsNoData) {
    const ToolParameters parameters = Parameters("/volume1/a");
    EXPECT_EQ(ReloadPinBlocksRequest(&parameters), 0);
    EXPECT_EQ(OnlyMessage().text, RecordBytes(6, volume_));
}

TEST_F(ClientRequestsTest, FilesOf1024CharactersFillTheField) {
    for (const size_t length : {size_t{1023}, size_t{1024}, size_t{3000}}) {
        const std::string files(length, 'f');
        const ToolParameters parameters = Parameters(files.c_str());
        EXPECT_EQ(PinFilesRequest(&parameters), 0);
        EXPECT_EQ(OnlyMessage().text, RecordBytes(1, volume_, files.substr(0, 1024)));
    }
}

TEST_F(ClientRequestsTest, AMountPathOf511CharactersIsTerminated) {
    const std::string mountPath = "/" + std::string(510, 'm');
    FakeAppliance::spaces[0].referencePath = mountPath;
    ToolParameters parameters = Parameters("f");
    parameters.mountPath = mountPath.c_str();
    EXPECT_EQ(PinFilesRequest(&parameters), 0);
    const RawMessage message = OnlyMessage();
    EXPECT_EQ(message.text, RecordBytes(1, mountPath, "f"));
    EXPECT_EQ(message.text[4 + 511], '\0');
}

TEST_F(ClientRequestsTest, AtLevel2TheQueueIsNamed) {
    const int queueId = MsgQueueGet(kMessageKeyFile);
    const ToolParameters parameters = Parameters("f");
    CapturedLog log(2);
    EXPECT_EQ(PinFilesRequest(&parameters), 0);
    EXPECT_EQ(
        MessagesOf(log, "HandleFilesByRequestType"),
        (Messages{
            "HandleFilesByRequestType() [N] : +++++",
            "HandleFilesByRequestType() [N]: Server mesage queue id = " + std::to_string(queueId),
            "HandleFilesByRequestType() [N] : -----",
        }));
}

TEST_F(ClientRequestsTest, AVolumeWithoutPinSupportIsRefusedBeforeTheQueue) {
    FakeAppliance::caches[0].supportPin = 0;
    const ToolParameters parameters = Parameters("f");
    CapturedLog log;
    EXPECT_EQ(PinFilesRequest(&parameters), -1);
    EXPECT_EQ(UnpinFilesRequest(&parameters), -1);
    EXPECT_EQ(ReloadPinBlocksRequest(&parameters), -1);
    EXPECT_EQ(AddPendingSpaceRequest(Volume()), -1);
    EXPECT_EQ(RemovePendingSpaceRequest(Volume()), -1);
    EXPECT_EQ(log.Messages(), Messages(5, "Volume (" + volume_ + ") doesn't support pin"));
    EXPECT_EQ(FakeLibc::sleeps, 0);
    ExpectUntouchedQueue();
}

TEST_F(ClientRequestsTest, OtherTypesAreRefusedBeforeTheVolumeIsLookedAt) {
    FakeAppliance::spaces.clear();
    const ToolParameters parameters = Parameters("f");
    for (const char *name : {"unknown", "ack", "addPendingSpace", "removePendigSpace"}) {
        CapturedLog log(2);
        EXPECT_EQ(HandleFilesByRequestType(&parameters, StringToRequestType(name)), -1);
        EXPECT_EQ(log.Messages(), (Messages{
                                      "HandleFilesByRequestType() [N] : +++++",
                                      "HandleFilesByRequestType() [N] : ***** Unhandle request "
                                      "type = " +
                                          std::string(name),
                                      "HandleFilesByRequestType() [N] : -----",
                                  }));
    }
    CapturedLog log;
    EXPECT_EQ(HandleFilesByRequestType(&parameters, 7), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Convert request type to string errror",
                                  "Unhandle request type = (null)",
                              }));
    ExpectUntouchedQueue();
}

TEST_F(ClientRequestsTest, AKeyThatNamesNoQueueFailsWithItsReason) {
    MsgQueueGet(kMessageKeyFile);
    WriteWhole(kMessageKeyFile, "7");
    const ToolParameters parameters = Parameters("f");
    CapturedLog log;
    EXPECT_EQ(PinFilesRequest(&parameters), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open message queue: No such file or directory",
                                  "Can't get server messsage queue: No such file or directory",
                              }));
}

TEST_F(ClientRequestsTest, AFullQueueFailsAfterThreeSeconds) {
    const int queueId = MsgQueueGet(kMessageKeyFile);
    for (int i = 0; i < 1024; ++i) {
        ASSERT_TRUE(PutMessage(queueId, 1, std::string(1540, 'x')));
    }
    const ToolParameters parameters = Parameters("f");
    CapturedLog log;
    EXPECT_EQ(PinFilesRequest(&parameters), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Send message timeout (3 seconds)",
                                  "Send message failed: Resource temporarily unavailable",
                              }));
    EXPECT_EQ(FakeLibc::sleeps, 3);
    EXPECT_EQ(CountMessages(queueId), 1024);
}
} // namespace vesk
