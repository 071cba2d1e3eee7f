#include "state/service_state.h"

#include "tests/support/captured_log.h"
#include "tests/support/leak_checked_test.h"
#include "tests/support/messages_of.h"
#include "tests/support/thread_state.h"

#include <atomic>
#include <cerrno>
#include <string>
#include <sys/syscall.h>
#include <thread>
#include <unistd.h>
#include <vector>

namespace vesk {
namespace {
int Add(std::string path) {
    return ServiceAddPendingSpaceAtomic(&path[0]);
}

int Remove(std::string path) {
    return ServiceRemovePendingSpaceAtomic(&path[0]);
}

// The lock that a failed addition keeps, which the analysis cannot know of.
void GiveBackWhatTheAdditionKept() NOT_ANALYSED {
    ServiceUnlock();
}
} // namespace

class ServiceStateTest : public LeakCheckedTest {
protected:
    void SetUp() override {
        LeakCheckedTest::SetUp();
        ASSERT_EQ(ServiceStateInitialize(), 0);
    }
};

TEST_F(ServiceStateTest, TheStateWordStartsWith2AndIsSetAndRead) {
    EXPECT_EQ(ServiceGetState(), 2);
    const int state = -7;
    ServiceSetState(&state);
    EXPECT_EQ(ServiceGetState(), -7);
    ASSERT_EQ(ServiceStateInitialize(), 0);
    EXPECT_EQ(ServiceGetState(), 2);
}

TEST_F(ServiceStateTest, WhatPthreadMutexInitReturnsIsHandedOn) {
    FakeLibc::Fail("pthread_mutex_init", ENOMEM);
    EXPECT_EQ(ServiceStateInitialize(), ENOMEM);
}

TEST_F(ServiceStateTest, AnAddedSpaceIsPendingUntilItIsRemoved) {
    CapturedLog log;
    EXPECT_FALSE(ServiceIsPendingSpace("/volume1"));
    EXPECT_EQ(Add("/volume1"), 0);
    EXPECT_TRUE(ServiceIsPendingSpace("/volume1"));
    EXPECT_EQ(Remove("/volume1"), 0);
    EXPECT_FALSE(ServiceIsPendingSpace("/volume1"));
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(ServiceStateTest, AtLevel2ChangesAreLogged) {
    CapturedLog log(2);
    Add("/volume1");
    Remove("/volume1");
    EXPECT_EQ(log.Messages(),
              (Messages{
                  "ServiceAddPendingSpaceAtomic() [N]: Add pending space = /volume1",
                  "ServiceRemovePendingSpaceAtomic() [N]: Remove pending space (/volume1)",
              }));
}

TEST_F(ServiceStateTest, PathsAreComparedWhole) {
    EXPECT_EQ(Add("/volume1"), 0);
    EXPECT_EQ(Add("/volume1/"), 0);
    EXPECT_EQ(Add(""), 0);
    EXPECT_TRUE(ServiceIsPendingSpace(""));
    EXPECT_FALSE(ServiceIsPendingSpace("/volume"));
    EXPECT_FALSE(ServiceIsPendingSpace("/volume10"));
    EXPECT_FALSE(ServiceIsPendingSpace("/VOLUME1"));
    EXPECT_EQ(Remove("/volume1"), 0);
    EXPECT_FALSE(ServiceIsPendingSpace("/volume1"));
    EXPECT_TRUE(ServiceIsPendingSpace("/volume1/"));
}

TEST_F(ServiceStateTest, RemovingWhatIsNotPendingFailsAndChangesNothing) {
    Add("/volume1");
    CapturedLog log;
    EXPECT_EQ(Remove("/volume2"), -1);
    EXPECT_EQ(log.Messages(), Messages{"Space (/volume2) is not pending"});
    EXPECT_TRUE(ServiceIsPendingSpace("/volume1"));
    CapturedLog verbose(2);
    EXPECT_EQ(Remove("/volume2"), -1);
    EXPECT_EQ(verbose.Messages(), Messages{"ServiceRemovePendingSpaceAtomic() [N] : ***** Space "
                                           "(/volume2) is not pending"});
}

TEST_F(ServiceStateTest, AddRemoveAddLeavesItThereOnce) {
    Add("/volume1");
    Remove("/volume1");
    Add("/volume1");
    EXPECT_TRUE(ServiceIsPendingSpace("/volume1"));
    EXPECT_EQ(Remove("/volume1"), 0);
    EXPECT_FALSE(ServiceIsPendingSpace("/volume1"));
}

TEST_F(ServiceStateTest, AddingTwiceFailsAndKeepsTheLock) {
    Add("/volume1");
    CapturedLog log;
    EXPECT_EQ(Add("/volume1"), -1);
    EXPECT_EQ(log.Messages(), Messages{"Space (/volume1) is already pending"});
    EXPECT_TRUE(ServiceIsPendingSpace("/volume1")); // asks for no lock
    std::atomic<pid_t> thread{0};
    std::atomic<bool> taken{false};
    std::thread other([&] {
        thread = static_cast<pid_t>(syscall(SYS_gettid));
        ServiceLock();
        taken = true;
        ServiceUnlock();
    });
    while (!taken && (thread == 0 || !ThreadSleeps(getpid(), thread))) {
        std::this_thread::yield();
    }
    EXPECT_FALSE(taken);
    GiveBackWhatTheAdditionKept();
    other.join();
}

TEST_F(ServiceStateTest, RemovingUnderTheLockLogsNothing) {
    Add("/volume1");
    CapturedLog log(2);
    const ServiceLockGuard lock;
    EXPECT_EQ(ServiceRemovePendingSpaceLocked("/volume1"), 0);
    EXPECT_EQ(ServiceRemovePendingSpaceLocked("/volume1"), -1);
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(ServiceStateTest, InitializingForgetsPendingSpaces) {
    Add("/volume1");
    ASSERT_EQ(ServiceStateInitialize(), 0);
    EXPECT_FALSE(ServiceIsPendingSpace("/volume1"));
}

TEST_F(ServiceStateTest, ASignalWakesTheWaiter) {
    std::atomic<bool> ready{false};
    bool woken = false; // under the lock
    std::thread waiter([&] {
        const ServiceLockGuard lock;
        ready = true;
        while (!woken) {
            ServiceWaitForRequest();
        }
    });
    while (!ready) {
        std::this_thread::yield();
    }
    {
        const ServiceLockGuard lock; // to be had only while the other thread waits
        woken = true;
    }
    ServiceSignalRequest();
    waiter.join();
    SUCCEED();
}

TEST_F(ServiceStateTest, TheWaitHasNoLimitOfTime) {
    std::atomic<pid_t> thread{0};
    bool woken = false; // under the lock
    std::thread waiter([&] {
        const ServiceLockGuard lock;
        thread = static_cast<pid_t>(syscall(SYS_gettid));
        while (!woken) {
            ServiceWaitForRequest();
        }
    });
    while (thread == 0) {
        std::this_thread::yield();
    }
    {
        const ServiceLockGuard lock; // to be had only while the other thread waits
        woken = true;
    }
    while (!ThreadSleeps(getpid(), thread)) {
        std::this_thread::yield();
    }
    EXPECT_TRUE(ThreadAwaitsConditionForGood(getpid(), thread));
    ServiceSignalRequest();
    waiter.join();
}

// For the thread sanitizer above all: readers ask while the list changes under the lock.
TEST_F(ServiceStateTest, ReadersWithoutTheLockSeeWholeLists) {
    const std::string always = "/a volume whose name is too long to be kept inside a string object";
    Add(always);
    std::atomic<bool> end{false};
    std::atomic<int> missed{0};
    std::vector<std::thread> readers;
    for (int i = 0; i < 3; ++i) {
        readers.emplace_back([&] {
            while (!end) {
                missed += ServiceIsPendingSpace(always.c_str()) ? 0 : 1;
                ServiceIsPendingSpace("/volume1");
                ServiceGetState();
            }
        });
    }
    for (int i = 0; i < 500; ++i) {
        const std::string path = "/volume" + std::to_string(i % 5);
        ASSERT_EQ(Add(path), 0);
        ASSERT_EQ(Remove(path), 0);
    }
    end = true;
    for (std::thread &reader : readers) {
        reader.join();
    }
    EXPECT_EQ(missed, 0);
}
} // namespace vesk
