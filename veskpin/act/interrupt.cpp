#include "act/interrupt.h"

#include "base/clock.h"

#include <signal.h>
#include <sys/select.h>

#include <cstdint>
#include <ctime>

namespace vesk {
namespace {
volatile sig_atomic_t signalNoted = 0;
volatile sig_atomic_t signalsNoted = 0;
int64_t seenAt = 0; // milliseconds of the monotonic clock; 0: no pause has seen one yet
unsigned grace = 0; // milliseconds

void Note(int number) {
    signalNoted = number;
    signalsNoted = signalsNoted + 1;
}

bool IsPauseOver() {
    if (signalsNoted == 0) {
        return false;
    }
    seenAt = seenAt == 0 ? NowMs() : seenAt;
    return signalsNoted > 1 || NowMs() - seenAt >= grace;
}

const int kSignals[] = {SIGINT, SIGTERM, SIGHUP};

sigset_t AllSignals() {
    sigset_t signals;
    sigemptyset(&signals);
    for (const int number : kSignals) {
        sigaddset(&signals, number);
    }
    return signals;
}
} // namespace

void InterruptBegin() {
    signal(SIGPIPE, SIG_IGN);
    signalNoted = 0;
    signalsNoted = 0;
    seenAt = 0;
    grace = 0;
    struct sigaction action {};
    action.sa_handler = Note;
    for (const int number : kSignals) {
        struct sigaction before {};
        sigaction(number, nullptr, &before);
        if (number != SIGHUP || before.sa_handler != SIG_IGN) {
            sigaction(number, &action, nullptr);
        }
    }
}

int InterruptSignal() {
    return signalNoted;
}

void InterruptGrace(unsigned milliseconds) {
    grace = milliseconds;
    seenAt = 0;
}

bool InterruptPause(unsigned milliseconds) {
    // Held back until the sleep begins: one that comes before would not end it.
    const sigset_t all = AllSignals();
    sigset_t before;
    sigprocmask(SIG_BLOCK, &all, &before);
    if (!IsPauseOver()) {
        const timespec time{static_cast<time_t>(milliseconds / 1000),
                            static_cast<long>(milliseconds % 1000) * 1000000};
        // Not ppoll: its checked form takes the time for one of 32 bits where that has 64.
        pselect(0, nullptr, nullptr, nullptr, &time, &before);
    }
    sigprocmask(SIG_SETMASK, &before, nullptr);
    return !IsPauseOver();
}
} // namespace vesk
