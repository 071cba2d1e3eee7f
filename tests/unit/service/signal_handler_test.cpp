#include "service/signal_handler.h"

#include "tests/support/leak_checked_test.h"
#include "tests/support/messages_of.h"
#include "tests/unit/service/child_process.h"

#include <cerrno>
#include <csignal>
#include <pthread.h>
#include <string>
#include <thread>
#include <unistd.h>

namespace vesk {
namespace {
const int kEndingSignals[] = {SIGINT, SIGTERM, SIGQUIT};

// Which of the ending signals have the handler (bits 0 to 2) and which are blocked (bits 3 to 5).
int SignalState() {
    sigset_t blocked;
    pthread_sigmask(SIG_SETMASK, nullptr, &blocked);
    int state = 0;
    for (int i = 0; i < 3; ++i) {
        struct sigaction action {};
        sigaction(kEndingSignals[i], nullptr, &action);
        state |= action.sa_handler == SignalHandler ? 1 << i : 0;
        state |= sigismember(&blocked, kEndingSignals[i]) == 1 ? 8 << i : 0;
    }
    return state;
}

// As the service does. False where it cannot.
bool TakeSignals() {
    if (SetSignalHandler() != 0) {
        return false;
    }
    StartSignalThread();
    return true;
}

// Makes every thread that is started without an own stack size fail.
void RefuseThreads() {
    pthread_attr_t attributes;
    pthread_attr_init(&attributes);
    pthread_attr_setstacksize(&attributes, SIZE_MAX / 4 * 3 & ~size_t{0xFFFF});
    pthread_setattr_default_np(&attributes);
}
} // namespace

class SignalHandlerTest : public LeakCheckedTest {};

TEST_F(SignalHandlerTest, AllThreeSignalsGetTheHandler) {
    ChildProcess child({2}, [] { return SetSignalHandler() == 0 ? SignalState() : 99; });
    EXPECT_EQ(child.AwaitEnd(), 0b111111);
    EXPECT_EQ(child.Messages(), Messages{});
}

TEST_F(SignalHandlerTest, AFailureEndsItAndLeavesTheHandlersBeforeIt) {
    const int expected[] = {0b000, 0b001, 0b011}; // interrupt, terminate, quit: in this order
    for (int nth = 1; nth <= 3; ++nth) {
        ChildProcess child({2}, [nth] {
            FakeLibc::Fail("signal", EINVAL, nth);
            return SetSignalHandler() == -1 ? SignalState() : 99;
        });
        EXPECT_EQ(child.AwaitEnd(), expected[nth - 1]);
        EXPECT_EQ(child.Messages(), Messages{"SetSignalHandler() [N] : ***** Can't set handler"});
    }
}

TEST_F(SignalHandlerTest, EachSignalEndsTheProcessWithStatus0AndItsOutputWritten) {
    SKIP_WHERE_SIGNALS_ARE_EMULATED();
    for (const int number : kEndingSignals) {
        ChildProcess child({2}, [] {
            LogNotice("still in the buffer");
            TakeSignals();
            for (;;) {
                pause();
            }
            return 99;
        });
        ASSERT_TRUE(ChildProcess::Await([&] { return child.Catches(SIGQUIT); }));
        child.Signal(number);
        EXPECT_EQ(child.AwaitEnd(), 0);
        const Messages messages = child.Messages();
        ASSERT_EQ(messages.size(), 2U);
        EXPECT_NE(messages[0].find(" : still in the buffer"), std::string::npos) << messages[0];
        EXPECT_EQ(messages[1], "SignalHandler() [N]: Get signal = " + std::to_string(number));
    }
}

TEST_F(SignalHandlerTest, TheEndIsLimitedToHalfASecond) {
    ChildProcess child({1}, [] {
        FakeLibc::onAlarm = [](long long microseconds) { LogNotice("%lld", microseconds); };
        TakeSignals();
        kill(getpid(), SIGTERM);
        for (;;) {
            pause();
        }
        return 99;
    });
    EXPECT_EQ(child.AwaitEnd(), 0);
    const Messages messages = child.Messages();
    ASSERT_EQ(messages.size(), 1U);
    EXPECT_GT(std::stoll(messages[0]), 0);
    EXPECT_LE(std::stoll(messages[0]), 500000);
}

TEST_F(SignalHandlerTest, ASignalIsSilentAtLevel1) {
    ChildProcess child({1}, [] {
        TakeSignals();
        kill(getpid(), SIGTERM);
        for (;;) {
            pause();
        }
        return 99;
    });
    EXPECT_EQ(child.AwaitEnd(), 0);
    EXPECT_EQ(child.Messages(), Messages{});
}

TEST_F(SignalHandlerTest, ASignalInsideOutputThatNobodyReadsEndsTheProcess) {
    SKIP_WHERE_SIGNALS_COME_LATE();
    SKIP_WHERE_SIGNALS_ARE_EMULATED();
    ChildProcess child({2, true}, [] {
        TakeSignals();
        for (;;) {
            LogNotice("more and more, until the pipe takes no more and the lock is held for good");
        }
        return 99;
    });
    ASSERT_TRUE(ChildProcess::Await([&] { return child.Catches(SIGQUIT) && child.Sleeps(); }));
    child.Signal(SIGTERM);
    EXPECT_EQ(child.AwaitEnd(), 0);
}

TEST_F(SignalHandlerTest, OtherSignalsKeepTheirActions) {
    ChildProcess child({1}, [] {
        TakeSignals();
        raise(SIGUSR1);
        return 99;
    });
    EXPECT_EQ(child.AwaitEnd(), 128 + SIGUSR1);
}

TEST_F(SignalHandlerTest, WithoutAWaitingThreadTheHandlerRunsWhereItIsInterrupted) {
    SKIP_WHERE_SIGNALS_COME_LATE();
    ChildProcess child({2}, [] {
        RefuseThreads();
        if (!TakeSignals() || SignalState() != 0b000111) {
            return 99;
        }
        raise(SIGINT);
        return 98;
    });
    EXPECT_EQ(child.AwaitEnd(), 0);
    EXPECT_EQ(child.Messages(), Messages{"SignalHandler() [N]: Get signal = 2"});
}

TEST_F(SignalHandlerTest, WithoutAWaitingThreadTheOneThatHasEndedStillTakesTheSignals) {
    SKIP_WHERE_SIGNALS_ARE_EMULATED();
    ChildProcess child({2}, [] {
        SetSignalHandler();
        SetServiceThreads(2);
        std::thread([] { // a worker: the signals stay blocked in it
            for (;;) {
                pause();
            }
        })
            .detach();
        RefuseThreads();
        StartSignalThread();
        LogNotice("ends");
        fflush(stdout);
        ServiceThreadEnds();
        return 99;
    });
    ASSERT_TRUE(child.AwaitOutput("ends"));
    child.Signal(SIGTERM);
    EXPECT_EQ(child.AwaitEnd(), 0);
    EXPECT_EQ(LastOf(child.Messages()), "SignalHandler() [N]: Get signal = 15");
}

TEST_F(SignalHandlerTest, TheLastServiceThreadEndsTheProcess) {
    ChildProcess child({1}, [] {
        TakeSignals();
        SetServiceThreads(2);
        ServiceThreadEnds();
        LogNotice("one is left");
        ServiceThreadEnds();
        return 99;
    });
    EXPECT_EQ(child.AwaitEnd(), 0);
    EXPECT_EQ(child.Messages(), Messages{"one is left"});
}
} // namespace vesk
