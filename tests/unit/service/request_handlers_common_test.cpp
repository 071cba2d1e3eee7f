// What pin, unpin and reload have in common, and the reload.
#include "service/request_handlers.h"

#include "tests/unit/service/handler_fixture.h"

#include <cerrno>

namespace vesk {
class RequestHandlersCommonTest : public HandlerTest {
protected:
    WorkResult Handle(int type, const std::string &data = "") {
        const RequestRecord record = Record(type, data);
        return HandleRequest(&record);
    }
    const int handledTypes_[3] = {kRequestPinFiles, kRequestUnpinFiles, kRequestReloadPinBlocks};
};

TEST_F(RequestHandlersCommonTest, OtherTypesAreNotHandled) {
    for (const char *name : {"unknown", "ack", "addPendingSpace", "removePendigSpace"}) {
        CapturedLog log;
        EXPECT_EQ(Handle(StringToRequestType(name), "a#1"), WorkResult::Failed);
        EXPECT_EQ(log.Messages(), (Messages{
                                      std::string("Get unhandle request (") + name + ")",
                                      "Handle request failed",
                                      "Bitmap is already NULL",
                                  }));
    }
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(RequestHandlersCommonTest, ATypeWithoutANameIsNotHandled) {
    CapturedLog log;
    EXPECT_EQ(Handle(-1), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Convert request type to string errror",
                                  "Get unhandle request ((null))",
                                  "Handle request failed",
                                  "Bitmap is already NULL",
                              }));
}

TEST_F(RequestHandlersCommonTest, WithoutTheSpaceItFails) {
    FakeAppliance::spaces.clear();
    for (const int type : handledTypes_) {
        CapturedLog log;
        EXPECT_EQ(Handle(type, "a#1"), WorkResult::Failed);
        EXPECT_EQ(log.Messages(), (Messages{
                                      "Can't get space uuid",
                                      "Handle request failed",
                                      "Bitmap is already NULL",
                                  }));
    }
}

TEST_F(RequestHandlersCommonTest, WithoutACacheItFails) {
    FakeAppliance::caches.clear();
    CapturedLog log;
    EXPECT_EQ(Handle(kRequestPinFiles, "a#1"), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't get cache's ssd path",
                                  "Can't get cache path",
                                  "Handle request failed",
                                  "Bitmap is already NULL",
                              }));
}

TEST_F(RequestHandlersCommonTest, ASpaceThatHasGoneMeanwhileHasNoBitmapPath) {
    FakeAppliance::onConfigLookup = [] { FakeAppliance::spaces.clear(); };
    CapturedLog log(2);
    EXPECT_EQ(Handle(kRequestReloadPinBlocks), WorkResult::Failed);
    EXPECT_EQ(MessagesOf(log, "HandleRequest"),
              (Messages{
                  "HandleRequest() [N] : ***** Can't get bitmap path",
                  "HandleRequest() [N] : ***** Handle request failed",
              }));
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(RequestHandlersCommonTest, FailuresNameTheirFunction) {
    FakeAppliance::caches.clear();
    CapturedLog log(2);
    EXPECT_EQ(Handle(kRequestPinFiles, "a#1"), WorkResult::Failed);
    EXPECT_EQ(MessagesOf(log, "HandleRequest"),
              (Messages{
                  "HandleRequest() [N] : ***** Can't get cache path",
                  "HandleRequest() [N] : ***** Handle request failed",
              }));
    EXPECT_EQ(MessagesOf(log, "BitmapFree"),
              Messages{"BitmapFree() [N] : ***** Bitmap is already NULL"});
}

TEST_F(RequestHandlersCommonTest, ADeviceWithoutASizeLeavesAnEmptyBitmapToFree) {
    FakeAppliance::caches[0].cachePath = "/missing/device";
    CapturedLog log;
    EXPECT_EQ(Handle(kRequestReloadPinBlocks), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open device (/missing/device)",
                                  "Can't get block device path",
                                  "Can't get needed bitmap sizeof",
                                  "Allocate bitmap failed",
                                  "Handle request failed",
                                  "Warning: data is NULL for free",
                              }));
}

TEST_F(RequestHandlersCommonTest, ABitmapFileThatIsTooLongFailsAndIsKept) {
    WriteWhole(bitmapFile_, "abc");
    CapturedLog log;
    EXPECT_EQ(Handle(kRequestPinFiles, "a#1"), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Incorrect bitmap size (2), file size (3)",
                                  "Allocate bitmap failed",
                                  "Handle request failed",
                                  "Bitmap is already NULL",
                              }));
    EXPECT_EQ(ReadWhole(bitmapFile_), "abc");
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(RequestHandlersCommonTest, AListThatDoesNotParseFails) {
    for (const int type : {kRequestPinFiles, kRequestUnpinFiles}) {
        CapturedLog log;
        EXPECT_EQ(Handle(type, "a#1;b%s"), WorkResult::Failed);
        EXPECT_EQ(log.Messages(), (Messages{
                                      "Parse file inode from string (b%s) failed",
                                      "Can't parse file inodes from request's data (a#1;b%s)",
                                      "Handle request failed",
                                  }));
    }
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(RequestHandlersCommonTest, AReloadReadsTheStoredBitmapsBlocks) {
    WriteWhole(bitmapFile_, std::string("\x28\x80", 2));
    CapturedLog log;
    EXPECT_EQ(Handle(kRequestReloadPinBlocks, "what#is this"), WorkResult::Done); // has no files
    EXPECT_EQ(device_->events,
              (Events{"read 196608+65536", "read 327680+65536", "read 983040+65536"}));
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(Hex(ReadWhole(bitmapFile_)), "2880");
}

TEST_F(RequestHandlersCommonTest, AReloadWithoutABitmapFileReadsNothing) {
    CapturedLog log(2);
    EXPECT_EQ(Handle(kRequestReloadPinBlocks), WorkResult::Done);
    EXPECT_EQ(device_->events, Events{});
    EXPECT_EQ(MessagesOf(log, "ReloadPinBlocksToCache"),
              (Messages{
                  "ReloadPinBlocksToCache() [N]: Start to read blocks",
                  "ReloadPinBlocksToCache() [N]: No pin blocks, no need to reload",
              }));
    EXPECT_FALSE(std::filesystem::exists(bitmapFile_));
}

TEST_F(RequestHandlersCommonTest, AReloadIsInterrupted) {
    WriteWhole(bitmapFile_, std::string("\x28\x80", 2));
    device_->onRead = [this] { SetPending(); };
    CapturedLog log(2);
    EXPECT_EQ(Handle(kRequestReloadPinBlocks), WorkResult::Interrupted);
    EXPECT_EQ(device_->events, Events{"read 196608+65536"});
    EXPECT_EQ(MessagesOf(log, "HandleRequest"), Messages{"HandleRequest() [N]: Get Interruped"});
}

TEST_F(RequestHandlersCommonTest, AReloadWhoseReadFailsFails) {
    WriteWhole(bitmapFile_, std::string("\x28\x80", 2));
    device_->onRead = [] { FakeLibc::Fail("read", EIO); };
    CapturedLog log;
    EXPECT_EQ(Handle(kRequestReloadPinBlocks), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Read block error (seek = 196608 num bytes = 65536",
                                  "Read range to cache failed",
                                  "Handle request failed",
                              }));
}
} // namespace vesk
