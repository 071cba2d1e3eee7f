// fault_runner TOOL PRELOAD STEP SCENARIO...
//
// Runs each scenario again and again while the 1st, 2nd, 3rd ... call of each kind fails, until a
// run ends without having reached the call; memory allocations in steps of STEP. To be run in a
// private world with a volume at /volume1 that holds the files a and b. Prints the number of runs;
// ends with 1 when one of them broke a promise, and tells which.
#include "tests/faults/scenario.h"

#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

using namespace vesk;

namespace {
struct Kind {
    const char *name;
    std::vector<int> errors; // 0: half the length
};

const Kind kKinds[] = {
    {"open", {ENOENT, EACCES, EMFILE}},
    {"read", {EIO, EINTR, 0}},
    {"write", {ENOSPC, EIO, 0}},
    {"fsync", {EIO}},
    {"rename", {EACCES, ENOSPC}},
    {"unlink", {EACCES}},
    {"stat", {ENOMEM, EACCES}},
    {"ioctl", {EIO, ENOTTY}},
    {"lseek", {EINVAL}},
    {"malloc", {ENOMEM}},
    {"ftok", {ENOENT}},
    {"msgget", {EACCES, ENOSPC}},
    {"msgctl", {EPERM}},
    {"msgsnd", {EAGAIN, EIDRM}},
    {"msgrcv", {EIDRM, EINTR}},
    {"thread", {EAGAIN}},
    {"library", {EIO}},
};
const long kCallsMax = 100000; // a run that makes more of one kind does not end
} // namespace

int main(int argc, char *argv[]) {
    if (argc < 5) {
        fprintf(stderr, "usage: fault_runner TOOL PRELOAD STEP SCENARIO...\n");
        return 2;
    }
    const Program program{argv[1], argv[2]};
    const long step = strtol(argv[3], nullptr, 10);
    long runs = 0;
    long reached = 0;
    long broken = 0;
    for (int i = 4; i < argc; ++i) {
        const Scenario *scenario = ScenarioFind(argv[i]);
        if (scenario == nullptr) {
            fprintf(stderr, "fault_runner: no scenario %s\n", argv[i]);
            return 2;
        }
        const Outcome good = ScenarioRun(program, *scenario, Fault{}, INT_MAX);
        if (!good.complaint.empty() || good.status != scenario->goodStatus) {
            printf("%s without a fault: status %d, %s\n", argv[i], good.status,
                   good.complaint.c_str());
            return 1;
        }
        for (const Kind &kind : kKinds) {
            const long stride = strcmp(kind.name, "malloc") == 0 ? step : 1;
            for (const int error : kind.errors) {
                for (long n = 1; n < kCallsMax; n += stride) {
                    const Outcome outcome = ScenarioRun(
                        program, *scenario, Fault{kind.name, n, error}, good.descriptors);
                    ++runs;
                    std::string complaint = outcome.complaint;
                    if (complaint.empty()) {
                        complaint = ScenarioJudge(*scenario, good, outcome);
                    }
                    if (!complaint.empty()) {
                        ++broken;
                        printf("%s, %s %ld, error %d: %s\n%s", argv[i], kind.name, n, error,
                               complaint.c_str(), outcome.log.c_str());
                    }
                    if (!outcome.faultReached) {
                        break;
                    }
                    ++reached;
                }
            }
        }
        fflush(stdout);
    }
    printf("%ld runs, %ld calls failed, %ld promises broken\n", runs, reached, broken);
    return broken == 0 ? 0 : 1;
}
