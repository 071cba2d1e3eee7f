#include "service/start_service.h"

#include "tests/support/private_world.h"
#include "tests/unit/service/child_process.h"
#include "tests/unit/service/handler_fixture.h"

#include "files/path.h"
#include "request/message_queue.h"
#include "request/tool_parameters.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <pthread.h>
#include <sys/ipc.h>
#include <sys/msg.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <thread>
#include <unistd.h>

namespace vesk {
namespace fs = std::filesystem;

// The whole service in a process of its own.
class StartServiceTest : public HandlerTest {
protected:
    void SetUp() override {
        HandlerTest::SetUp();
        if (IsSkipped()) {
            return;
        }
        SKIP_WITHOUT_PRIVATE_WORLD();
        EmptyPrivateWorld();
        queueId_ = MsgQueueGet(kMessageKeyFile);
    }
    void TearDown() override {
        HandlerTest::TearDown();
        EmptyPrivateWorld();
    }
    std::function<int()> Service(const std::function<void()> &before = {}) const {
        return [this, before] {
            if (before) {
                before();
            }
            static ToolParameters parameters; // outlives the thread that starts the service
            parameters.configPath = config_.c_str();
            return StartService(&parameters) == -1 ? 42 : 43;
        };
    }
    void Send(int type, const std::string &mountPath, const std::string &data = "") const {
        ASSERT_TRUE(PutMessage(queueId_, 1, RecordBytes(type, mountPath, data)));
    }
    bool AwaitConfig(const std::string &part) const {
        return ChildProcess::Await(
            [&] { return ReadWhole(config_).find(part) != std::string::npos; });
    }
    static Messages Of(const Messages &all, const std::string &function) {
        Messages messages;
        for (const std::string &message : all) {
            if (message.rfind(function + "() [N]", 0) == 0) {
                messages.push_back(message);
            }
        }
        return messages;
    }
    // The worker holds the lock in choosing a request until the file is there. The clock by which
    // the ending thread waits for the receiver is slowed down.
    std::function<int()> ServiceThatChoosesUntilReleased(int clockFactor) const {
        return Service([this, clockFactor] {
            FakeLibc::clockFactor = clockFactor;
            FakeAppliance::onConfigLookup = [this] {
                LogNotice("Choosing");
                AwaitRelease();
            };
        });
    }
    void AwaitRelease() const {
        while (!PathExists(release_.c_str())) {
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
    }
    // The receiver has taken a message and waits for the lock to store it.
    void SendMessageToHold(ChildProcess *service) const {
        Send(kRequestReloadPinBlocks, volume_);
        EXPECT_TRUE(service->AwaitOutput("Choosing"));
        Send(kRequestReloadPinBlocks, volume_);
        EXPECT_TRUE(ChildProcess::Await([&] { return CountMessages(queueId_) == 0; }));
    }
    static bool HasThread(const ChildProcess &process, const std::string &name) {
        const auto threads =
            fs::directory_iterator("/proc/" + std::to_string(process.Id()) + "/task");
        return std::any_of(begin(threads), end(threads), [&](const fs::directory_entry &thread) {
            return ReadWhole(thread.path() / "comm") == name + "\n";
        });
    }
    static bool Contains(const Messages &all, const std::string &message) {
        return std::count(all.begin(), all.end(), message) > 0;
    }
    const std::string config_ = folder_.Path("conf.json");
    const std::string release_ = folder_.Path("release");
    int queueId_ = -1;
};

TEST_F(StartServiceTest, ARequestIsReceivedStoredAndCarriedOut) {
    WriteWhole(volume_ + "/a", "x");
    struct stat status {};
    ASSERT_EQ(stat((volume_ + "/a").c_str(), &status), 0);
    const auto inode = static_cast<uint32_t>(status.st_ino);
    extents_[inode] = {FakeExtent(0, 8, 16)};
    ChildProcess service({1, false, true}, Service());
    Send(kRequestPinFiles, volume_, volume_ + "/a");
    EXPECT_TRUE(service.AwaitOutput("OK \n"));
    service.Signal(SIGTERM);
    EXPECT_EQ(service.AwaitEnd(), 0);
    EXPECT_EQ(service.Messages(),
              Messages{"Handle request (type=pinFiles files=a#" + std::to_string(inode) + ") OK "});
    EXPECT_EQ(Hex(ReadWhole(bitmapFile_)), "0100");
    EXPECT_NE(ReadWhole(config_).find('"' + std::to_string(inode) + "\" : \"a\""),
              std::string::npos);
}

TEST_F(StartServiceTest, EachSignalEndsTheIdleServiceWithItsOutputWritten) {
    for (const int number : {SIGTERM, SIGINT, SIGQUIT}) {
        ChildProcess service({2}, Service());
        Send(kRequestReloadPinBlocks, "/volume9"); // of no cache: stored, woken for and dropped
        EXPECT_TRUE(AwaitConfig("\"requestQueue\" : null"));
        service.Signal(number);
        EXPECT_EQ(service.AwaitEnd(), 0);
        const Messages messages = service.Messages();
        ASSERT_FALSE(messages.empty());
        EXPECT_EQ(messages.front(), "StartService() [N] : +++++");
        EXPECT_TRUE(
            Contains(messages, "SignalHandler() [N]: Get signal = " + std::to_string(number)));
        EXPECT_TRUE(Contains(
            messages, "GetRequests() [N]: Get a new message. Request type = reloadPinBlocks"));
        EXPECT_TRUE(Contains(messages, "DoRequests() [N] : +++++"));
        EXPECT_TRUE(
            Contains(messages, "ConfigParseAndGetNextAvailableRequest() [N]: Remove request (0)"));
        std::filesystem::remove(config_);
    }
    EXPECT_NE(CountMessages(queueId_), -1); // queue and key file stay
    EXPECT_NE(ReadWhole(kMessageKeyFile), "");
}

TEST_F(StartServiceTest, ASignalEndsTheServiceInTheMiddleOfARequest) {
    WriteWhole(bitmapFile_, std::string("\x01\x00", 2));
    int marker[2];
    ASSERT_EQ(pipe(marker), 0);
    device_->onRead = [&marker] {
        EXPECT_EQ(write(marker[1], "r", 1), 1);
        for (;;) {
            pause();
        }
    };
    {
        ChildProcess service({2}, Service());
        Send(kRequestReloadPinBlocks, volume_);
        char byte = 0;
        EXPECT_EQ(syscall(SYS_read, marker[0], &byte, 1), 1);
        service.Signal(SIGTERM);
        EXPECT_EQ(service.AwaitEnd(), 0);
        const Messages messages = service.Messages();
        EXPECT_TRUE(Contains(messages, "SignalHandler() [N]: Get signal = 15"));
    }
    close(marker[0]);
    close(marker[1]);
    EXPECT_NE(ReadWhole(config_).find("reloadPinBlocks"), std::string::npos); // still queued
}

TEST_F(StartServiceTest, ASignalLetsTheMessageInHandBeStoredAndNoOtherBeTaken) {
    // So long that only a hang outlasts it: how soon the receiver has stored the message is the
    // machine's matter.
    ChildProcess service({1, false, true}, ServiceThatChoosesUntilReleased(100));
    SendMessageToHold(&service);
    Send(kRequestReloadPinBlocks, volume_);
    service.Signal(SIGTERM);
    // By the signal that calls the receiver to rest.
    ASSERT_TRUE(ChildProcess::Await([&] { return service.Catches(SIGUSR1); }));
    EXPECT_TRUE(service.Runs());
    WriteWhole(release_, "");
    EXPECT_EQ(service.AwaitEnd(), 0);
    EXPECT_NE(ReadWhole(config_).find("\"nextRequestNum\" : 2"), std::string::npos);
    EXPECT_EQ(CountMessages(queueId_), 1);
}

TEST_F(StartServiceTest, ASignalDoesNotWaitForAMessageThatCannotBeStored) {
    ChildProcess service({1, false, true}, ServiceThatChoosesUntilReleased(1));
    SendMessageToHold(&service);
    service.Signal(SIGTERM);
    EXPECT_EQ(service.AwaitEnd(), 0);
    EXPECT_NE(ReadWhole(config_).find("\"nextRequestNum\" : 1"), std::string::npos);
}

TEST_F(StartServiceTest, ASignalEndsTheServiceWhoseOutputNobodyReads) {
    SKIP_WHERE_SIGNALS_COME_LATE();
    ChildProcess service({2, true}, Service());
    for (int i = 0; i < 200; ++i) {
        Send(kRequestAddPendingSpace, "/volume" + std::to_string(i));
    }
    // It sleeps though messages wait: it cannot write.
    ASSERT_TRUE(ChildProcess::Await([&] {
        const int waiting = CountMessages(queueId_);
        return waiting > 0 && waiting < 200 && service.Sleeps();
    }));
    service.Signal(SIGTERM);
    EXPECT_EQ(service.AwaitEnd(), 0);
}

TEST_F(StartServiceTest, ASignalEndsTheServiceBeforeItHasItsQueue) {
    // A key file that is a FIFO holds the receiver up at reading the key of the existing queue.
    EmptyPrivateWorld();
    ASSERT_EQ(mkfifo(kMessageKeyFile, 0600), 0);
    ASSERT_NE(msgget(ftok(kMessageKeyFile, 'x'), IPC_CREAT | 0600), -1);
    for (const int number : {SIGTERM, SIGINT, SIGQUIT}) {
        ChildProcess service({2, false, true}, Service());
        EXPECT_TRUE(service.AwaitOutput("Message queue exist, try to get key"));
        EXPECT_TRUE(service.Runs());
        service.Signal(number);
        EXPECT_EQ(service.AwaitEnd(), 0);
        const Messages messages = service.Messages();
        ASSERT_FALSE(messages.empty());
        EXPECT_EQ(Of(messages, "GetRequests"), Messages{"GetRequests() [N] : +++++"});
        EXPECT_TRUE(
            Contains(messages, "SignalHandler() [N]: Get signal = " + std::to_string(number)));
    }
}

TEST_F(StartServiceTest, ASignalLetsTheQueueBeMadeWithItsKeyFile) {
    EmptyPrivateWorld();
    ChildProcess service({1, false, true}, Service([this] {
                             FakeLibc::clockFactor = 100;
                             FakeLibc::onMsgctl = [this] {
                                 LogNotice("Making");
                                 AwaitRelease();
                             };
                         }));
    ASSERT_TRUE(service.AwaitOutput("Making"));
    service.Signal(SIGTERM);
    ASSERT_TRUE(ChildProcess::Await([&] { return service.Catches(SIGUSR1); }));
    EXPECT_TRUE(service.Runs());
    EXPECT_EQ(ReadWhole(kMessageKeyFile), "");
    WriteWhole(release_, "");
    EXPECT_EQ(service.AwaitEnd(), 0);
    EXPECT_EQ(ReadWhole(kMessageKeyFile), std::to_string(ftok(kMessageKeyFile, 'x')));
    EXPECT_NE(msgget(ftok(kMessageKeyFile, 'x'), 0), -1);
}

TEST_F(StartServiceTest, WithRoomForOneThreadMoreItIsTheWorkers) {
    ChildProcess service({1, false, true},
                         Service([] { FakeLibc::Fail("pthread_create", EAGAIN, 2); }));
    Send(kRequestReloadPinBlocks, "/volume9"); // of no cache: stored, woken for and dropped
    EXPECT_TRUE(AwaitConfig("\"requestQueue\" : null"));
    service.Signal(SIGTERM);
    EXPECT_EQ(service.AwaitEnd(), 0);
}

TEST_F(StartServiceTest, ItsThreadsAreCalledWhatTheyDo) {
    ChildProcess service({1}, Service());
    for (const char *name : {"worker", "signals"}) {
        EXPECT_TRUE(ChildProcess::Await([&] { return HasThread(service, name); })) << name;
    }
    service.Signal(SIGTERM);
    EXPECT_EQ(service.AwaitEnd(), 0);
}

TEST_F(StartServiceTest, ASignalRightAfterTheHandlersAreInstalledEndsTheService) {
    SKIP_WHERE_SIGNALS_ARE_EMULATED();
    for (int i = 0; i < 10; ++i) {
        ChildProcess service({1}, Service());
        EXPECT_TRUE(ChildProcess::Await([&] { return service.Catches(SIGQUIT); }));
        service.Signal(SIGTERM);
        EXPECT_EQ(service.AwaitEnd(), 0);
    }
}

TEST_F(StartServiceTest, WithoutItsQueueTheReceiverEndsAndTheWorkerGoesOn) {
    WriteWhole(kMessageKeyFile, "");
    WriteWhole(config_, R"({"requestQueue" : ["0"], "requests" :
        {"0" : {"type" : "reloadPinBlocks", "mountPath" : ")" +
                            volume_ + R"("}}})");
    ChildProcess service({1, false, true}, Service());
    EXPECT_TRUE(AwaitConfig("\"requestQueue\" : null"));
    EXPECT_TRUE(service.AwaitOutput("Create server messsage queue by file "
                                    "(/var/run/veskcachepinfile-msg-server.key) failed\n"));
    EXPECT_TRUE(service.AwaitOutput("Handle request (type=reloadPinBlocks) OK \n"));
    EXPECT_TRUE(service.Runs());
    service.Signal(SIGTERM);
    EXPECT_EQ(service.AwaitEnd(), 0);
}

TEST_F(StartServiceTest, ASelectionErrorEndsTheWorkerAndTheReceiverGoesOn) {
    WriteWhole(config_, R"({"requestQueue" : ["7"]})");
    ChildProcess service({1, false, true}, Service());
    EXPECT_TRUE(service.AwaitOutput("Get request error"));
    Send(kRequestReloadPinBlocks, "/volume1");
    EXPECT_TRUE(AwaitConfig("/volume1"));
    EXPECT_TRUE(service.Runs());
    service.Signal(SIGTERM);
    EXPECT_EQ(service.AwaitEnd(), 0);
    EXPECT_EQ(service.Messages(), (Messages{
                                      "Can't find request number (7) in config",
                                      "Get request error",
                                  }));
}

TEST_F(StartServiceTest, WhenBothThreadsHaveEndedTheProcessEndsWithStatus0) {
    WriteWhole(config_, "[]");
    ChildProcess service({2}, Service());
    Send(kRequestReloadPinBlocks, "/volume1");
    EXPECT_EQ(service.AwaitEnd(), 0);
    const Messages messages = service.Messages();
    EXPECT_EQ(LastOf(Of(messages, "GetRequests")), "GetRequests() [N] : -----");
    EXPECT_EQ(LastOf(Of(messages, "DoRequests")), "DoRequests() [N] : -----");
}

TEST_F(StartServiceTest, WithoutItsHandlersItDoesNotStart) {
    ChildProcess service({2}, Service([] { FakeLibc::Fail("signal", EINVAL, 2); }));
    EXPECT_EQ(service.AwaitEnd(), 42);
    EXPECT_EQ(service.Messages(), (Messages{
                                      "StartService() [N] : +++++",
                                      "SetSignalHandler() [N] : ***** Can't set handler",
                                      "StartService() [N] : ***** Can't get signal handler",
                                      "StartService() [N] : -----",
                                  }));
}

TEST_F(StartServiceTest, WithoutItsLockItDoesNotStart) {
    ChildProcess service({2}, Service([] { FakeLibc::Fail("pthread_mutex_init", ENOMEM); }));
    EXPECT_EQ(service.AwaitEnd(), 42);
    EXPECT_EQ(service.Messages(), (Messages{
                                      "StartService() [N] : +++++",
                                      "StartService() [N] : ***** Initialize mutex failed",
                                      "StartService() [N] : -----",
                                  }));
}

TEST_F(StartServiceTest, WithoutItsWorkerItDoesNotStart) {
    ChildProcess service({2}, Service([] {
                             pthread_attr_t attributes;
                             pthread_attr_init(&attributes);
                             pthread_attr_setstacksize(&attributes,
                                                       SIZE_MAX / 4 * 3 & ~size_t{0xFFFF});
                             pthread_setattr_default_np(&attributes);
                         }));
    EXPECT_EQ(service.AwaitEnd(), 42);
    EXPECT_EQ(service.Messages(),
              (Messages{
                  "StartService() [N] : +++++",
                  "StartService() [N] : ***** Can't create thread: Cannot allocate memory",
                  "StartService() [N] : -----",
              }));
}
} // namespace vesk
