#include "model/service_look.h"

#include "tests/support/look_fixture.h"
#include "tests/support/ordinary_user.h"
#include "tests/support/private_world.h"

#include <sys/msg.h>
#include <sys/stat.h>

namespace vesk {
namespace {
const bool kPrivateWorld = UsePrivateWorld();

class QueueLookTest : public LookTest {
protected:
    void SetUp() override {
        LookTest::SetUp();
        SKIP_WITHOUT_PRIVATE_WORLD();
        EmptyPrivateWorld();
    }
    void TearDown() override {
        LookTest::TearDown();
        EmptyPrivateWorld();
    }
    Queue Look() {
        errors_ = {};
        return QueueLook(&errors_, keyFile_.c_str());
    }
    const TempDir folder_;
    const std::string keyFile_ = folder_.Path("key");
    LookErrors errors_;
};
} // namespace

TEST_F(QueueLookTest, AQueueIsShownWithItsMessages) {
    const int id = MsgQueueGet(keyFile_.c_str());
    ASSERT_TRUE(PutMessage(id, 1, std::string(1540, 'x')));
    ASSERT_TRUE(PutMessage(id, 1, "abc"));
    const Queue queue = Look();
    EXPECT_EQ(queue.cause, MsgQueueCause::Found);
    EXPECT_EQ(queue.state.id, id);
    EXPECT_EQ(queue.state.messages, 2U);
    EXPECT_EQ(queue.state.bytes, 1543U);
    EXPECT_EQ(queue.state.owner, 0U);
    EXPECT_EQ(TextsOf(errors_), Texts{});
    EXPECT_EQ(CountMessages(id), 2);
}

TEST_F(QueueLookTest, NoKeyFileIsNoErrorAndIsNotMade) {
    EXPECT_EQ(Look().cause, MsgQueueCause::NoKeyFile);
    EXPECT_EQ(TextsOf(errors_), Texts{});
    EXPECT_EQ(ReadWhole(keyFile_), "");
    EXPECT_EQ(CountQueues(), 0);
}

TEST_F(QueueLookTest, AKeyFileWithoutAKeyIsToldWithItsCause) {
    WriteWhole(keyFile_, "");
    EXPECT_EQ(Look().cause, MsgQueueCause::NoKey);
    EXPECT_EQ(TextsOf(errors_), Texts{keyFile_ + ": Can't get a line from file (" + keyFile_ +
                                      "): Can't get message key from file (" + keyFile_ + ")"});
    WriteWhole(keyFile_, "no number");
    EXPECT_EQ(Look().cause, MsgQueueCause::NoKey);
    EXPECT_EQ(TextsOf(errors_), Texts{keyFile_ + ": it holds no key"});
}

TEST_F(QueueLookTest, AKeyWithoutAQueueIsTold) {
    WriteWhole(keyFile_, "12345");
    EXPECT_EQ(Look().cause, MsgQueueCause::NoQueue);
    EXPECT_EQ(TextsOf(errors_), Texts{keyFile_ + ": there is no queue of its key"});
    EXPECT_EQ(CountQueues(), 0);
}

TEST_F(QueueLookTest, WhoMayNotLookDoesNotKnow) {
    SKIP_WITHOUT_ROOT();
    ASSERT_NE(msgget(0x5a5a5a5a, IPC_CREAT | IPC_EXCL | 0600), -1);
    WriteWhole(keyFile_, std::to_string(0x5a5a5a5a));
    chmod(folder_.Path().c_str(), 0755);
    const OrdinaryUser user;
    EXPECT_EQ(Look().cause, MsgQueueCause::NotAllowed);
    EXPECT_EQ(TextsOf(errors_),
              (Texts{keyFile_ + ": no permission to look at the queue", "unknown"}));
}

TEST_F(QueueLookTest, SomebodyElsesQueueIsShownAndToldOf) {
    SKIP_WITHOUT_ROOT();
    int id = -1;
    {
        const OrdinaryUser user;
        id = msgget(0x5a5a5a5a, IPC_CREAT | IPC_EXCL | 0666);
    }
    ASSERT_TRUE(PutMessage(id, 1, "abc"));
    WriteWhole(keyFile_, std::to_string(0x5a5a5a5a));
    const Queue queue = Look();
    EXPECT_EQ(queue.cause, MsgQueueCause::Foreign);
    EXPECT_EQ(queue.state.owner, 65534U);
    EXPECT_EQ(queue.state.messages, 1U);
    EXPECT_EQ(TextsOf(errors_),
              Texts{keyFile_ + ": the queue belongs to user 65534 and is refused by service and "
                               "clients"});
}
} // namespace vesk
