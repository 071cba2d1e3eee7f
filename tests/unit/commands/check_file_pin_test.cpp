// Whether one file is pinned.
#include "commands/commands.h"

#include "tests/unit/commands/commands_fixture.h"

#include <sys/stat.h>

namespace vesk {
class CheckFilePinTest : public CommandsTest {
protected:
    void SetUp() override {
        CommandsTest::SetUp();
        WriteWhole(file_, "x");
    }
    std::string Inode() const {
        struct stat status {};
        EXPECT_EQ(stat(file_.c_str(), &status), 0);
        return std::to_string(static_cast<uint32_t>(status.st_ino));
    }
    // Records files of the file's top directory: a JSON object.
    void StoreFiles(const std::string &files) const {
        WriteWhole(config_, R"({"volumes" : {")" + topDir_ + R"(" : {"files" : )" + files + "}}}");
    }
    PinCheck Check() const { return CheckFileIsPin(config_.c_str(), file_.c_str()); }
    const std::string config_ = folder_.Path("conf.json");
    const std::string file_ = folder_.Path("file");
    const std::string topDir_ = file_.substr(0, file_.find('/', 1));
};

TEST_F(CheckFilePinTest, ARecordedInodeIsPinned) {
    StoreFiles("{\"" + Inode() + "\" : \"any/path\"}");
    CapturedLog log;
    EXPECT_EQ(Check(), PinCheck::Pinned);
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(CheckFilePinTest, AnInodeIsComparedByItsLow32Bits) {
    FakeLibc::onStat = [](struct stat *status) {
        status->st_ino = static_cast<ino_t>(0x5FFFFFFFEULL);
    };
    CapturedLog log;
    StoreFiles(R"({"4294967294" : "file"})");
    EXPECT_EQ(Check(), PinCheck::Pinned);
    StoreFiles(R"({"25769803774" : "file", "65534" : "file", "-2" : "file"})");
    EXPECT_EQ(Check(), PinCheck::NotPinned);
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(CheckFilePinTest, TheTopDirectoryIsLoggedAtLevel2) {
    StoreFiles("{}");
    CapturedLog log(2);
    EXPECT_EQ(Check(), PinCheck::NotPinned);
    EXPECT_EQ(MessagesOf(log, "CheckFileIsPin"),
              Messages{"CheckFileIsPin() [N]: Mount path = " + topDir_});
}

TEST_F(CheckFilePinTest, OtherInodesAreNotPinned) {
    CapturedLog log;
    for (const std::string &files :
         {std::string("{}"), std::string("null"), "{\"" + Inode() + "0\" : \"file\"}",
          "{\"0" + Inode() + "\" : \"file\"}"}) {
        StoreFiles(files);
        EXPECT_EQ(Check(), PinCheck::NotPinned) << files;
    }
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(CheckFilePinTest, AReplacedFileIsNotPinned) {
    StoreFiles("{\"" + Inode() + "\" : \"file\"}");
    WriteWhole(folder_.Path("new"), "y"); // while the old inode is still in use
    std::filesystem::rename(folder_.Path("new"), file_);
    EXPECT_EQ(Check(), PinCheck::NotPinned);
}

TEST_F(CheckFilePinTest, AVolumeWithoutRecordsIsNotPinnedEvenWithoutTheFile) {
    std::filesystem::remove(file_);
    CapturedLog log;
    for (const std::string &text :
         {std::string("{}"), std::string("null"), std::string(R"({"volumes" : null})"),
          std::string(R"({"volumes" : {"/other" : {"files" : {}}}})"),
          R"({"volumes" : {")" + topDir_ + R"(" : null}})"}) {
        WriteWhole(config_, text);
        EXPECT_EQ(Check(), PinCheck::NotPinned) << text;
    }
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(CheckFilePinTest, OnlyTheVolumesAreLookedAt) {
    CapturedLog log;
    for (const char *rest :
         {R"("nextRequestNum" : [])", R"("requestQueue" : 5)", R"("requests" : ["x"])"}) {
        WriteWhole(config_, R"({"volumes" : {")" + topDir_ + R"(" : {"files" : {")" + Inode() +
                                R"(" : "file"}}}, )" + rest + "}");
        EXPECT_EQ(Check(), PinCheck::Pinned) << rest;
    }
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(CheckFilePinTest, WithoutAConfigurationItIsAnError) {
    CapturedLog log;
    EXPECT_EQ(CheckFileIsPin(config_.c_str(), "no top directory"), PinCheck::Error);
    EXPECT_EQ(log.Messages(), Messages{"Can't find config file (" + config_ + ")"});
}

TEST_F(CheckFilePinTest, APathWithoutATopDirectoryIsAnError) {
    WriteWhole(config_, "damaged"); // not looked at yet
    CapturedLog log;
    EXPECT_EQ(CheckFileIsPin(config_.c_str(), "volume1/a"), PinCheck::Error);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Get top directory of file (volume1/a) error",
                                  "",
                                  "Can't get top directory of file (volume1/a)",
                              }));
}

TEST_F(CheckFilePinTest, AConfigurationThatCannotBeUsedIsAnError) {
    for (const char *text : {"[]", "5", R"({"volumes" : []})", R"({"volumes" : {"/x" : "y"}})",
                             R"({"volumes" : {"/x" : {"files" : []}}})"}) {
        WriteWhole(config_, text);
        CapturedLog log;
        EXPECT_EQ(Check(), PinCheck::Error) << text;
        EXPECT_EQ(log.Messages(), Messages{"Can't read data from config file (" + config_ + ")"});
        EXPECT_EQ(ReadWhole(config_), text);
    }
    WriteWhole(config_, "");
    CapturedLog log;
    EXPECT_EQ(Check(), PinCheck::Error);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Prase file " + config_ + " error",
                                  "Can't read data from config file (" + config_ + ")",
                              }));
}

TEST_F(CheckFilePinTest, AFileThatHasGoneIsAnErrorOnAVolumeWithRecords) {
    StoreFiles("{\"1\" : \"file\"}");
    std::filesystem::remove(file_);
    CapturedLog log(2);
    EXPECT_EQ(Check(), PinCheck::Error);
    EXPECT_EQ(LastOf(MessagesOf(log, "CheckFileIsPin")),
              "CheckFileIsPin() [N] : ***** Can't get inode number of file (" + file_ + ")");
    EXPECT_TRUE(log.Has("FileGetInodeNumber() [N] : ***** Stat file " + file_ + " error"));
}
} // namespace vesk
