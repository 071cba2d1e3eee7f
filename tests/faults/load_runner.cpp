// load_runner TOOL PRELOAD SECONDS FILES MOST
//
// Three clients fill the queue of a running service, again and again for SECONDS: until it is full
// or each has sent MOST. A round ends when everything is carried out. Before, FILES files are
// pinned, so that the document has as many records. Runs in the same world as fault_runner. The
// service must carry out every request once, each client's in the order in which they were sent,
// with its memory and descriptors flat, and end with 0. Prints the figures; ends with 1 where that
// does not hold.
#include "tests/faults/child.h"
#include "tests/faults/world.h"

#include <algorithm>
#include <chrono>
#include <climits>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <sstream>
#include <thread>
#include <unistd.h>

using namespace vesk;

namespace {
using Clock = std::chrono::steady_clock;

const char kConfig[] = "/run/faults/config.json";
const std::vector<std::string> kServe = {"--start-service", "--config-path", kConfig};
const int kClients = 3;
const int kFilesOfClient = 50; // each client pins its own in turn, one in a request
const int kFilesOfRequest = 50;
const long kGrowthMaxKiB = 2048; // what an allocator may keep, a few documents of that size

struct Figures {
    long rounds = 0;
    long sent = 0;
    long memory = 0;     // KiB, after the second round
    long memoryEnd = 0;  // KiB, after the last
    int descriptors = 0; // at the same times
    int descriptorsEnd = 0;
};

std::string RoundFile(int client, long number) {
    return "c" + std::to_string(client) + "-" + std::to_string(number % kFilesOfClient);
}

void MakeFile(const std::string &name) {
    std::ofstream("/volume1/" + name) << name;
}

void MakeFiles(long files) {
    for (int client = 0; client < kClients; ++client) {
        for (int i = 0; i < kFilesOfClient; ++i) {
            MakeFile(RoundFile(client, i));
        }
    }
    for (long i = 0; i < files; ++i) {
        MakeFile("f" + std::to_string(i));
    }
    sync();
}

// Ten minutes for what takes seconds.
bool AwaitStored(long requests) {
    for (int i = 0; i < 60000; ++i) {
        if (WorldIsIdle(kConfig, requests + 1)) {
            return true;
        }
        usleep(10000);
    }
    return false;
}

// Returns the number of requests sent.
long PinFiles(long files) {
    long requests = 0;
    for (long first = 0; first < files; first += kFilesOfRequest) {
        std::string paths;
        for (long i = first; i < std::min(first + kFilesOfRequest, files); ++i) {
            paths += "/volume1/f" + std::to_string(i) + ";";
        }
        WorldSendPin(paths, true);
        ++requests;
    }
    return requests;
}

// Every client sends until the queue is full or it has sent `most`; numbers[client] is its next
// file's.
long FillQueue(long *numbers, long most) {
    long sent[kClients] = {};
    std::vector<std::thread> threads;
    for (int client = 0; client < kClients; ++client) {
        threads.emplace_back([client, numbers, most, &sent] {
            while (sent[client] < most &&
                   WorldSendPin("/volume1/" + RoundFile(client, numbers[client]), false)) {
                ++numbers[client];
                ++sent[client];
            }
        });
    }
    for (std::thread &thread : threads) {
        thread.join();
    }
    return sent[0] + sent[1] + sent[2];
}

// What is out of order, or missing, in the service's messages; empty: nothing.
std::string OrderComplaint(const std::string &log, const long *numbers) {
    long seen[kClients] = {};
    std::istringstream lines(log);
    for (std::string line; std::getline(lines, line);) {
        const size_t at = line.find("files=c");
        if (at == std::string::npos || line.find(" OK ") == std::string::npos) {
            continue;
        }
        const int client = line[at + 7] - '0';
        const std::string file = line.substr(at + 6, line.find('#') - at - 6);
        if (client < 0 || client >= kClients || file != RoundFile(client, seen[client])) {
            return "out of order: " + line;
        }
        ++seen[client];
    }
    return std::equal(seen, seen + kClients, numbers) ? "" : "a request was not carried out";
}

int Fail(const std::string &what) {
    printf("%s\n", what.c_str());
    return 1;
}

void Look(const Child &service, Figures *figures) {
    service.AwaitQuiet(); // a request opens files and has the document in memory until its end
    figures->memoryEnd = service.MemoryKiB();
    figures->descriptorsEnd =
        service.Descriptors(figures->rounds <= 2 ? INT_MAX : figures->descriptors);
    if (figures->rounds == 2) {
        figures->memory = figures->memoryEnd;
        figures->descriptors = figures->descriptorsEnd;
    }
}
} // namespace

int main(int argc, char *argv[]) {
    if (argc != 6) {
        fprintf(stderr, "usage: load_runner TOOL PRELOAD SECONDS FILES MOST\n");
        return 2;
    }
    const std::chrono::seconds time(strtol(argv[3], nullptr, 10));
    const long files = strtol(argv[4], nullptr, 10);
    const long most = strtol(argv[5], nullptr, 10);
    WorldReset(kConfig, {});
    MakeFiles(files);
    Child service({argv[1], argv[2]}, kServe, Fault{});
    WorldAwaitQueue();
    Figures figures;
    figures.sent = PinFiles(files);
    if (!AwaitStored(figures.sent)) {
        return Fail("the first requests stay queued");
    }
    long numbers[kClients] = {};
    const Clock::time_point end = Clock::now() + time;
    while (figures.rounds < 3 || Clock::now() < end) {
        figures.sent += FillQueue(numbers, most);
        if (!AwaitStored(figures.sent)) {
            return Fail("requests stay queued: " + service.Output());
        }
        ++figures.rounds;
        Look(service, &figures);
    }
    service.AwaitQuiet();
    service.Signal(SIGTERM);
    if (const int status = service.AwaitEnd(); status != 0) {
        return Fail("status " + std::to_string(status) + ": " + service.Output());
    }
    printf(
        "%ld rounds, %ld requests, %ld records of files; memory %ld kB after round 2, %ld kB at the "
        "end; descriptors %d and %d\n",
        figures.rounds, figures.sent, WorldRecords(kConfig), figures.memory, figures.memoryEnd,
        figures.descriptors, figures.descriptorsEnd);
    if (const std::string complaint = OrderComplaint(service.Output(), numbers);
        !complaint.empty()) {
        return Fail(complaint);
    }
    const bool flat = figures.memoryEnd <= figures.memory + kGrowthMaxKiB &&
                      figures.descriptorsEnd <= figures.descriptors;
    return flat && WorldRecords(kConfig) >= files ? 0 : 1;
}
