// A program as a child process: the tool with one call that fails, or any other.
#pragma once

#include "tests/faults/scenario.h"

#include <string>
#include <sys/types.h>
#include <vector>

namespace vesk {
// What is run, and the files that it writes to.
struct Command {
    std::vector<std::string> words; // a path and its arguments
    std::string preload;            // empty: nothing
    std::string output;             // standard output
    std::string errors;             // standard error; empty: to the same
    std::string report;             // what the preloaded object writes; empty: nothing
};

class Child {
public:
    // Starts the tool; messages go to its standard output.
    Child(const Program &program, const std::vector<std::string> &arguments, const Fault &fault);
    explicit Child(const Command &command, const Fault &fault = {});
    ~Child();
    Child(const Child &) = delete;
    Child &operator=(const Child &) = delete;

    // True once it catches SIGTERM; false when it has ended before.
    bool AwaitHandler() const;
    // True once it is a service with nothing more to do and its last message written; false when it
    // has ended before, or after five minutes.
    bool AwaitQuiet() const;
    // The lowest number seen in some looks: requests open and close their own. Looks longer while
    // there are more than `enough`.
    int Descriptors(int enough) const;
    long MemoryKiB() const;        // resident
    void Signal(int number) const; // nothing once AwaitEnd has told its status
    bool HasEnded() const;
    bool HasFirstThreadEnded() const; // the others may go on
    bool IsReceiverWaiting() const;   // for the next message; true when it has ended
    // Exit status, 128 + the signal, or -1 when it has not ended within five minutes; it is killed
    // then.
    int AwaitEnd();
    bool FaultReached() const;
    long LiveAllocations() const; // at its orderly end; 0 where there was none
    std::string Report() const;   // what the preloaded object wrote
    std::string Output() const;
    std::string Errors() const;

private:
    bool IsQuiet() const;
    Command command_;
    pid_t pid_ = -1;
};
} // namespace vesk
