#include "act/service_talk.h"

#include "tests/support/fake_proc.h"
#include "tests/support/look_fixture.h"
#include "tests/support/private_world.h"

#include "request/message_queue.h"

#include <csignal>
#include <sys/wait.h>

namespace vesk {
namespace {
const bool kPrivateWorld = UsePrivateWorld();
const pid_t kPid = getpid(); // who takes a message here is the service

class ServiceTalkTest : public LookTest {
protected:
    void SetUp() override {
        LookTest::SetUp();
        WriteWhole(config_, "{}");
        proc_.AddService(kPid, Serving(config_));
    }
    static Arguments Serving(const std::string &config) {
        return {"tool", "-c", "--config-path", config};
    }
    void PutReceiver(const std::string &wchan, uint64_t sleeps, char state = 'S',
                     uint64_t startTicks = 100) const {
        proc_.AddThread(kPid, {kPid, "veskcachepinfil", state, wchan, "0 0x0", startTicks, sleeps},
                        Serving(config_));
    }
    RequestBatch Batch() const {
        RequestBatch batch{"/volume1", kRequestUnpinFiles, {}, {}};
        EXPECT_TRUE(BatchAdd(&batch, {"a", 11, 1, 1, 128}));
        return batch;
    }
    const FakeProc proc_;
    const TempDir folder_;
    const std::string config_ = folder_.Path("pins.json");
    ServiceTalk talk_{config_, proc_.Path()};
};
} // namespace

TEST_F(ServiceTalkTest, AReceiverThatWaitsTakes) {
    EXPECT_EQ(talk_.Look(), TalkState::Takes);
    PutReceiver("do_fsync", 8);
    EXPECT_EQ(talk_.Look(), TalkState::Busy);
}

TEST_F(ServiceTalkTest, AServiceOfAnotherConfigurationOrNamespaceIsNone) {
    ServiceTalk other(folder_.Path("other.json"), proc_.Path());
    EXPECT_EQ(other.Look(), TalkState::Absent);
    const std::string pid = std::to_string(kPid);
    proc_.Link(pid + "/task/" + pid + "/ns/ipc", "ipc:[2]");
    EXPECT_EQ(talk_.Look(), TalkState::Absent);
}

TEST_F(ServiceTalkTest, TheConfigurationIsKnownByEveryPathToIt) {
    proc_.AddService(kPid, Serving(folder_.Path() + "/./pins.json"));
    EXPECT_EQ(talk_.Look(), TalkState::Takes);
}

TEST_F(ServiceTalkTest, OneThatHasEndedIsToldHoweverItEnds) {
    ASSERT_EQ(talk_.Look(), TalkState::Takes);
    PutReceiver("0", 8, 'Z');
    EXPECT_EQ(talk_.Look(), TalkState::Ended);
    PutReceiver("do_msgrcv", 8);
    EXPECT_EQ(talk_.Look(), TalkState::Takes);
    proc_.AddThread(kPid, {kPid + 1, "worker", 'Z'}, Serving(config_));
    EXPECT_EQ(talk_.Look(), TalkState::Ended);
    proc_.AddService(kPid, Serving(config_));
    PutReceiver("do_msgrcv", 8, 'S', 101); // another process of this number
    EXPECT_EQ(talk_.Look(), TalkState::Ended);
    talk_.Forget();
    EXPECT_EQ(talk_.Look(), TalkState::Takes);
    std::filesystem::remove_all(proc_.Path(std::to_string(kPid)));
    EXPECT_EQ(talk_.Look(), TalkState::Ended);
    talk_.Forget();
    EXPECT_EQ(talk_.Look(), TalkState::Absent);
}

TEST_F(ServiceTalkTest, AfterARequestItTakesTheNextWhenItHasSleptAnew) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    EmptyPrivateWorld();
    const int queue = MsgQueueGet(kMessageKeyFile);
    ASSERT_EQ(talk_.AwaitTurn(Deadline(std::nullopt)), TalkEnd::Done);
    ASSERT_EQ(talk_.Send(Batch()), TalkEnd::Done);
    EXPECT_EQ(talk_.Look(), TalkState::Busy);
    EXPECT_EQ(TakeMessage(queue).text, RecordBytes(kRequestUnpinFiles, "/volume1", "/volume1/a"));
    // The message is handed over before the thread runs, which seems to wait for it still.
    EXPECT_EQ(talk_.Look(), TalkState::Busy);
    EXPECT_EQ(talk_.AwaitTurn(Deadline(0)), TalkEnd::TimeOver);
    PutReceiver("do_fsync", 8);
    EXPECT_EQ(talk_.Look(), TalkState::Busy);
    PutReceiver("do_msgrcv", 9);
    EXPECT_EQ(talk_.Look(), TalkState::Takes);
    EmptyPrivateWorld();
}

TEST_F(ServiceTalkTest, ARequestThatSomebodyElseTakesIsNotWaitedFor) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    EmptyPrivateWorld();
    const int queue = MsgQueueGet(kMessageKeyFile);
    ASSERT_EQ(talk_.AwaitTurn(Deadline(std::nullopt)), TalkEnd::Done);
    ASSERT_EQ(talk_.Send(Batch()), TalkEnd::Done);
    const pid_t other = fork();
    if (other == 0) {
        RequestMessage message{};
        _exit(msgrcv(queue, &message, kRequestMessageBytes, 0, IPC_NOWAIT) > 0 ? 0 : 1);
    }
    int status = -1;
    ASSERT_EQ(waitpid(other, &status, 0), other);
    ASSERT_EQ(status, 0);
    EXPECT_EQ(talk_.Look(), TalkState::Taken);
    EXPECT_EQ(talk_.AwaitTurn(Deadline(std::nullopt)), TalkEnd::Taken);
    EmptyPrivateWorld();
}

TEST_F(ServiceTalkTest, OneThatLivesIsFoundBesideOneThatHasEnded) {
    const pid_t next = kPid + 1000;
    PutReceiver("0", 8, 'Z');
    ASSERT_EQ(ServiceTalk(config_, proc_.Path()).Look(), TalkState::Ended);
    proc_.AddService(next, Serving(config_));
    EXPECT_EQ(talk_.Look(), TalkState::Takes);
}

TEST_F(ServiceTalkTest, ADocumentThatIsNotThereYetIsKnownByItsFolder) {
    std::filesystem::remove(config_);
    ServiceTalk talk(folder_.Path() + "/../" + folder_.Path().substr(folder_.Path().rfind('/')) +
                         "/pins.json",
                     proc_.Path());
    EXPECT_EQ(talk.Look(), TalkState::Takes);
}

TEST_F(ServiceTalkTest, WithoutAQueueNothingIsSent) {
    SKIP_WITHOUT_PRIVATE_WORLD();
    EmptyPrivateWorld();
    ASSERT_EQ(talk_.Look(), TalkState::Takes);
    EXPECT_EQ(talk_.Send(Batch()), TalkEnd::NotSent);
    EXPECT_EQ(talk_.Trouble(), "the service's queue cannot be found");
    EXPECT_EQ(CountQueues(), 0);
}
} // namespace vesk
