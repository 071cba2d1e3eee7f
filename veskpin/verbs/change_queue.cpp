#include "verbs/change_queue.h"

#include "base/clock.h"
#include "model/volume_look.h"

namespace vesk {
namespace {
const int64_t kTellMs = 1000;
const uint16_t kNoState = 0xFFFF;

std::string PathOf(const SpooledFile &spooled) {
    return VolumePath(spooled.mountPath, spooled.file.relativePath);
}

// It is what it was when it was looked at.
void TellNotSent(const SpooledFile &spooled, const ChangeTeller &tell) {
    const auto state = spooled.state == kNoState
                           ? std::nullopt
                           : std::optional(static_cast<FileState>(spooled.state));
    const bool isSo = static_cast<QueueAction>(spooled.action) == QueueAction::TellOnly;
    tell({PathOf(spooled), state, isSo ? std::nullopt : std::optional(ChangeReason::NotTaken)});
}
} // namespace

void ChangeQueue::Put(const std::string &mountPath, const std::string &relativePath,
                      const FileLook &look, std::optional<FileState> state, QueueAction action) {
    ++count_;
    spool_.Put({mountPath, BatchFileOf(relativePath, look),
                state ? static_cast<uint16_t>(*state) : kNoState, static_cast<uint16_t>(action)});
}

void ChangeQueue::SendAll(ChangeRun &run, const ChangeTeller &tell) {
    SpooledFile spooled;
    while (run.End() == TalkEnd::Done && spool_.Take(&spooled)) {
        const auto action = static_cast<QueueAction>(spooled.action);
        if (action == QueueAction::TellOnly) {
            run.AddSettled(spooled.mountPath, spooled.file);
        } else if (action == QueueAction::CannotSend || !run.Add(spooled.mountPath, spooled.file)) {
            TellNotSent(spooled, tell);
        }
    }
}

void ChangeQueue::SkipAll(SkipReason reason, ChangeView &view) {
    for (SpooledFile spooled; spool_.Take(&spooled);) {
        view.Skip(PathOf(spooled), reason);
    }
}

void ChangeQueue::TellRest(const ChangeTeller &tell, LookErrors *errors) {
    const int64_t began = NowMs();
    uint64_t untold = 0;
    for (SpooledFile spooled; spool_.Take(&spooled);) {
        if (NowMs() - began < kTellMs) {
            TellNotSent(spooled, tell);
        } else {
            ++untold;
        }
    }
    if (spool_.Error() != 0) {
        LookUnknownAdd(errors, "", "not every file was reached");
    } else if (untold > 0) {
        LookErrorAdd(errors, "", std::to_string(untold) + " more files were not reached");
    }
}
} // namespace vesk
