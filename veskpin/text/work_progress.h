// How far the service has come with what it was sent, and how long the rest will take. It takes
// about a request a second, and reads what it pins: the plan's estimate, corrected by how long the
// part that is done took.
//
// Thread rule: one owner.
#pragma once

#include "text/progress_line.h"

#include <cstdint>
#include <optional>
#include <string>

namespace vesk {
struct Work {
    uint64_t files = 0;
    std::optional<uint64_t> sectors; // that they have on the device; absent: not known
    std::optional<uint64_t> seconds; // that all will take
};

class WorkProgress {
public:
    // Writes to this descriptor, which stays the caller's.
    WorkProgress(ProgressForm form, const Work &work, int fd = 2) : line_(form, fd), work_(work) {}

    // More files have turned up.
    void More(uint64_t files) { work_.files += files; }

    // So many files, with so many sectors together, have come to rest.
    void Done(uint64_t files, uint64_t sectors);

    // Tells the end to programs that were told something else.
    void End();

    // Tells it when it is time to; for whoever waits, now and then.
    void Tick();

private:
    double Share() const;
    std::optional<uint64_t> SecondsLeft(int64_t elapsedMs) const;
    std::string JsonText() const;
    std::string LineText() const;
    ProgressLine line_;
    Work work_;
    uint64_t files_ = 0;
    uint64_t sectors_ = 0;
    uint64_t filesTold_ = 0; // in the last line
};
} // namespace vesk
