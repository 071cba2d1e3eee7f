// Whether one veskpin has done what it was asked for, and told the truth about it.
#pragma once

#include "tests/faults/walk_wish.h"

namespace vesk {
struct Attempt {
    Wish wish;
    int status = 0;     // exit status, or 128 + the signal that ended it
    std::string output; // its report
    std::string errors;
    int signal = 0;               // what it was sent; 0: nothing
    bool wasServiceEnded = false; // while it ran, or there was none
    bool wasCacheLost = false;    // before its stored requests were carried out
    bool wasCacheAbsent = false;  // from the beginning to the end
};

// One attempt, and what came of it.
struct Case {
    const Attempt &attempt;
    const Beginning &begin;
    const std::vector<StoredFiles> &own; // its stored requests
    // What they were carried out on: the one at the beginning, unless files were changed while they
    // were stored.
    const Disk &disk;

    Plan plan;
    Pins then;                   // after the requests that were stored at the beginning
    Pins after;                  // and after its own
    std::set<std::string> sent;  // files of its requests,
    std::set<std::string> again; // and of those that pin neighbours again
};

// What is wrong; empty: nothing.
std::string JudgeAttempt(const Attempt &attempt, const Beginning &begin,
                         const std::vector<StoredFiles> &own, const Disk &disk);

bool CaseHasChanged(const Case &the, const std::string &path);
// Nothing came between: its requests and its report are all that is to be.
bool CaseIsWhole(const Case &the);
} // namespace vesk
