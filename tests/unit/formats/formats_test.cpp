// The examples in docs/formats.md are what the code writes and reads, byte for byte.
#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/private_world.h"
#include "tests/support/temp_dir.h"
#include "tests/unit/formats/doc_examples.h"

#include "bitmap/bitmap_file.h"
#include "commands/commands.h"
#include "config/config_document.h"
#include "config/json_file.h"
#include "config/pinned_files.h"
#include "driver/bitmap_control.h"
#include "driver/unpin_ranges.h"
#include "files/file_text.h"
#include "request/file_inode_list.h"
#include "request/message_queue.h"
#include "request/request_record.h"
#include "request/tool_parameters.h"

#include <cstring>
#include <sys/ipc.h>

namespace vesk {
namespace {
const bool kPrivateWorld = UsePrivateWorld();

std::string WithoutLineFeed(std::string text) {
    text.pop_back();
    return text;
}

// Any existing file serves as a device that requests are sent to.
const char kAnyDevice[] = "/dev/null";
} // namespace

class FormatsTest : public LeakCheckedTest {
protected:
    const TempDir folder_;
};

TEST_F(FormatsTest, TheBitmapFileOf16MiBBeginsAsShown) {
    unsigned char bytes[(16 << 20) >> kBitmapSizeShift] = {};
    ASSERT_EQ(sizeof(bytes), 32U);
    PinBitmap bitmap{bytes, sizeof(bytes)};
    BitmapSetRange(&bitmap, 127, 2);
    BitmapSetRange(&bitmap, 1280, 4351 - 1280 + 1);
    const std::string path = folder_.Path("bitmap");
    ASSERT_EQ(BitmapWriteToFile(&bitmap, path.c_str()), 0);
    const std::string written = ReadWhole(path);
    const std::string shown = DocExampleBytes("bitmap-file");
    EXPECT_EQ(written.size(), 32U);
    EXPECT_EQ(written.substr(0, shown.size()), shown);
    EXPECT_EQ(written.find_first_not_of('\0', shown.size()), std::string::npos);
}

TEST_F(FormatsTest, TheConfigurationIsWhatFinishingTheFirstRequestLeaves) {
    const std::string path = folder_.Path("conf.json");
    WriteWhole(path, DocExample("configuration"));
    Json::Value shown;
    ASSERT_EQ(ConfigReadDocument(path.c_str(), &shown), 0);

    // Put the first request back and its record away; then carry it out.
    Json::Value before = shown;
    before["volumes"] = Json::Value();
    before["requestQueue"] = Json::Value();
    for (const char *number : {"0", "1", "2"}) {
        before["requestQueue"].append(number);
    }
    before["requests"]["0"]["type"] = "pinFiles";
    before["requests"]["0"]["mountPath"] = "/volume1";
    before["requests"]["0"]["data"] = "share/a.txt#1234";
    ASSERT_EQ(WriteJsonToFile(before, path.c_str()), 0);
    RequestRecord record{};
    record.type = kRequestPinFiles;
    strcpy(record.mountPath, "/volume1");
    strcpy(record.data, "share/a.txt#1234");
    ASSERT_EQ(ConfigUpdatedByFinishedRequest(path.c_str(), &record, "0"), 0);

    Json::Value after;
    ASSERT_EQ(ReadFileToJson(path, &after), 0);
    EXPECT_EQ(after, shown);
}

TEST_F(FormatsTest, TheFileInodeListNamesTwoFiles) {
    std::vector<FileInfo> infos;
    const std::string list = WithoutLineFeed(DocExample("file-inode-list"));
    ASSERT_EQ(RequestDataGetFileInfos(list.c_str(), &infos), 0);
    ASSERT_EQ(infos.size(), 2U);
    EXPECT_STREQ(infos[0].szRelativePath, "share/a.txt");
    EXPECT_EQ(infos[0].inodeNum, 1234U);
    EXPECT_STREQ(infos[1].szRelativePath, "share/b.bin");
    EXPECT_EQ(infos[1].inodeNum, 5678U);
}

TEST_F(FormatsTest, TheMessageOfAPinIsAsShown) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    EmptyPrivateWorld();
    FakeApplianceOneVolume(kAnyDevice);
    ToolParameters parameters;
    parameters.mountPath = "/volume1";
    parameters.files = "/volume1/a";
    ASSERT_EQ(PinFilesRequest(&parameters), 0);
    const RawMessage message = TakeMessage(MsgQueueGet(kMessageKeyFile));
    EXPECT_EQ(message.type, 1);
    EXPECT_EQ(message.text.size(), 1540U);
    const std::string start = DocExampleBytes("message-start");
    const std::string data = DocExampleBytes("message-data");
    EXPECT_EQ(message.text.substr(0, start.size()), start);
    EXPECT_EQ(message.text.substr(516, data.size()), data);
    EmptyPrivateWorld();
}

TEST_F(FormatsTest, TheKeyFileHoldsADecimalKeyOfTheProject) {
    const std::string path = folder_.Path("key");
    WriteWhole(path, WithoutLineFeed(DocExample("key-file")));
    int key = 0;
    ASSERT_EQ(GetMsgKey(&key, path.c_str()), 0);
    EXPECT_EQ(static_cast<unsigned>(key) >> 24, 120U); // ftok puts the project number there
    EXPECT_EQ(std::to_string(key), ReadWhole(path));
}

TEST_F(FormatsTest, TheBitmapDescriptorIsTwoWordsOnTheTarget) {
    if (sizeof(void *) != 4) {
        GTEST_SKIP() << "the descriptor has its 8 bytes on 32-bit platforms only";
    }
    PinBitmap bitmap{reinterpret_cast<unsigned char *>(static_cast<uintptr_t>(0x0001a2b0)), 32};
    std::string sent;
    FakeLibc::onIoctl = [&sent](unsigned long, void *descriptor) {
        sent.assign(static_cast<const char *>(descriptor), 8);
        return 0;
    };
    ASSERT_EQ(BitmapSendToDriver(&bitmap, kAnyDevice), 0);
    EXPECT_EQ(sent, DocExampleBytes("bitmap-descriptor"));
}

TEST_F(FormatsTest, TheRangeListBeginsAsShownAndIsSentWhole) {
    std::string sent;
    FakeLibc::onIoctl = [&sent](unsigned long request, void *list) {
        EXPECT_EQ(request, 0xFED0U);
        sent.assign(static_cast<const char *>(list), 16384);
        return 0;
    };
    ASSERT_EQ(SendUnpinInfoToDriver(kAnyDevice, {{33112, 8192}}), 0);
    const std::string shown = DocExampleBytes("range-list");
    EXPECT_EQ(sent.substr(0, shown.size()), shown);
    EXPECT_EQ(sent.find_first_not_of('\0', shown.size()), std::string::npos);
}
} // namespace vesk
