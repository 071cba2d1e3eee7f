// How far a long look has come.
//
// Thread rule: one owner.
#pragma once

#include "text/progress_line.h"

#include <cstdint>

namespace vesk {
class Progress {
public:
    // `total` files, 0: not known. Writes to this descriptor, which stays the caller's.
    Progress(ProgressForm form, uint64_t total, int fd = 2) : line_(form, fd), total_(total) {}

    // One more file.
    void Step();

private:
    ProgressLine line_;
    const uint64_t total_;
    uint64_t files_ = 0;
};
} // namespace vesk
