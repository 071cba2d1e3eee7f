#include "commands/commands.h"

#include "tests/support/ordinary_user.h"
#include "tests/unit/commands/volume_events_fixture.h"

#include <cerrno>
#include <json/reader.h>
#include <sstream>
#include <sys/stat.h>

namespace vesk {
namespace {
Json::Value Parse(const std::string &text) {
    Json::Value root;
    std::string errors;
    std::istringstream stream(text);
    EXPECT_TRUE(Json::parseFromStream(Json::CharReaderBuilder(), stream, &root, &errors)) << errors;
    return root;
}

class HandleMountTest : public VolumeEventsTest {
protected:
    int Mount() const { return HandleSpaceMount(config_.c_str(), Volume()); }
};
} // namespace

TEST_F(HandleMountTest, MountOfAVolumeThatSupportsPinningTouchesNothing) {
    WriteWhole(bitmapFile_, "ab");
    CapturedLog log;
    EXPECT_EQ(Mount(), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(ReadWhole(config_), document_);
    EXPECT_EQ(ReadWhole(bitmapFile_), "ab");
}

TEST_F(HandleMountTest, MountOfAVolumeWithoutCacheRemovesRecordsAndBitmap) {
    FakeAppliance::caches.clear();
    WriteWhole(bitmapFile_, "ab");
    CapturedLog log;
    EXPECT_EQ(Mount(), 0);
    EXPECT_EQ(log.Messages(), Messages{recordsRemoved_});
    EXPECT_FALSE(std::filesystem::exists(bitmapFile_));
    Json::Value expected = Parse(document_);
    expected["volumes"].removeMember(volume_);
    EXPECT_EQ(Parse(ReadWhole(config_)), expected); // its requests stay
}

TEST_F(HandleMountTest, MountLogsAtLevel2) {
    FakeAppliance::caches[0].state = 0;
    CapturedLog log(2);
    EXPECT_EQ(Mount(), 0);
    EXPECT_EQ(MessagesOf(log, "HandleSpaceMount"),
              Messages{"HandleSpaceMount() [N]: Space (" + volume_ + ") doesn't support pin"});
}

TEST_F(HandleMountTest, MountWithoutABitmapFileStillRemovesTheRecords) {
    FakeAppliance::caches.clear();
    EXPECT_EQ(Mount(), 0);
    EXPECT_FALSE(Parse(ReadWhole(config_))["volumes"].isMember(volume_));
}

TEST_F(HandleMountTest, MountWithoutAConfigurationStillRemovesTheBitmap) {
    FakeAppliance::caches.clear();
    std::filesystem::remove(config_);
    WriteWhole(bitmapFile_, "ab");
    CapturedLog log;
    EXPECT_EQ(Mount(), 0);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_FALSE(std::filesystem::exists(bitmapFile_));
    EXPECT_FALSE(std::filesystem::exists(config_));
}

TEST_F(HandleMountTest, MountLeavesADirectoryAtTheBitmapPath) {
    FakeAppliance::caches.clear();
    std::filesystem::create_directory(bitmapFile_);
    CapturedLog log;
    EXPECT_EQ(Mount(), 0);
    EXPECT_EQ(log.Messages(), Messages{recordsRemoved_});
    EXPECT_TRUE(std::filesystem::is_directory(bitmapFile_));
}

TEST_F(HandleMountTest, MountLeavesALinkAtTheBitmapPath) {
    FakeAppliance::caches.clear();
    const std::string elsewhere = folder_.Path("elsewhere");
    for (const bool dangling : {true, false}) {
        std::filesystem::create_symlink(elsewhere, bitmapFile_);
        if (!dangling) {
            WriteWhole(elsewhere, "ab");
        }
        CapturedLog log;
        EXPECT_EQ(Mount(), 0);
        EXPECT_TRUE(std::filesystem::is_symlink(bitmapFile_)) << dangling;
        std::filesystem::remove(bitmapFile_);
    }
    EXPECT_EQ(ReadWhole(elsewhere), "ab");
}

TEST_F(HandleMountTest, MountLooksAtTheVolumesAlone) {
    FakeAppliance::caches.clear();
    for (const char *rest :
         {R"("nextRequestNum" : [])", R"("requestQueue" : 5)", R"("requests" : ["x"])"}) {
        WriteWhole(config_,
                   R"({"volumes" : {")" + volume_ + R"(" : {"files" : {}}}, )" + rest + "}");
        CapturedLog log;
        EXPECT_EQ(Mount(), 0) << rest;
        EXPECT_EQ(log.Messages(), Messages{recordsRemoved_});
        EXPECT_EQ(Parse(ReadWhole(config_)),
                  Parse(std::string(R"({"volumes" : {}, )") + rest + "}"));
    }
}

TEST_F(HandleMountTest, MountWithADamagedConfigurationKeepsTheBitmap) {
    FakeAppliance::caches.clear();
    WriteWhole(config_, R"({"volumes" : []})");
    WriteWhole(bitmapFile_, "ab");
    CapturedLog log;
    EXPECT_EQ(Mount(), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't read data from config file (" + config_ + ")",
                                  "Can't remove pin files in volume (" + volume_ + ")",
                              }));
    EXPECT_EQ(ReadWhole(bitmapFile_), "ab");
    EXPECT_EQ(ReadWhole(config_), R"({"volumes" : []})");
}

TEST_F(HandleMountTest, MountThatCannotDeleteTheBitmapHasRemovedTheRecords) {
    FakeAppliance::caches.clear();
    WriteWhole(bitmapFile_, "ab");
    chmod(folder_.Path().c_str(), 0777);
    chmod(config_.c_str(), 0666);
    chmod(Volume(), 0555); // nothing goes out of it
    CapturedLog log;
    {
        const OrdinaryUser user;
        EXPECT_EQ(Mount(), -1);
    }
    chmod(Volume(), 0755);
    EXPECT_EQ(log.Messages(), (Messages{
                                  recordsRemoved_,
                                  "Can't delete bitmap file (" + bitmapFile_ + ")",
                              }));
    EXPECT_FALSE(Parse(ReadWhole(config_))["volumes"].isMember(volume_));
    EXPECT_EQ(ReadWhole(bitmapFile_), "ab");
}

TEST_F(HandleMountTest, MountWithoutMemoryForTheBitmapPathHasRemovedTheRecords) {
    FakeAppliance::caches.clear();
    WriteWhole(bitmapFile_, "ab");
    FakeLibc::Fail("strdup", ENOMEM, 2); // behind the UUID in the library
    CapturedLog log(2);
    EXPECT_EQ(Mount(), -1);
    EXPECT_EQ(LastOf(log.Messages()),
              "HandleSpaceMount() [N] : ***** Can't get volume (" + volume_ + ")'s bitmap path");
    EXPECT_EQ(ReadWhole(bitmapFile_), "ab");
    EXPECT_FALSE(Parse(ReadWhole(config_))["volumes"].isMember(volume_));
}

TEST_F(HandleMountTest, MountOfAnUnknownVolumeRemovesItsRecords) {
    FakeAppliance::spaces.clear();
    CapturedLog log;
    EXPECT_EQ(Mount(), 0);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't get space uuid from mount path (" + volume_ + ")",
                                  recordsRemoved_,
                              }));
}
} // namespace vesk
