// kill_runner TOOL PRELOAD KILLS SEED
//
// Ends a busy service KILLS times at random moments, by SIGKILL and SIGTERM in turn, while three
// clients send it requests; the next service goes on with what is left. Runs in the same world as
// fault_runner. SIGTERM must end it with status 0, nineteen times in twenty within a second: the
// slowest ends tell more about what else the machine does. It must lose no request, unless the
// machine has kept the service from storing the one in hand for as long as it is waited for.
// SIGKILL may lose at most the one that was just taken off the queue; the document must be whole
// after every end, and in the end every stored request must have been carried out. Ends with 1
// where that does not hold.
#include "tests/faults/child.h"
#include "tests/faults/world.h"

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <random>
#include <unistd.h>
#include <vector>

using namespace vesk;

namespace {
using Clock = std::chrono::steady_clock;

// How long an end waits for the receiver to store what it has in hand.
const std::chrono::milliseconds kStoreTime(350);

const char kConfig[] = "/run/faults/config.json";
const std::vector<std::string> kServe = {"--start-service", "--config-path", kConfig};
const std::vector<std::string> kRequests[] = {
    {"--pin-files", "/volume1/a", "--mount-path", "/volume1"},
    {"--unpin-files", "/volume1/a;/volume1/b", "--mount-path", "/volume1"},
    {"--reload-blocks", "--mount-path", "/volume1"},
};

int Fail(int kills, const char *what, const std::string &detail) {
    printf("after %d kills: %s %s\n", kills, what, detail.c_str());
    return 1;
}

// Requests that have been sent and are neither on the queue nor stored.
long Lost(long sent) {
    const long stored = WorldNextNumber(kConfig) - 1; // the document began with 1
    return sent - stored - WorldMessagesLeft();
}

long Milliseconds(Clock::duration duration) {
    return static_cast<long>(
        std::chrono::duration_cast<std::chrono::milliseconds>(duration).count());
}
} // namespace

int main(int argc, char *argv[]) {
    const int kills = argc == 5 ? static_cast<int>(strtol(argv[3], nullptr, 10)) : 0;
    if (kills < 2) {
        fprintf(stderr, "usage: kill_runner TOOL PRELOAD KILLS SEED\n");
        return 2;
    }
    const Program program{argv[1], argv[2]};
    std::mt19937 random(static_cast<unsigned>(strtoul(argv[4], nullptr, 10)));
    // The queue is there: no kill comes between its making and the writing of its key.
    WorldReset(kConfig, {'a'});
    long sent = 1;
    long lost = 0;
    std::vector<Clock::duration> ends;
    for (int i = 1; i <= kills; ++i) {
        Child service(program, kServe, Fault{});
        std::vector<std::unique_ptr<Child>> clients;
        for (const auto &request : kRequests) {
            clients.push_back(std::make_unique<Child>(program, request, Fault{}));
        }
        usleep(static_cast<useconds_t>(random() % 40000));
        const bool gently = i % 2 == 0;
        // The program has its handler only once it has looked at its options.
        if (gently && !service.AwaitHandler()) {
            return Fail(i, "the service did not start:", service.Output());
        }
        const Clock::time_point signalled = Clock::now();
        service.Signal(gently ? SIGTERM : SIGKILL);
        const int status = service.AwaitEnd();
        if (gently) {
            ends.push_back(Clock::now() - signalled);
        }
        if (status != (gently ? 0 : 128 + SIGKILL)) {
            return Fail(i, "wrong status", std::to_string(status));
        }
        for (const auto &client : clients) {
            sent += client->AwaitEnd() == 0 ? 1 : 0;
        }
        if (const std::string complaint = WorldComplaint(WorldRead(kConfig)); !complaint.empty()) {
            return Fail(i, "the document:", complaint);
        }
        const long lostBefore = lost;
        lost = Lost(sent);
        const bool mayLose = !gently || ends.back() >= kStoreTime;
        if (lost < lostBefore || lost > lostBefore + (mayLose ? 1 : 0)) {
            return Fail(i, gently ? "SIGTERM loses" : "SIGKILL loses",
                        std::to_string(lost - lostBefore));
        }
    }
    Child last(program, kServe, Fault{});
    if (!last.AwaitQuiet()) {
        return Fail(kills, "the last service did not come to rest:", last.Output());
    }
    last.Signal(SIGTERM);
    if (last.AwaitEnd() != 0 || !WorldIsIdle(kConfig, WorldNextNumber(kConfig))) {
        return Fail(kills, "requests are left:", WorldRead(kConfig));
    }
    std::sort(ends.begin(), ends.end());
    const long most = Milliseconds(ends[ends.size() * 19 / 20]);
    printf("seed %s: %d kills, ends by SIGTERM within %ld ms, 19 of 20 within %ld ms, %ld "
           "requests sent, %ld lost, the others carried out\n",
           argv[4], kills, Milliseconds(ends.back()), most, sent, lost);
    // Clients that all failed would have left nothing to lose.
    return most <= 1000 && Lost(sent) == lost && sent > kills ? 0 : 1;
}
