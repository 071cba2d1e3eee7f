#include "driver/bitmap_control.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"

#include <cstring>
#include <gtest/gtest.h>

namespace vesk {
namespace {
using Messages = std::vector<std::string>;

const char kDevice[] = "/dev/null"; // can be opened; what it is asked is answered by the test

class BitmapControlTest : public LeakCheckedTest {
protected:
    // Answers this request and fills the 32-bit word behind it.
    static void Answer(unsigned long expected, int word, int result = 0) {
        FakeLibc::onIoctl = [=](unsigned long request, void *data) {
            EXPECT_EQ(request, expected);
            memcpy(data, &word, sizeof(word));
            return result;
        };
    }
    static void Refuse() {
        FakeLibc::onIoctl = [](unsigned long, void *) { return -1; };
    }
    static void ExpectNoRequest() {
        FakeLibc::onIoctl = [](unsigned long, void *) { return ADD_FAILURE() << "a request", 0; };
    }
    unsigned char bytes[4] = {0x01, 0x80, 0xFF, 0x00};
    PinBitmap bitmap = {bytes, sizeof(bytes)};
};
} // namespace

TEST_F(BitmapControlTest, SendHandsOverTheRecordItself) {
    CapturedLog log;
    int calls = 0;
    FakeLibc::onIoctl = [&](unsigned long request, void *data) {
        ++calls;
        EXPECT_EQ(request, 0xFECFUL);
        EXPECT_EQ(data, &bitmap);
        return 0;
    };
    EXPECT_EQ(BitmapSendToDriver(&bitmap, kDevice), 0);
    EXPECT_EQ(calls, 1);
    EXPECT_EQ(log.Text(), "");
}

TEST_F(BitmapControlTest, DescriptorIsTheBytesAddressAndTheirCount) {
    CapturedLog log;
    FakeLibc::onIoctl = [&](unsigned long, void *data) {
        const unsigned char *address = nullptr;
        uint32_t length = 0;
        memcpy(&address, data, sizeof(address));
        memcpy(&length, static_cast<const char *>(data) + sizeof(address), sizeof(length));
        EXPECT_EQ(address, bytes);
        EXPECT_EQ(length, 4U);
        return 0;
    };
    EXPECT_EQ(BitmapSendToDriver(&bitmap, kDevice), 0);
}

TEST_F(BitmapControlTest, SendRefusesMissingArguments) {
    ExpectNoRequest();
    CapturedLog log(2);
    EXPECT_EQ(BitmapSendToDriver(nullptr, kDevice), -1);
    EXPECT_EQ(BitmapSendToDriver(&bitmap, nullptr), -1);
    const Messages once = {"BitmapSendToDriver() [N] : +++++",
                           "BitmapSendToDriver() [N] : ***** Incorrect parameter",
                           "BitmapSendToDriver() [N] : -----"};
    Messages twice = once;
    twice.insert(twice.end(), once.begin(), once.end());
    EXPECT_EQ(log.Messages(), twice);
}

TEST_F(BitmapControlTest, SendFailsWhenTheDriverRefuses) {
    Refuse();
    CapturedLog log;
    EXPECT_EQ(BitmapSendToDriver(&bitmap, kDevice), -1);
    char expected[200];
    snprintf(expected, sizeof(expected),
             "Ioctl Error: Send ioctl 65231 Data (%p) size (8) to /dev/null, ret=-1",
             static_cast<void *>(&bitmap));
    EXPECT_EQ(log.Messages(), (Messages{expected, "", "Ioctl error"}));
}

TEST_F(BitmapControlTest, SendIsTracedAtLevel2) {
    FakeLibc::onIoctl = [](unsigned long, void *) { return 0; };
    CapturedLog log(2);
    EXPECT_EQ(BitmapSendToDriver(&bitmap, kDevice), 0);
    EXPECT_EQ(log.Messages(),
              (Messages{"BitmapSendToDriver() [N] : +++++", "DoIoctl() [N] : +++++",
                        "DoIoctl() [N] : -----", "BitmapSendToDriver() [N] : -----"}));
}

TEST_F(BitmapControlTest, IsSetGivesTheDriversWord) {
    for (const int word : {0, 1, -5}) {
        Answer(0x8004FECF, word);
        CapturedLog log;
        int isSet = 9;
        EXPECT_EQ(BitmapIsSet(kDevice, &isSet), 0);
        EXPECT_EQ(isSet, word);
        EXPECT_EQ(log.Text(), "");
    }
}

TEST_F(BitmapControlTest, IsSetTellsTheWordAtLevel2WithoutATraceOfItsOwn) {
    Answer(0x8004FECF, 1);
    CapturedLog log(2);
    int isSet = 0;
    EXPECT_EQ(BitmapIsSet(kDevice, &isSet), 0);
    EXPECT_EQ(log.Messages(), (Messages{"DoIoctl() [N] : +++++", "DoIoctl() [N] : -----",
                                        "BitmapIsSet() [N]: Bitmap is set = 1"}));
}

TEST_F(BitmapControlTest, IsSetFailsWhenTheDriverRefuses) {
    Refuse();
    CapturedLog log(2);
    int isSet = 0;
    EXPECT_EQ(BitmapIsSet(kDevice, &isSet), -1);
    char expected[200];
    snprintf(expected, sizeof(expected),
             "DoIoctl() [N] : ***** Ioctl Error: Send ioctl -2147156273 Data (%p) size (4) to "
             "/dev/null, ret=-1",
             static_cast<void *>(&isSet));
    EXPECT_EQ(log.Messages(),
              (Messages{"DoIoctl() [N] : +++++", expected, "", "DoIoctl() [N] : -----",
                        "BitmapIsSet() [N] : ***** Ioctl error"}));
}

TEST_F(BitmapControlTest, IsSetFailsOnADeviceThatIsMissing) {
    ExpectNoRequest();
    CapturedLog log;
    int isSet = 0;
    EXPECT_EQ(BitmapIsSet("/no/such", &isSet), -1);
    EXPECT_EQ(log.Messages(), (Messages{"Open device path (/no/such) error", "", "Ioctl error"}));
}

TEST_F(BitmapControlTest, AllUnpinnedGivesTheDriversWord) {
    for (const int word : {0, 1, 2}) {
        Answer(0x8004FED2, word, word); // an answer above 0 is success, too
        CapturedLog log;
        int allUnpinned = 9;
        EXPECT_EQ(isAllBlocksUnpin(kDevice, &allUnpinned), 0);
        EXPECT_EQ(allUnpinned, word);
        EXPECT_EQ(log.Text(), "");
    }
}

TEST_F(BitmapControlTest, AllUnpinnedTellsPathAndWordAtLevel2) {
    Answer(0x8004FED2, 1);
    CapturedLog log(2);
    int allUnpinned = 0;
    EXPECT_EQ(isAllBlocksUnpin(kDevice, &allUnpinned), 0);
    EXPECT_EQ(log.Messages(),
              (Messages{"isAllBlocksUnpin() [N] : +++++",
                        "isAllBlocksUnpin() [N]: Cache path = /dev/null", "DoIoctl() [N] : +++++",
                        "DoIoctl() [N] : -----", "isAllBlocksUnpin() [N]: Is all block unpin = 1",
                        "isAllBlocksUnpin() [N] : -----"}));
}

TEST_F(BitmapControlTest, AllUnpinnedFailsWhenTheDriverRefuses) {
    Refuse();
    CapturedLog log(2);
    int allUnpinned = 0;
    EXPECT_EQ(isAllBlocksUnpin(kDevice, &allUnpinned), -1);
    const Messages messages = log.Messages();
    EXPECT_EQ(messages.at(messages.size() - 2), "isAllBlocksUnpin() [N] : ***** Ioctl error");
    EXPECT_EQ(LastOf(messages), "isAllBlocksUnpin() [N] : -----");
}
} // namespace vesk
