#include "service/signal_handler.h"

#include "base/log.h"
#include "service/receiver_rest.h"

#include <atomic>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <pthread.h>
#include <sys/time.h>
#include <unistd.h>

namespace vesk {
namespace {
const int kEndingSignals[] = {SIGINT, SIGTERM, SIGQUIT};
const suseconds_t kEndGraceMicroseconds = 500000;

std::atomic<int> serviceThreads{0};

// Without a thread for the signals: the one that starts the service takes them.
std::atomic<bool> startingThreadTakesSignals{false};
std::atomic<pthread_t> startingThread{};

sigset_t EndingSignalSet() {
    sigset_t set;
    sigemptyset(&set);
    for (const int signalNumber : kEndingSignals) {
        sigaddset(&set, signalNumber);
    }
    return set;
}

void EndNow(int /*signalNumber*/) {
    _exit(0);
}

// Whatever the orderly end waits for (the receiver, a full pipe behind standard output), it waits
// no longer than this from the signal on.
void LimitEnd() {
    static std::atomic<bool> limited{false};
    if (limited.exchange(true)) {
        return;
    }
    itimerval limit{};
    limit.it_value.tv_usec = kEndGraceMicroseconds;
    sigset_t alarmSet;
    sigemptyset(&alarmSet);
    sigaddset(&alarmSet, SIGALRM);
    signal(SIGALRM, EndNow);
    pthread_sigmask(SIG_UNBLOCK, &alarmSet, nullptr);
    setitimer(ITIMER_REAL, &limit, nullptr);
}

[[noreturn]] void EndProcess() {
    fflush(stdout);
    quick_exit(0);
}

[[noreturn]] void *WaitForSignals(void * /*argument*/) {
    const sigset_t set = EndingSignalSet();
    int signalNumber = 0;
    while (sigwait(&set, &signalNumber) != 0) {
    }
    LimitEnd();
    ReceiverAwaitRest();
    SignalHandler(signalNumber);
}
} // namespace

int SetSignalHandler() {
    // Blocked before the handlers are there, so that no signal finds a handler but no waiter.
    const sigset_t set = EndingSignalSet();
    pthread_sigmask(SIG_BLOCK, &set, nullptr);
    for (const int signalNumber : kEndingSignals) {
        if (signal(signalNumber, SignalHandler) == SIG_ERR) {
            LogError("Can't set handler");
            pthread_sigmask(SIG_UNBLOCK, &set, nullptr);
            return -1;
        }
    }
    return 0;
}

void StartSignalThread() {
    pthread_t waiter{};
    if (pthread_create(&waiter, nullptr, WaitForSignals, nullptr) == 0) {
        pthread_setname_np(waiter, "signals");
        pthread_detach(waiter);
        return;
    }
    startingThread = pthread_self();
    startingThreadTakesSignals = true;
    const sigset_t set = EndingSignalSet();
    pthread_sigmask(SIG_UNBLOCK, &set, nullptr);
}

void SignalHandler(int signalNumber) {
    LimitEnd();
    LogVerbose("Get signal = %d", signalNumber);
    EndProcess();
}

void SetServiceThreads(int count) {
    serviceThreads = count;
}

void ServiceThreadEnds() {
    if (--serviceThreads == 0) {
        EndProcess();
    }
    if (startingThreadTakesSignals && pthread_equal(startingThread, pthread_self()) != 0) {
        const sigset_t set = EndingSignalSet();
        pthread_sigmask(SIG_BLOCK, &set, nullptr);
        WaitForSignals(nullptr);
    }
}
} // namespace vesk
