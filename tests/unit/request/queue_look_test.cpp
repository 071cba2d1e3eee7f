#include "request/message_queue.h"

#include "tests/support/ordinary_user.h"
#include "tests/support/queue_fixture.h"

#include <cerrno>
#include <sys/ipc.h>
#include <sys/msg.h>
#include <sys/stat.h>

namespace vesk {
namespace {
const key_t kKey = 0x5a5a5a5a;
const uid_t kUser = 65534;

class MessageQueueLookTest : public QueueTest {
protected:
    void SetUp() override {
        QueueTest::SetUp();
        if (!IsSkipped()) {
            chmod(folder_.Path().c_str(), 0755);
            WriteWhole(keyFile_, std::to_string(kKey));
        }
    }
    MsgQueueCause Look() {
        state_ = {1, 2, 3, 4, 5, 6}; // of another queue
        return MsgQueueLook(KeyFile(), &state_);
    }
    static int Make(int mode) { return msgget(kKey, IPC_CREAT | IPC_EXCL | mode); }
    static void GiveTo(int id, uid_t owner) {
        msqid_ds status{};
        EXPECT_EQ(msgctl(id, IPC_STAT, &status), 0);
        status.msg_perm.uid = owner;
        EXPECT_EQ(msgctl(id, IPC_SET, &status), 0);
    }
    void ExpectState(int key, int id, uid_t owner, uint64_t messages, uint64_t bytes) const {
        EXPECT_EQ(state_.key, key);
        EXPECT_EQ(state_.id, id);
        EXPECT_EQ(state_.owner, owner);
        EXPECT_EQ(state_.messages, messages);
        EXPECT_EQ(state_.bytes, bytes);
    }
    MsgQueueState state_{};
};
} // namespace

TEST_F(MessageQueueLookTest, ATrustedQueueIsFoundAndItsMessagesStay) {
    const int id = Make(0644);
    ASSERT_TRUE(PutMessage(id, 1, "abc"));
    ASSERT_TRUE(PutMessage(id, 3, "defgh"));
    CapturedLog log;
    EXPECT_EQ(Look(), MsgQueueCause::Found);
    ExpectState(kKey, id, 0, 2, 8);
    msqid_ds status{};
    ASSERT_EQ(msgctl(id, IPC_STAT, &status), 0);
    EXPECT_EQ(state_.maxBytes, status.msg_qbytes);
    EXPECT_EQ(status.msg_stime == 0, false);
    EXPECT_EQ(status.msg_rtime, 0);
    EXPECT_EQ(CountMessages(id), 2);
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(MessageQueueLookTest, WithoutAKeyFileNothingIsMade) {
    unlink(KeyFile());
    CapturedLog log;
    EXPECT_EQ(Look(), MsgQueueCause::NoKeyFile);
    ExpectState(0, 0, 0, 0, 0);
    EXPECT_FALSE(std::filesystem::exists(keyFile_));
    EXPECT_EQ(CountQueues(), 0);
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(MessageQueueLookTest, AKeyFileWithoutAKeyHasNone) {
    CapturedLog log;
    for (const char *text : {"abc", " ", "-", "2147483648"}) {
        WriteWhole(keyFile_, text);
        EXPECT_EQ(Look(), MsgQueueCause::NoKey) << text;
    }
    EXPECT_EQ(log.Messages(), Messages{});
    WriteWhole(keyFile_, "");
    EXPECT_EQ(Look(), MsgQueueCause::NoKey);
    EXPECT_EQ(log.Messages(), (Messages{"Can't get a line from file (" + keyFile_ + ")",
                                        "Can't get message key from file (" + keyFile_ + ")"}));
    EXPECT_EQ(CountQueues(), 0);
}

TEST_F(MessageQueueLookTest, AKeyWithoutAQueueHasNoneAndGetsNone) {
    EXPECT_EQ(Look(), MsgQueueCause::NoQueue);
    EXPECT_EQ(state_.key, kKey);
    EXPECT_EQ(state_.id, -1);
    EXPECT_EQ(CountQueues(), 0);
}

// With this key the kernel makes a new queue for everybody who asks.
TEST_F(MessageQueueLookTest, TheKeyZeroNamesNoQueueAndMakesNone) {
    WriteWhole(keyFile_, "0");
    EXPECT_EQ(Look(), MsgQueueCause::NoQueue);
    EXPECT_EQ(state_.id, -1);
    EXPECT_EQ(CountQueues(), 0);
}

TEST_F(MessageQueueLookTest, AQueueThatMayNotBeLookedAtIsNotTakenForNone) {
    SKIP_WITHOUT_ROOT();
    const int id = Make(0600);
    {
        const OrdinaryUser user;
        EXPECT_EQ(Look(), MsgQueueCause::NotAllowed);
    }
    ASSERT_EQ(Look(), MsgQueueCause::Found);
    FakeLibc::Fail("msgctl", EACCES);
    EXPECT_EQ(Look(), MsgQueueCause::NotAllowed);
    ExpectState(kKey, id, 0, 0, 0);
}

TEST_F(MessageQueueLookTest, AQueueThatIsRemovedMeanwhileIsNone) {
    Make(0644);
    FakeLibc::Fail("msgctl", EIDRM);
    EXPECT_EQ(Look(), MsgQueueCause::NoQueue);
    FakeLibc::Fail("msgctl", EINVAL);
    EXPECT_EQ(Look(), MsgQueueCause::NoQueue);
}

TEST_F(MessageQueueLookTest, AQueueThatSomebodyElseMadeOrOwnsIsForeign) {
    SKIP_WITHOUT_ROOT();
    const struct {
        bool byUser;
        uid_t owner;
        MsgQueueCause forRoot;
        MsgQueueCause forUser;
    } queues[] = {
        {false, 0, MsgQueueCause::Found, MsgQueueCause::Found},
        {false, kUser, MsgQueueCause::Foreign, MsgQueueCause::Found},
        {true, 0, MsgQueueCause::Foreign, MsgQueueCause::Found},
        {true, 1234, MsgQueueCause::Foreign, MsgQueueCause::Foreign},
    };
    for (const auto &queue : queues) {
        EmptyPrivateWorld();
        int id = -1;
        if (queue.byUser) {
            const OrdinaryUser user;
            id = Make(0666);
        } else {
            id = Make(0666);
        }
        GiveTo(id, queue.owner);
        ASSERT_TRUE(PutMessage(id, 1, "abc"));
        EXPECT_EQ(Look(), queue.forRoot);
        ExpectState(kKey, id, queue.owner, 1, 3);
        EXPECT_GT(state_.maxBytes, 0U);
        const OrdinaryUser user;
        EXPECT_EQ(Look(), queue.forUser);
        ExpectState(kKey, id, queue.owner, 1, 3);
    }
}
} // namespace vesk
