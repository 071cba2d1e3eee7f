#include "service/receiver.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/messages_of.h"
#include "tests/support/private_world.h"

#include <cstring>

namespace vesk {
namespace {
int Check(int type, const std::string &mountPath, const std::string &data) {
    RequestMessage message{};
    const std::string bytes = RecordBytes(type, mountPath, data);
    memcpy(&message.record, bytes.data(), bytes.size());
    return CheckNormalMsg(&message);
}
} // namespace

class MessageCheckTest : public LeakCheckedTest {};

TEST_F(MessageCheckTest, CompleteRequestsPass) {
    CapturedLog log(2);
    EXPECT_EQ(Check(1, "/volume1", "/volume1/a"), 0);
    EXPECT_EQ(Check(2, "/volume1", "/volume1/a"), 0);
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(MessageCheckTest, OtherTypesNeedNoFiles) {
    for (const int type : {0, 3, 4, 5, 6, 7, -1, 2147483647}) {
        EXPECT_EQ(Check(type, "/volume1", ""), 0) << type;
    }
}

TEST_F(MessageCheckTest, AnEmptyMountPathIsCalledAMissingUUID) {
    for (const int type : {0, 1, 2, 3, 6}) {
        CapturedLog log;
        EXPECT_EQ(Check(type, "", ""), -1) << type;
        EXPECT_EQ(log.Messages(), Messages{"Space UUID is not set"}) << type;
    }
    CapturedLog log(2);
    EXPECT_EQ(Check(1, "", "/volume1/a"), -1);
    EXPECT_EQ(log.Messages(), Messages{"CheckNormalMsg() [N] : ***** Space UUID is not set"});
}

TEST_F(MessageCheckTest, PinAndUnpinNeedFiles) {
    for (const int type : {1, 2}) {
        CapturedLog log;
        EXPECT_EQ(Check(type, "/volume1", ""), -1) << type;
        EXPECT_EQ(log.Messages(), Messages{"Should provide file paths"}) << type;
    }
    CapturedLog log(2);
    EXPECT_EQ(Check(2, "/volume1", ""), -1);
    EXPECT_EQ(log.Messages(), Messages{"CheckNormalMsg() [N] : ***** Should provide file paths"});
}
} // namespace vesk
