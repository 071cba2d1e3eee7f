// What the tests of the client commands share: a volume, and an empty private world for the queue.
#pragma once

#include "tests/support/private_world.h"
#include "tests/unit/commands/commands_fixture.h"

#include "request/message_queue.h"
#include "request/request_record.h"
#include "request/tool_parameters.h"

#include <filesystem>

namespace vesk {
class ClientRequestsTest : public CommandsTest {
protected:
    void SetUp() override {
        CommandsTest::SetUp();
        SKIP_WITHOUT_PRIVATE_WORLD();
        EmptyPrivateWorld();
    }
    void TearDown() override {
        CommandsTest::TearDown();
        EmptyPrivateWorld();
    }
    ToolParameters Parameters(const char *files = nullptr) const {
        ToolParameters parameters;
        parameters.mountPath = Volume();
        parameters.files = files;
        return parameters;
    }
    // The one message that waits in the tool's queue.
    static RawMessage OnlyMessage() {
        const int queueId = MsgQueueGet(kMessageKeyFile);
        EXPECT_EQ(CountMessages(queueId), 1);
        return TakeMessage(queueId);
    }
    static void ExpectUntouchedQueue() {
        EXPECT_EQ(CountQueues(), 0);
        EXPECT_FALSE(std::filesystem::exists(kMessageKeyFile));
    }
};
} // namespace vesk
