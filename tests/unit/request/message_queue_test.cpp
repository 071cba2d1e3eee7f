#include "request/message_queue.h"

#include "tests/support/ordinary_user.h"
#include "tests/support/queue_fixture.h"

#include <atomic>
#include <cerrno>
#include <cstddef>
#include <optional>
#include <stdexcept>
#include <sys/ipc.h>
#include <sys/msg.h>
#include <sys/stat.h>
#include <thread>

namespace vesk {
namespace {
const bool kPrivateWorld = UsePrivateWorld();

// A queue at a key of its own, made by root or by an ordinary user, and given to this user then.
int MakeQueue(bool byOrdinaryUser, uid_t owner) {
    const key_t key = 0x5a5a5a5a;
    int id = -1;
    {
        std::optional<OrdinaryUser> user;
        if (byOrdinaryUser) {
            user.emplace();
        }
        id = msgget(key, IPC_CREAT | IPC_EXCL | 0666);
    }
    msqid_ds status{};
    EXPECT_EQ(msgctl(id, IPC_STAT, &status), 0);
    status.msg_perm.uid = owner;
    EXPECT_EQ(msgctl(id, IPC_SET, &status), 0);
    return id;
}
} // namespace

class MessageQueueTest : public QueueTest {};

TEST_F(MessageQueueTest, TheMessageIsAHeaderWordAndTheRecord) {
    EXPECT_STREQ(kMessageKeyFile, "/var/run/veskcachepinfile-msg-server.key");
    EXPECT_EQ(kRequestMessageType, 1);
    EXPECT_EQ(kRequestMessageBytes, 1540U);
    EXPECT_EQ(kMessageQueueRequests, 1024);
    EXPECT_EQ(kMessageQueueBytes, 1576960U);
    EXPECT_EQ(offsetof(RequestMessage, record), sizeof(long));
}

TEST_F(MessageQueueTest, TheFirstProcessCreatesQueueAndKeyFile) {
    CapturedLog log;
    const int queueId = MsgQueueGet(KeyFile());
    ASSERT_NE(queueId, -1);
    EXPECT_EQ(log.Messages(), Messages{});
    EXPECT_EQ(ReadWhole(keyFile_), std::to_string(ftok(KeyFile(), 120)));
    msqid_ds status{};
    ASSERT_EQ(msgctl(queueId, IPC_STAT, &status), 0);
    EXPECT_EQ(status.msg_qbytes, 1576960U);
    EXPECT_EQ(status.msg_perm.mode & 0777, 0644);
    EXPECT_EQ(status.msg_perm.__key, ftok(KeyFile(), 'x'));
    EXPECT_EQ(CountQueues(), 1);
}

TEST_F(MessageQueueTest, TheFirstGetIsLoggedAtLevel2) {
    CapturedLog log(2);
    ASSERT_NE(MsgQueueGet(KeyFile()), -1);
    const int key = ftok(KeyFile(), 120);
    char hex[20];
    snprintf(hex, sizeof(hex), "%x", static_cast<unsigned>(key));
    EXPECT_EQ(log.Messages(),
              (Messages{
                  "MsgQueueGet() [N] : +++++",
                  "MsgCreateExclusive() [N] : +++++",
                  "FileWriteString() [N]: Write to file OK",
                  "MsgCreateExclusive() [N]: Generate message queue key = " + std::to_string(key) +
                      " (0x" + hex + ")",
                  "MsgCreateExclusive() [N]: Set size = 1576960 (num of request = 1024, request "
                  "size = 1540)",
                  "FileWriteString() [N]: Write to file OK",
                  "MsgCreateExclusive() [N] : -----",
                  "MsgQueueGet() [N]: Create message queue by file (" + keyFile_ + ") successfully",
                  "MsgQueueGet() [N] : -----",
              }));
}

TEST_F(MessageQueueTest, TheSecondGetOpensTheSameQueueByTheKeyFile) {
    const int first = MsgQueueGet(KeyFile());
    CapturedLog log(2);
    EXPECT_EQ(MsgQueueGet(KeyFile()), first);
    EXPECT_EQ(CountQueues(), 1);
    const std::string key = std::to_string(ftok(KeyFile(), 120));
    EXPECT_EQ(MessagesOf(log, "MsgQueueGet"),
              (Messages{
                  "MsgQueueGet() [N] : +++++",
                  "MsgQueueGet() [N]: Message queue exist, try to get key",
                  "MsgQueueGet() [N]: Get message queue by id (" + std::to_string(first) +
                      ") successfully",
                  "MsgQueueGet() [N] : -----",
              }));
    EXPECT_TRUE(log.Has("MsgCreateExclusive() [N]: Message queue (key = " + key +
                        ") already exists (error = File exists)"));
    EXPECT_TRUE(log.Has("GetMsgKey() [N]: Get Key = " + key));
}

TEST_F(MessageQueueTest, AQueueThatExistsIsNoError) {
    MsgQueueGet(KeyFile());
    CapturedLog log;
    EXPECT_EQ(MsgCreateExclusive(KeyFile()), -1);
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(MessageQueueTest, AnExistingEmptyKeyFileIsFilled) {
    WriteWhole(keyFile_, "");
    EXPECT_NE(MsgCreateExclusive(KeyFile()), -1);
    EXPECT_EQ(ReadWhole(keyFile_), std::to_string(ftok(KeyFile(), 120)));
}

// The second looks before the first has created the file, and comes to creating it when the key is
// in.
TEST_F(MessageQueueTest, OfTwoAtOnceNeitherEmptiesTheKeyFileOfTheOther) {
    CapturedLog log;
    const int rounds = 300;
    for (int i = 0; i < rounds; ++i) {
        const std::string path = folder_.Path("key" + std::to_string(i));
        std::atomic<int> waiting{2};
        const auto get = [&] {
            --waiting;
            while (waiting > 0) {
            }
            MsgQueueGet(path.c_str());
        };
        std::thread other(get);
        get();
        other.join();
        ASSERT_EQ(ReadWhole(path), std::to_string(ftok(path.c_str(), 'x'))) << i;
        EmptyPrivateWorld();
    }
}

TEST_F(MessageQueueTest, AKeyFileThatCannotBeCreatedFails) {
    const std::string path = folder_.Path("missing/key");
    CapturedLog log;
    EXPECT_EQ(MsgCreateExclusive(path.c_str()), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open file (" + path + ")",
                                  "Create file (" + path + ") failed",
                              }));
    EXPECT_EQ(CountQueues(), 0);
}

TEST_F(MessageQueueTest, WithoutAnyKeyTheGetFails) {
    const std::string path = folder_.Path("missing/key");
    CapturedLog log;
    EXPECT_EQ(MsgQueueGet(path.c_str()), -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open file (" + path + ")",
                                  "Create file (" + path + ") failed",
                                  "Can't open file (" + path + ")",
                                  "Can't get message key from file (" + path + ")",
                                  "Can't open file (" + path + ")",
                                  "Can't get message key from file (" + path + ")",
                                  "Can't open file (" + path + ")",
                                  "Can't get message key from file (" + path + ")",
                                  "Can't find the message queue's key from file (" + path + ")",
                              }));
    EXPECT_EQ(FakeLibc::sleeps, 0);
}

TEST_F(MessageQueueTest, OnlyRootsAndTheCallersOwnQueuesAreUsed) {
    SKIP_WITHOUT_ROOT();
    const uid_t user = 65534;
    const struct {
        bool byOrdinaryUser;
        uid_t owner;
        bool rootUsesIt;
        bool userUsesIt;
    } queues[] = {{false, 0, true, true},
                  {false, user, false, true},
                  {true, 0, false, true},
                  {true, user, false, true},
                  {true, 1234, false, false}};
    for (const auto &queue : queues) {
        EmptyPrivateWorld();
        const int id = MakeQueue(queue.byOrdinaryUser, queue.owner);
        WriteWhole(keyFile_, "");
        // Its key is not the one that the file gives, which is another's already.
        const int taken = msgget(ftok(KeyFile(), 'x'), IPC_CREAT | 0644);
        EXPECT_NE(taken, -1);
        WriteWhole(keyFile_, std::to_string(0x5a5a5a5a));
        CapturedLog log;
        const Messages refused{"Can't open message queue: Operation not permitted"};
        errno = 0;
        EXPECT_EQ(MsgQueueGet(KeyFile()), queue.rootUsesIt ? id : -1);
        EXPECT_EQ(log.Messages(), queue.rootUsesIt ? Messages{} : refused);
        EXPECT_EQ(errno == EPERM, !queue.rootUsesIt);
        chmod(folder_.Path().c_str(), 0755);
        const OrdinaryUser caller;
        EXPECT_EQ(MsgQueueGet(KeyFile()), queue.userUsesIt ? id : -1);
    }
}

TEST_F(MessageQueueTest, AQueueThatCannotBeAskedAboutIsNotUsed) {
    MsgQueueGet(KeyFile());
    FakeLibc::Fail("msgctl", EACCES);
    CapturedLog log;
    EXPECT_EQ(MsgQueueGet(KeyFile()), -1);
    EXPECT_EQ(log.Messages(), Messages{"Can't open message queue: Permission denied"});
}

TEST_F(MessageQueueTest, AKeyThatCannotBeMadeFails) {
    FakeLibc::Fail("ftok", ENOENT);
    CapturedLog log(2);
    EXPECT_EQ(MsgCreateExclusive(KeyFile()), -1);
    EXPECT_EQ(MessagesOf(log, "MsgCreateExclusive"),
              (Messages{
                  "MsgCreateExclusive() [N] : +++++",
                  "MsgCreateExclusive() [N] : ***** Can't get message queue key by file (" +
                      keyFile_ + ")",
                  "MsgCreateExclusive() [N] : -----",
              }));
    EXPECT_EQ(CountQueues(), 0);
}

TEST_F(MessageQueueTest, AnyRefusalToCreateIsOnlyVerbose) {
    FakeLibc::Fail("msgget", ENOSPC);
    CapturedLog log(2);
    EXPECT_EQ(MsgCreateExclusive(KeyFile()), -1);
    EXPECT_TRUE(log.Has(
        "MsgCreateExclusive() [N]: Message queue (key = " + std::to_string(ftok(KeyFile(), 120)) +
        ") already exists (error = No space left on device)"));
}

TEST_F(MessageQueueTest, LimitsThatCannotBeReadOrSetFailAndLeaveTheQueue) {
    FakeLibc::Fail("msgctl", EACCES, 1);
    CapturedLog log;
    EXPECT_EQ(MsgCreateExclusive(KeyFile()), -1);
    EXPECT_EQ(CountQueues(), 1);
    EmptyPrivateWorld();
    FakeLibc::Reset();
    FakeLibc::Fail("msgctl", EPERM, 2);
    EXPECT_EQ(MsgCreateExclusive(KeyFile()), -1);
    FakeLibc::Reset();
    EXPECT_EQ(CountQueues(), 1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't get message queue data structure",
                                  "Can't set message queue size",
                              }));
    EXPECT_EQ(ReadWhole(keyFile_), ""); // the key is written last
}

TEST_F(MessageQueueTest, AKeyThatCannotBeWrittenLeavesTheQueueUsable) {
    CapturedLog log;
    const int queueId = MsgCreateExclusive(folder_.Path().c_str()); // a folder: no text goes in
    EXPECT_NE(queueId, -1);
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Can't open file (" + folder_.Path() + ")",
                                  "Can't write to file (" + folder_.Path() + ")",
                              }));
    EXPECT_EQ(CountMessages(queueId), 0);
}

TEST_F(MessageQueueTest, AnEmptyKeyFileOfAnExistingQueueIsReadThreeTimes) {
    MsgQueueGet(KeyFile());
    WriteWhole(keyFile_, "");
    CapturedLog log;
    EXPECT_EQ(MsgQueueGet(KeyFile()), -1);
    Messages expected;
    for (int i = 0; i < 3; ++i) {
        expected.push_back("Can't get a line from file (" + keyFile_ + ")");
        expected.push_back("Can't get message key from file (" + keyFile_ + ")");
    }
    expected.push_back("Can't find the message queue's key from file (" + keyFile_ + ")");
    EXPECT_EQ(log.Messages(), expected);
    EXPECT_EQ(FakeLibc::sleeps, 0); // without a pause
}

TEST_F(MessageQueueTest, AKeyThatNamesNoQueueFails) {
    MsgQueueGet(KeyFile());
    WriteWhole(keyFile_, "7");
    CapturedLog log(2);
    EXPECT_EQ(MsgQueueGet(KeyFile()), -1);
    EXPECT_TRUE(
        log.Has("MsgQueueGet() [N] : ***** Can't open message queue: No such file or directory"));
    EXPECT_EQ(LastOf(log.Messages()), "MsgQueueGet() [N] : -----");
}

TEST_F(MessageQueueTest, TheKeyIsTheNumberThatTheFirstLineBeginsWith) {
    const std::pair<const char *, int> cases[] = {
        {"1234", 1234},  {"1234\n", 1234},           {"  \t1234", 1234}, {"12ab", 12},
        {"-5\n7\n", -5}, {"2147483647", 2147483647}, {"+3", 3},          {"12\n99", 12},
    };
    for (const auto &[text, expected] : cases) {
        WriteWhole(keyFile_, text);
        int key = 0;
        EXPECT_EQ(GetMsgKey(&key, KeyFile()), 0) << text;
        EXPECT_EQ(key, expected) << text;
    }
}

TEST_F(MessageQueueTest, AKeyFileThatCannotBeReadGivesNoKey) {
    int key = 99;
    CapturedLog log(2);
    EXPECT_EQ(GetMsgKey(&key, KeyFile()), -1);
    EXPECT_EQ(key, 99);
    EXPECT_FALSE(std::filesystem::exists(keyFile_));
    EXPECT_EQ(
        MessagesOf(log, "GetMsgKey"),
        Messages{"GetMsgKey() [N] : ***** Can't get message key from file (" + keyFile_ + ")"});
}

TEST_F(MessageQueueTest, AKeyFileWithoutANumberThrows) {
    int key = 0;
    for (const char *text : {"abc", "\n12", "x1", "-", " "}) {
        WriteWhole(keyFile_, text);
        EXPECT_THROW(GetMsgKey(&key, KeyFile()), std::invalid_argument) << text;
    }
    WriteWhole(keyFile_, "2147483648");
    EXPECT_THROW(GetMsgKey(&key, KeyFile()), std::out_of_range);
}

TEST_F(MessageQueueTest, NothingOnTheWayCatchesWhatAKeyFileWithoutANumberThrows) {
    MsgQueueGet(KeyFile());
    WriteWhole(keyFile_, "abc");
    EXPECT_THROW(MsgQueueGet(KeyFile()), std::invalid_argument);
}
} // namespace vesk
