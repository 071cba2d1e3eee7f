#include "verbs/change_end.h"

#include "act/interrupt.h"

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>

namespace vesk {
namespace {
ExitStatus InterruptStatus() {
    return InterruptSignal() == SIGINT ? ExitStatus::Interrupted : ExitStatus::Terminated;
}

const char *TextOf(TalkEnd end) {
    switch (end) {
    case TalkEnd::Done: return nullptr;
    case TalkEnd::Interrupted: return "ended by a signal; what was sent will be carried out";
    case TalkEnd::TimeOver: return "the service has not carried it out in time";
    case TalkEnd::Ended: return "the service has ended";
    case TalkEnd::Absent: return "no service takes requests for this configuration";
    case TalkEnd::Unknown: return "whether the service takes requests cannot be told";
    case TalkEnd::NoCache:
        return "the volume is gone or has no cache that can pin: the service would drop its records";
    case TalkEnd::BadConfig:
        return "the configuration is not as it should be: a request would end the service";
    case TalkEnd::Taken: return "somebody else takes messages from the service's queue";
    case TalkEnd::NotSent: break;
    }
    return "the request cannot be sent";
}
} // namespace

ChangeLock ChangeBegin(const Deadline &deadline, TextSink &out) {
    InterruptBegin();
    out.GiveUpWhen([] { return InterruptSignal() != 0; });
    return ChangeLockTake(
        deadline, [] { fprintf(stderr, "veskpin: another veskpin changes pins; waiting\n"); });
}

ExitStatus ChangeLockStatus(const ChangeLock &lock, ChangeView &view) {
    LookErrors errors;
    ExitStatus status = ExitStatus::Unknown;
    if (lock.error == EINTR) {
        LookErrorAdd(&errors, "", "ended by a signal; nothing was sent");
        status = InterruptStatus();
    } else if (lock.error == EAGAIN) {
        LookErrorAdd(&errors, "", "another veskpin has not come to its end in time");
        status = ExitStatus::Service;
    } else {
        LookUnknownAdd(&errors, "/run/veskpin/lock", strerror(lock.error));
    }
    view.End(0, {}, errors);
    return status;
}

ExitStatus ChangeEndUnsent(int keepError, ChangeView &view, LookErrors &errors) {
    ExitStatus status = ExitStatus::Service;
    if (InterruptSignal() != 0) {
        LookErrorAdd(&errors, "", "ended by a signal; nothing was sent");
        status = InterruptStatus();
    } else if (keepError != 0) {
        LookErrorAdd(&errors, "", std::string("the files cannot be kept: ") + strerror(keepError));
        status = ExitStatus::Unknown;
    } else {
        LookErrorAdd(&errors, "", "the time is over; nothing was sent");
    }
    view.End(0, {}, errors);
    return status;
}

void ChangeNoteEnd(const ChangeRun &run, LookErrors *errors) {
    const char *text = TextOf(run.End());
    if (text != nullptr) {
        LookErrorAdd(errors, "", run.Trouble().empty() ? text : run.Trouble());
    } else if (run.HasServiceEnded()) {
        LookErrorAdd(errors, "", "the service has ended meanwhile, and runs again");
    }
}

ExitStatus ChangeStatus(std::initializer_list<const ChangeRun *> runs, ExitStatus otherwise) {
    if (InterruptSignal() != 0) {
        return InterruptStatus();
    }
    bool isUnknown = false;
    for (const ChangeRun *run : runs) {
        const TalkEnd end = run->End();
        const bool isUnsure =
            end == TalkEnd::Unknown || end == TalkEnd::NoCache || end == TalkEnd::BadConfig;
        if (run->HasServiceEnded() || (end != TalkEnd::Done && !isUnsure)) {
            return ExitStatus::Service;
        }
        isUnknown = isUnknown || isUnsure;
    }
    return isUnknown ? ExitStatus::Unknown : otherwise;
}
} // namespace vesk
