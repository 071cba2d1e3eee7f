// How the changing commands begin and end. Thread rule: one thread.
#pragma once

#include "act/change_lock.h"
#include "verbs/change_run.h"
#include "verbs/settings.h"

#include <initializer_list>

namespace vesk {
// Takes the lock of all changing commands; another one's end is waited for. From here on signals
// end it, also where nobody reads the answer.
ChangeLock ChangeBegin(const Deadline &deadline, TextSink &out);

// Ends the answer where the lock cannot be had.
ExitStatus ChangeLockStatus(const ChangeLock &lock, ChangeView &view);

// Ends the answer where nothing was sent since a signal came, the time is over, or, with this
// errno, the files could not be kept.
ExitStatus ChangeEndUnsent(int keepError, ChangeView &view, LookErrors &errors);

// Adds to the errors why not everything was carried out.
void ChangeNoteEnd(const ChangeRun &run, LookErrors *errors);

// The status of what was carried out, the first in the order of weight that holds for any of the
// runs or, where nothing kept the service from it, `otherwise`.
ExitStatus ChangeStatus(std::initializer_list<const ChangeRun *> runs, ExitStatus otherwise);
} // namespace vesk
