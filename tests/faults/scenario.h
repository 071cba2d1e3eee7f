// One run of the tool, or of its service, from a known beginning, with or without a failing call;
// and whether what it left is one of the things that it may leave.
#pragma once

#include <string>
#include <vector>

namespace vesk {
struct Program {
    std::string tool;
    std::string preload; // the shared object that lets calls fail
};

struct Fault {
    std::string kind; // empty: none
    long number = 0;  // counted from 1
    int error = 0;    // errno; 0: half the length
};

struct Scenario {
    const char *name;
    std::vector<std::string> arguments;
    int goodStatus;             // exit status without a fault
    bool isService;             // ended by SIGTERM when its requests are done
    std::vector<char> messages; // requests put on the queue, as WorldReset has them
};

struct Outcome {
    int status = -1; // exit status; 128 + the signal
    bool faultReached = false;
    std::string faultKind;
    std::string log;       // standard output
    std::string document;  // the configuration file; empty: none
    std::string bitmap;    // the bitmap file; empty: none
    int descriptors = 0;   // of the service, when its requests were done
    long allocations = 0;  // not freed at the command's end
    int messagesLeft = 0;  // on the queue
    std::string complaint; // what must never happen; empty: nothing of it did
};

// Null where there is none of that name.
const Scenario *ScenarioFind(const std::string &name);

// `descriptors`: those that a service has at rest; it is given time to come to rest.
Outcome ScenarioRun(const Program &program, const Scenario &scenario, const Fault &fault,
                    int descriptors);

// What the outcome has wrong, beside the run without a fault; empty: nothing.
std::string ScenarioJudge(const Scenario &scenario, const Outcome &good, const Outcome &outcome);
} // namespace vesk
