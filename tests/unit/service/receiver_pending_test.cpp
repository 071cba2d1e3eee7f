// The receiver's pending-space messages.
#include "service/receiver.h"

#include "tests/unit/service/receiver_fixture.h"

#include <thread>

namespace vesk {
using ReceiverPendingTest = ReceiverTest;

TEST_F(ReceiverPendingTest, PendingSpaceMessagesChangeTheListAndNothingElse) {
    Put(kRequestAddPendingSpace, "/volume1");
    Put(kRequestAddPendingSpace, "/volume1");
    Put(kRequestAddPendingSpace, "/volume2");
    Put(kRequestAddPendingSpace, "");
    Put(kRequestRemovePendigSpace, "/volume2");
    Put(kRequestRemovePendigSpace, "/volume2");
    PutEnd();
    CapturedLog log(2);
    RunReceiver();
    EXPECT_EQ(
        MessagesOf(log, "GetRequests"),
        (Messages{
            "GetRequests() [N] : +++++",
            "GetRequests() [N]: Get server messsage queue id = " + std::to_string(queueId_),
            "GetRequests() [N]: Get a new message. Request type = addPendingSpace",
            "GetRequests() [N]: Get a new message. Request type = addPendingSpace",
            "GetRequests() [N]: Space (/volume1) is already in pending list",
            "GetRequests() [N]: Get a new message. Request type = addPendingSpace",
            "GetRequests() [N]: Get a new message. Request type = addPendingSpace",
            "GetRequests() [N]: Get a new message. Request type = removePendigSpace",
            "GetRequests() [N]: Get a new message. Request type = removePendigSpace",
            "GetRequests() [N] : Space (/volume2) is not in pending list. Could be a new space",
            "GetRequests() [N]: Get a new message. Request type = reloadPinBlocks",
            "GetRequests() [N] : ***** Get wrong message format",
            "GetRequests() [N] : -----",
        }));
    EXPECT_TRUE(ServiceIsPendingSpace("/volume1"));
    EXPECT_FALSE(ServiceIsPendingSpace("/volume2"));
    EXPECT_TRUE(ServiceIsPendingSpace("")); // these are not checked as requests are
    EXPECT_FALSE(std::filesystem::exists(config_));
}

TEST_F(ReceiverPendingTest, RemovingWhatIsNotPendingIsANotice) {
    Put(kRequestRemovePendigSpace, "/volume1");
    PutEnd();
    CapturedLog log;
    RunReceiver();
    EXPECT_EQ(log.Messages(), (Messages{
                                  "Space (/volume1) is not in pending list. Could be a new space",
                                  "Space UUID is not set",
                                  "Get wrong message format",
                              }));
}

TEST_F(ReceiverPendingTest, OnlyAStoredRequestWakesTheWorker) {
    std::atomic<pid_t> worker{0};
    int wakeUps = 0;    // under the lock
    bool ended = false; // under the lock
    std::thread other([&] {
        const ServiceLockGuard lock;
        worker = static_cast<pid_t>(syscall(SYS_gettid));
        while (!ended) {
            ServiceWaitForRequest();
            ++wakeUps;
        }
    });
    const auto awaitWaiting = [&worker] {
        while (worker == 0 || !ThreadAwaitsConditionForGood(getpid(), worker)) {
            sched_yield();
        }
    };
    awaitWaiting();
    Put(kRequestAddPendingSpace, "/volume1");
    Put(kRequestRemovePendigSpace, "/volume1"); // it is the worker's polling that notices
    Put(kRequestRemovePendigSpace, "/volume1");
    PutEnd();
    CapturedLog log;
    RunReceiver();
    awaitWaiting(); // one that was woken has counted it and waits again
    Put(kRequestReloadPinBlocks, "/volume1");
    PutEnd();
    {
        const ServiceLockGuard lock; // until here nobody has woken it
        EXPECT_EQ(wakeUps, 0);
        ended = true;
    }
    RunReceiver();
    other.join();
    EXPECT_EQ(wakeUps, 1);
}

TEST_F(ReceiverPendingTest, ASpaceThatLeavesTheListMeanwhileStopsIt) {
    std::string path = "/volume1";
    ASSERT_EQ(ServiceAddPendingSpaceAtomic(&path[0]), 0);
    Put(kRequestRemovePendigSpace, path);
    CapturedLog log(2);
    ServiceLock();
    std::thread receiver([this] { RunReceiver(); });
    AwaitAtLock(log, "GetRequests() [N]: Get a new message. Request type = removePendigSpace");
    EXPECT_EQ(ServiceRemovePendingSpaceLocked(path.c_str()), 0);
    ServiceUnlock();
    receiver.join();
    EXPECT_TRUE(
        log.Has("ServiceRemovePendingSpaceAtomic() [N] : ***** Space (/volume1) is not pending"));
    EXPECT_TRUE(log.Has("GetRequests() [N] : ***** Remove pending space error"));
    EXPECT_EQ(LastOf(log.Messages()), "GetRequests() [N] : -----");
}

TEST_F(ReceiverPendingTest, ASpaceThatEntersTheListMeanwhileStopsIt) {
#ifdef __SANITIZE_THREAD__
    GTEST_SKIP() << "the lock stays with a thread that has ended, which the sanitizer reports";
#endif
    std::string path = "/volume1";
    Put(kRequestAddPendingSpace, path);
    CapturedLog log(2);
    ServiceLock();
    std::atomic<pid_t> adding{0};
    std::thread other([&] { // the first in the line for the lock
        adding = static_cast<pid_t>(syscall(SYS_gettid));
        ServiceAddPendingSpaceAtomic(&path[0]);
    });
    while (adding == 0 || !ThreadSleeps(getpid(), adding)) {
        sched_yield();
    }
    std::thread receiver([this] { RunReceiver(); });
    AwaitAtLock(log, "GetRequests() [N]: Get a new message. Request type = addPendingSpace");
    ServiceUnlock();
    other.join();
    receiver.join();
    EXPECT_TRUE(
        log.Has("ServiceAddPendingSpaceAtomic() [N] : ***** Space (/volume1) is already pending"));
    EXPECT_TRUE(log.Has("GetRequests() [N] : ***** Add spend space error"));
    EXPECT_TRUE(ServiceIsPendingSpace("/volume1"));
    ASSERT_EQ(ServiceStateInitialize(), 0); // its lock was kept
}
} // namespace vesk
