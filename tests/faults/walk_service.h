// The walk's service: started, killed, brought to rest, and what it has taken off the queue.
#pragma once

#include "tests/faults/child.h"
#include "tests/faults/walk_pins.h"

#include <memory>
#include <string>
#include <vector>

namespace vesk {
const char kWalkConfig[] = "/run/faults/config.json";

class WalkService {
public:
    explicit WalkService(const Program &program) : program_(program) {}

    void Start();
    bool IsRunning() const { return child_ != nullptr; }

    // By this signal. What it has taken is learned.
    void End(int signal, const Disk &disk);

    // Until nothing waits in the queue and the receiver waits, or has ended; false: a hang.
    bool AwaitTaken() const;

    // Until all that was sent is carried out. One whose receiver has ended is started anew, as its
    // unit does it. False: a hang.
    bool AwaitRest(const Disk &disk);

    // Looks at the requests taken since the last Take: with the inodes of the document or, where it
    // has them no longer, those that the paths have. To be called before these change.
    void Learn(const Disk &disk);

    size_t TakenCount() const { return taken_.size(); } // since the last Take

    // The stored requests since the last call, in their order.
    std::vector<StoredFiles> Take();
    // Messages that were taken since then and not stored: with the service that was killed, or
    // refused for a path that is not there.
    size_t Lost() const { return lost_; }
    // What must never happen; empty: nothing of it did.
    const std::string &Complaint() const { return complaint_; }
    std::string Log() const { return log_ + (child_ ? child_->Output() : ""); }

private:
    struct Taken {
        bool isPin;
        std::string paths; // absolute, joined by ";"
    };
    void ReadTaken();
    bool IsIdle() const;
    void NoteLost(bool mayBeLost, bool hasReceiverEnded, const Disk &disk);
    const Program program_;
    std::unique_ptr<Child> child_;
    size_t read_ = 0;                  // bytes of its report
    long first_ = 0;                   // number of the first request since the last Take
    std::vector<Taken> taken_;         // all since then
    std::vector<StoredFiles> learned_; // the first of them
    size_t lost_ = 0;
    std::string complaint_;
    std::string log_; // of the services that have ended since then
};
} // namespace vesk
