// Going to the background so that the command returns when, and only when, its outcome is known.
//
// The process is split before anything else happens. The parent waits and ends with the daemon's
// outcome; the daemon goes on, may still print to the terminal, and reports once that it is ready.
// To be used from one thread before others are started, except BackgroundReady.
#pragma once

#include "base/scoped_fd.h"

namespace vesk {
// The daemon's end of the line to the waiting parent.
struct Background {
    ScopedFd ready; // not open: not in the background, or already reported
};

// Splits the process. Returns in the daemon only, or with false when it cannot be split (message on
// standard error). The parent ends: with 0 after BackgroundReady, with 1 when the
// daemon ended before that.
bool BackgroundStart(Background &background);

// Lets the parent end with 0 and leaves terminal and folder: a session of its own, standard streams
// on /dev/null, working folder "/". Does nothing without a waiting parent. Call it once.
void BackgroundReady(Background &background);
} // namespace vesk
