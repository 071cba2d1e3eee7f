#include "service/request_handlers.h"

#include "tests/unit/service/handler_fixture.h"

#include <cerrno>

namespace vesk {
class RequestHandlersTest : public HandlerTest {
protected:
    WorkResult Handle(int type, const std::string &data = "") {
        const RequestRecord record = Record(type, data);
        return HandleRequest(&record);
    }
};

TEST_F(RequestHandlersTest, APinWritesTheBitmapThenSendsItThenReads) {
    CapturedLog log;
    EXPECT_EQ(Handle(kRequestPinFiles, "a#1;share/b#2"), WorkResult::Done);
    EXPECT_EQ(device_->events, (Events{
                                   "bitmap 0902 file 0902",
                                   "read 8192+4096",
                                   "read 196608+4096",
                                   "read 589824+8192",
                               }));
    EXPECT_EQ(Hex(ReadWhole(bitmapFile_)), "0902");
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(RequestHandlersTest, APinAddsToTheStoredBitmap) {
    WriteWhole(bitmapFile_, std::string("\x80\x10", 2));
    EXPECT_EQ(Handle(kRequestPinFiles, "a#1"), WorkResult::Done);
    EXPECT_EQ(FirstOf(device_->events), "bitmap 8110 file 8110");
}

TEST_F(RequestHandlersTest, LookupsGoByFolderAndInode) {
    std::vector<std::string> asked;
    FakeAppliance::onLookup = [&asked](const std::string &directory, uint64_t inode, int,
                                       FileMappingTable &table) {
        asked.push_back(directory + " " + std::to_string(inode));
        table.entries = {FakeExtent(0, 8, 16)};
        return 0;
    };
    EXPECT_EQ(Handle(kRequestPinFiles, "a#1;share/b#4294967295"), WorkResult::Done);
    EXPECT_EQ(Handle(kRequestUnpinFiles, "share/c#4294967294"), WorkResult::Done);
    EXPECT_EQ(asked, (std::vector<std::string>{volume_ + " 1", volume_ + "/share 4294967295",
                                               volume_ + "/share 4294967294"}));
    EXPECT_EQ(FakeAppliance::askedPath, volume_);
}

TEST_F(RequestHandlersTest, AGrownVolumesBitmapIsWrittenInItsNewSize) {
    WriteWhole(bitmapFile_, "\x80");
    CapturedLog log;
    EXPECT_EQ(Handle(kRequestPinFiles, "a#1"), WorkResult::Done);
    EXPECT_EQ(log.Messages(), Messages{"Bitmap size changed. Could be due to volume expansion"});
    EXPECT_EQ(Hex(ReadWhole(bitmapFile_)), "8100");
}

TEST_F(RequestHandlersTest, APinWhoseSecondFileFailsChangesNothing) {
    WriteWhole(bitmapFile_, std::string("\x80\x10", 2));
    CapturedLog log;
    EXPECT_EQ(Handle(kRequestPinFiles, "a#1;x#77;b#2"), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Get mapping result fail.",
                                  "Can't add file (" + volume_ + "/x) inode (77) to bitmap",
                                  "Handle request failed",
                              }));
    EXPECT_EQ(device_->events, Events{});
    EXPECT_EQ(Hex(ReadWhole(bitmapFile_)), "8010");
    EXPECT_EQ(FakeAppliance::lookups, 2);
}

TEST_F(RequestHandlersTest, APinWhoseBitmapCannotBeWrittenTellsTheDriverNothing) {
    FakeLibc::Fail("write", ENOSPC);
    CapturedLog log;
    EXPECT_EQ(Handle(kRequestPinFiles, "a#1"), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Write bitmap file (" + bitmapFile_ + ") error",
                                  "",
                                  "Write bitmap failed",
                                  "Handle request failed",
                              }));
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(RequestHandlersTest, APinThatTheDriverRefusesLeavesTheFileChanged) {
    device_->failingRequest = 0xFECF;
    CapturedLog log(2);
    EXPECT_EQ(Handle(kRequestPinFiles, "a#1"), WorkResult::Failed);
    EXPECT_EQ(MessagesOf(log, "HandlePinRequest"),
              Messages{"HandlePinRequest() [N] : ***** Can't send bitmap to driver"});
    EXPECT_EQ(MessagesOf(log, "HandleRequest"),
              Messages{"HandleRequest() [N] : ***** Handle request failed"});
    EXPECT_EQ(device_->events, Events{"bitmap 0100 file 0100"}); // and no read
    EXPECT_EQ(Hex(ReadWhole(bitmapFile_)), "0100");
}

TEST_F(RequestHandlersTest, APinWhoseReadFailsHasChangedFileAndDriver) {
    device_->onRead = [] { FakeLibc::Fail("read", EIO); };
    CapturedLog log;
    EXPECT_EQ(Handle(kRequestPinFiles, "a#1;b#2"), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Read block error (seek = 8192 num bytes = 4096",
                                  "Read fd to null failed (disk start sector = 16 num sectors = 8)",
                                  "Can't read file (" + volume_ + "/a) to cache",
                                  "Handle request failed",
                              }));
    EXPECT_EQ(device_->events, (Events{"bitmap 0902 file 0902", "read 8192+4096"}));
}

TEST_F(RequestHandlersTest, AnInterruptedPinHasChangedFileAndDriver) {
    device_->onRead = [this] { SetPending(); };
    CapturedLog log(2);
    EXPECT_EQ(Handle(kRequestPinFiles, "b#2"), WorkResult::Interrupted);
    EXPECT_EQ(device_->events, (Events{"bitmap 0802 file 0802", "read 196608+4096"}));
    EXPECT_EQ(MessagesOf(log, "HandleRequest"), Messages{"HandleRequest() [N]: Get Interruped"});
}

TEST_F(RequestHandlersTest, AnInterruptionIsSilentAtLevel1) {
    SetPending();
    CapturedLog log;
    EXPECT_EQ(Handle(kRequestPinFiles, "a#1"), WorkResult::Interrupted);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(device_->events, Events{"bitmap 0100 file 0100"});
}

TEST_F(RequestHandlersTest, APinOfNoFilesSendsTheBitmapAsItIs) {
    WriteWhole(bitmapFile_, std::string("\x80\x10", 2));
    EXPECT_EQ(Handle(kRequestPinFiles, ""), WorkResult::Done);
    EXPECT_EQ(device_->events, Events{"bitmap 8010 file 8010"});
}

TEST_F(RequestHandlersTest, AnEntryWithoutAPathCannotBePinned) {
    unsigned char bytes[2] = {};
    PinBitmap bitmap{bytes, 2};
    CapturedLog log(2);
    EXPECT_EQ(HandlePinRequest({FileInfo{}}, &bitmap, volume_.c_str(), device_->Path().c_str(),
                               bitmapFile_.c_str()),
              WorkResult::Failed);
    EXPECT_EQ(log.Messages(),
              Messages{"HandlePinRequest() [N] : ***** Info's relative path should not be NULL"});
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(RequestHandlersTest, AnEntryWithoutAPathCanBeUnpinned) {
    unsigned char bytes[2] = {0xFF, 0xFF};
    PinBitmap bitmap{bytes, 2};
    FileInfo info{};
    info.inodeNum = 1;
    EXPECT_EQ(HandleUnpinRequest({info}, &bitmap, volume_.c_str(), device_->Path().c_str(),
                                 bitmapFile_.c_str()),
              WorkResult::Done);
    EXPECT_EQ(device_->events, (Events{"bitmap feff file feff", "ranges 16+8"}));
}

TEST_F(RequestHandlersTest, AnUnpinWritesAndSendsTheBitmapThenReleasesTheRanges) {
    WriteWhole(bitmapFile_, "\xff\xff");
    CapturedLog log;
    EXPECT_EQ(Handle(kRequestUnpinFiles, "share/b#2;a#1"), WorkResult::Done);
    EXPECT_EQ(device_->events, (Events{"bitmap f6fd file f6fd", "ranges 384+8 1152+16 16+8"}));
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(RequestHandlersTest, AnUnpinWhoseSecondFileFailsChangesNothing) {
    WriteWhole(bitmapFile_, "\xff\xff");
    CapturedLog log;
    EXPECT_EQ(Handle(kRequestUnpinFiles, "a#1;x#77"), WorkResult::Failed);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Get mapping result fail.",
                                  "Get mapping table of file (" + volume_ + "/x) failed",
                                  "Unset bitmap and append unpin infos failed",
                                  "Handle request failed",
                              }));
    EXPECT_EQ(device_->events, Events{});
    EXPECT_EQ(Hex(ReadWhole(bitmapFile_)), "ffff");
}

TEST_F(RequestHandlersTest, AnUnpinWhoseBitmapCannotBeWrittenTellsTheDriverNothing) {
    WriteWhole(bitmapFile_, "\xff\xff");
    FakeLibc::Fail("write", ENOSPC);
    CapturedLog log(2);
    EXPECT_EQ(Handle(kRequestUnpinFiles, "a#1"), WorkResult::Failed);
    EXPECT_EQ(MessagesOf(log, "HandleUnpinRequest"),
              Messages{"HandleUnpinRequest() [N] : ***** Write bitmap failed"});
    EXPECT_EQ(device_->events, Events{});
}

TEST_F(RequestHandlersTest, AnUnpinThatTheDriverRefusesReleasesNothing) {
    WriteWhole(bitmapFile_, "\xff\xff");
    device_->failingRequest = 0xFECF;
    CapturedLog log(2);
    EXPECT_EQ(Handle(kRequestUnpinFiles, "a#1"), WorkResult::Failed);
    EXPECT_EQ(MessagesOf(log, "HandleUnpinRequest"),
              Messages{"HandleUnpinRequest() [N] : ***** Can't send bitmap to driver"});
    EXPECT_EQ(device_->events, Events{"bitmap feff file feff"});
}

TEST_F(RequestHandlersTest, ReleasedRangesThatAreRefusedFailTheUnpin) {
    WriteWhole(bitmapFile_, "\xff\xff");
    device_->failingRequest = 0xFED0;
    CapturedLog log(2);
    EXPECT_EQ(Handle(kRequestUnpinFiles, "a#1"), WorkResult::Failed);
    EXPECT_EQ(MessagesOf(log, "HandleUnpinRequest"),
              Messages{"HandleUnpinRequest() [N] : ***** Can't send unpin information to driver"});
    EXPECT_EQ(device_->events, (Events{"bitmap feff file feff", "ranges 16+8"}));
}

TEST_F(RequestHandlersTest, AnUnpinIsNotInterrupted) {
    WriteWhole(bitmapFile_, "\xff\xff");
    SetPending();
    EXPECT_EQ(Handle(kRequestUnpinFiles, "a#1"), WorkResult::Done);
}
} // namespace vesk
