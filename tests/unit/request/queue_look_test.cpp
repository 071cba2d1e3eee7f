#include "request/queue_look.h"

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
        state_ = {1, 2, 3, 4, 5, 6, 7}; // of another queue
        return MsgQueueLook(KeyFile(), &state_);
    }
    static int Make(int mode) { return msgget(kKey, IPC_CREAT | IPC_EXCL | mode); }
    static void GiveTo(int id, uid_t owner) {
        msqid_ds status{};
        EXPECT_EQ(msgctl(id, IPC_STAT, &status), 0);
        status.msg_perm.uid = owner;
        EXPECT_EQ(msgctl(id, IPC_SET, &status), 0);
    }
    // What waits in the queue that was found, each record as its log line.
    Messages Copied() {
        std::vector<RequestRecord> records;
        EXPECT_EQ(MsgQueueCopy(state_, &records), 0);
        Messages texts(records.size());
        for (size_t i = 0; i < records.size(); ++i) {
            RequestToString(&texts[i], &records[i]);
        }
        return texts;
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

TEST_F(MessageQueueLookTest, RequestsAreCopiedInTheirOrderAndStay) {
    const int id = Make(0644);
    ASSERT_TRUE(PutMessage(id, 1, RecordBytes(kRequestPinFiles, "/volume1", "/volume1/a")));
    ASSERT_TRUE(PutMessage(id, 1, RecordBytes(kRequestUnpinFiles, "/volume2", "/volume2/b;c")));
    ASSERT_EQ(Look(), MsgQueueCause::Found);
    EXPECT_EQ(Copied(), (Messages{"Request type=pinFiles mountPath=/volume1 data=/volume1/a",
                                  "Request type=unpinFiles mountPath=/volume2 data=/volume2/b;c"}));
    EXPECT_EQ(CountMessages(id), 2);
}

// Of other types and of lengths that no request has: the receiver takes none, or ends by it.
TEST_F(MessageQueueLookTest, WhatIsNoRequestIsNotCopied) {
    const int id = Make(0644);
    ASSERT_TRUE(PutMessage(id, 2, RecordBytes(kRequestPinFiles, "/volume1", "/volume1/a")));
    ASSERT_TRUE(PutMessage(id, 1, std::string(kRequestMessageBytes + 1, 'x')));
    ASSERT_TRUE(PutMessage(id, 1, RecordBytes(kRequestPinFiles, "/volume1", "/volume1/b")));
    ASSERT_EQ(Look(), MsgQueueCause::Found);
    EXPECT_EQ(Copied(), Messages{"Request type=pinFiles mountPath=/volume1 data=/volume1/b"});
    EXPECT_EQ(CountMessages(id), 3);
}

TEST_F(MessageQueueLookTest, TheTextsOfACopiedRecordEndInsideTheirFields) {
    const int id = Make(0644);
    std::string bytes = RecordBytes(kRequestPinFiles, "", "");
    bytes.replace(4, std::string::npos, bytes.size() - 4, 'x');
    ASSERT_TRUE(PutMessage(id, 1, bytes));
    ASSERT_TRUE(PutMessage(id, 1, bytes.substr(0, 10)));
    ASSERT_EQ(Look(), MsgQueueCause::Found);
    std::vector<RequestRecord> records;
    ASSERT_EQ(MsgQueueCopy(state_, &records), 0);
    ASSERT_EQ(records.size(), 2U);
    EXPECT_EQ(records[0].mountPath, std::string(kRequestMountPathBytes - 1, 'x'));
    EXPECT_EQ(records[0].data, std::string(kRequestDataBytes - 1, 'x'));
    EXPECT_EQ(records[1].mountPath, std::string("xxxxxx"));
    EXPECT_EQ(records[1].data, std::string());
}

TEST_F(MessageQueueLookTest, WhatIsTakenMeanwhileIsCopiedAllTheSame) {
    const int id = Make(0644);
    for (const char *path : {"/v/a", "/v/b", "/v/c"}) {
        ASSERT_TRUE(PutMessage(id, 1, RecordBytes(kRequestPinFiles, "/v", path)));
    }
    ASSERT_EQ(Look(), MsgQueueCause::Found);
    TakeMessage(id);
    EXPECT_EQ(Copied(), (Messages{"Request type=pinFiles mountPath=/v data=/v/b",
                                  "Request type=pinFiles mountPath=/v data=/v/c"}));
    EXPECT_EQ(CountMessages(id), 2);
}

TEST_F(MessageQueueLookTest, AQueueThatIsGoneHasNothingToCopy) {
    const int id = Make(0644);
    ASSERT_TRUE(PutMessage(id, 1, RecordBytes(kRequestPinFiles, "/volume1", "/volume1/a")));
    ASSERT_EQ(Look(), MsgQueueCause::Found);
    EmptyPrivateWorld();
    std::vector<RequestRecord> records;
    EXPECT_EQ(MsgQueueCopy(state_, &records), -1);
    EXPECT_EQ(records.size(), 0U);
}
} // namespace vesk
