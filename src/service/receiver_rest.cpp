#include "service/receiver_rest.h"

#include "base/clock.h"

#include <atomic>
#include <csignal>
#include <cstdint>
#include <pthread.h>
#include <unistd.h>

namespace vesk {
namespace {
const int64_t kRestMilliseconds = 350;
const useconds_t kTryMicroseconds = 1000;

// The receiver clears `atRest` and then looks at `called`; the ending thread sets `called` and then
// looks at `atRest`: one of them sees the other.
std::atomic<bool> called{false};
std::atomic<bool> atRest{true};
std::atomic<pthread_t> receiver{};

void Interrupt(int /*signalNumber*/) {}
} // namespace

void ReceiverTakesNext() {
    receiver = pthread_self();
    atRest = false;
    if (!called) {
        return;
    }
    atRest = true;
    for (;;) {
        pause();
    }
}

bool ReceiverIsCalledToRest() {
    return called;
}

void ReceiverHasEnded() {
    atRest = true;
}

void ReceiverAwaitRest() {
    called = true;
    // Installed only now: at any other time the signal has its default action. Other calls than the
    // wait for messages go on after it.
    struct sigaction action {};
    action.sa_handler = Interrupt;
    action.sa_flags = SA_RESTART;
    if (sigaction(SIGUSR1, &action, nullptr) < 0) {
        return;
    }
    // Again and again: the signal may come just before the receiver begins to wait.
    const int64_t end = NowMs() + kRestMilliseconds;
    while (!atRest && NowMs() < end) {
        pthread_kill(receiver, SIGUSR1);
        usleep(kTryMicroseconds);
    }
}
} // namespace vesk
