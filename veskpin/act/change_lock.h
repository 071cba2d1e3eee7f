// One veskpin at a time changes something: the others wait. Thread rule: one thread.
#pragma once

#include "act/deadline.h"
#include "base/scoped_fd.h"

#include <functional>

namespace vesk {
struct ChangeLock {
    ScopedFd file; // as long as it is open, no other changes anything
    int error = 0; // errno why it cannot be had; EINTR: a signal came, EAGAIN: the time is over
};

// Waits until no other has it; before the first wait `tell` is called. Makes /run/veskpin.
ChangeLock ChangeLockTake(const Deadline &deadline, const std::function<void()> &tell,
                          const char *folder = "/run/veskpin");
} // namespace vesk
