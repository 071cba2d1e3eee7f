#include "verbs/change_run.h"

#include "act/interrupt.h"
#include "act/last_look.h"
#include "base/clock.h"
#include "model/volume_look.h"

#include <utility>

namespace vesk {
namespace {
const size_t kStoredMost = 2; // so that the service never waits for the next one
const unsigned kPauseMs = 50;
// How long the next service is waited for where no time was given.
const int64_t kRestartMs = 1500;
} // namespace

ChangeRun::ChangeRun(const Settings &settings, RequestType type, ChangePace pace,
                     const Deadline &deadline, WorkProgress &progress, ChangeHooks hooks)
    : configPath_(settings.configPath), waits_(settings.waits),
      hasTimeout_(settings.timeoutSeconds.has_value()), type_(type),
      pace_(settings.waits ? pace : ChangePace::AtOnce), deadline_(deadline), progress_(progress),
      hooks_(std::move(hooks)), talk_(configPath_), watch_(configPath_), open_(EmptyBatch("")) {}

void ChangeRun::Add(const std::string &mountPath, const std::string &relativePath,
                    const FileLook &look, std::optional<FileState> state) {
    const std::string path = VolumePath(mountPath, relativePath);
    const auto inode = static_cast<uint32_t>(look.status.inode);
    if (RequestPathCheck(mountPath, path, inode) != RequestPathFault::None) {
        // Only records can name such a path: as part of a request it would be another file's.
        hooks_.tell(
            {path, state,
             type_ == kRequestPinFiles ? ChangeReason::NotTaken : ChangeReason::NeedsRepair});
        return;
    }
    if (end_ != TalkEnd::Done) {
        hooks_.tell({path, state, ChangeReason::NotTaken});
        return;
    }
    const BatchFile file{relativePath, inode, look.status.bytes, BlocksIn(look.blocks)};
    if (open_.mountPath == mountPath && BatchAdd(&open_, file)) {
        return;
    }
    Flush();
    open_.mountPath = mountPath;
    BatchAdd(&open_, file); // an empty one has room for every path that can be named
}

void ChangeRun::Flush() {
    RequestBatch batch = std::exchange(open_, EmptyBatch(open_.mountPath));
    if (batch.files.empty()) {
        return;
    }
    // A file that something changes now may take those down that are with it.
    std::vector<BatchFile> changed;
    const std::string mountPath = batch.mountPath;
    Send(batch, &changed);
    for (const BatchFile &file : changed) {
        RequestBatch alone = EmptyBatch(mountPath);
        BatchAdd(&alone, file);
        Send(alone, nullptr);
    }
}

void ChangeRun::Finish() {
    Flush();
    if (waits_ && end_ == TalkEnd::Done) {
        AwaitRoom(0);
    }
    for (const RequestBatch &batch : watch_.TakeAll()) {
        Tell(batch, waits_ ? std::optional(ChangeReason::NotTaken) : std::nullopt);
    }
}

// Files that have changed since they were looked at are given to `changed`, or sent where that is
// null.
void ChangeRun::Send(const RequestBatch &batch, std::vector<BatchFile> *changed) {
    bool hasTurn = end_ == TalkEnd::Done &&
                   (pace_ == ChangePace::AtOnce || AwaitRoom(kStoredMost - 1)) && AwaitTurn();
    if (hasTurn && !VolumeCanPin(batch.mountPath)) {
        end_ = TalkEnd::NoCache;
        hasTurn = false;
    }
    if (!hasTurn) {
        Tell(batch, ChangeReason::NotTaken);
        return;
    }
    LastLook last = LastLookAt(batch);
    if (!last.gone.files.empty()) {
        Tell(last.gone,
             type_ == kRequestPinFiles ? ChangeReason::Vanished : ChangeReason::NeedsRepair);
    }
    if (changed != nullptr) {
        *changed = std::move(last.changed);
    } else {
        for (const BatchFile &file : last.changed) {
            BatchAdd(&last.calm, file);
        }
    }
    if (!last.calm.files.empty()) {
        SendNow(std::move(last.calm));
    }
}

void ChangeRun::SendNow(RequestBatch batch) {
    TalkEnd sent = talk_.Send(batch);
    while (sent == TalkEnd::Ended && AwaitRestart() && AwaitTurn()) {
        sent = talk_.Send(batch);
    }
    if (sent != TalkEnd::Done) {
        end_ = end_ == TalkEnd::Done ? sent : end_;
        Tell(batch, ChangeReason::NotTaken);
        return;
    }
    ++sent_;
    if (hooks_.sent) {
        hooks_.sent(batch);
    }
    TalkEnd taken = talk_.AwaitTurn(deadline_);
    if (taken == TalkEnd::Ended) {
        // Whether it was stored before that shows when the next one has emptied the queue.
        batch.mayBeLost = true;
        taken = AwaitRestart() && AwaitTurn() ? TalkEnd::Done : end_;
    }
    if (taken == TalkEnd::Done) {
        watch_.Add(std::move(batch));
        return;
    }
    end_ = taken;
    Tell(batch, ChangeReason::NotTaken);
}

// Until the service takes a message. False: never again.
bool ChangeRun::AwaitTurn() {
    for (;;) {
        const TalkEnd end = talk_.AwaitTurn(deadline_);
        if (end == TalkEnd::Done) {
            return true;
        }
        if (end != TalkEnd::Ended) {
            end_ = end;
            return false;
        }
        if (!AwaitRestart()) {
            return false;
        }
    }
}

// Until at most so many requests are stored. False: never again.
bool ChangeRun::AwaitRoom(size_t most) {
    for (;;) {
        for (const RequestBatch &batch : watch_.TakeFinished()) {
            Tell(batch, std::nullopt);
        }
        if (watch_.Waiting().size() <= most) {
            return true;
        }
        progress_.Tick();
        const TalkState state = talk_.Look();
        if (state == TalkState::Ended && !AwaitRestart()) {
            return false;
        }
        if (state == TalkState::Unknown || state == TalkState::Absent) {
            end_ = state == TalkState::Unknown ? TalkEnd::Unknown : TalkEnd::Absent;
        } else if (!InterruptPause(kPauseMs)) {
            end_ = TalkEnd::Interrupted;
        } else if (deadline_.IsOver()) {
            end_ = TalkEnd::TimeOver;
        }
        if (end_ != TalkEnd::Done) {
            return false;
        }
    }
}

// A service that has ended may be started again by whoever watches it, within the time given.
bool ChangeRun::AwaitRestart() {
    hasServiceEnded_ = true;
    talk_.Forget();
    const int64_t began = NowMs();
    for (;;) {
        const TalkState state = talk_.Look();
        if (state == TalkState::Takes || state == TalkState::Busy) {
            return true;
        }
        if (state == TalkState::Ended) {
            talk_.Forget();
        }
        if (!InterruptPause(kPauseMs)) {
            end_ = TalkEnd::Interrupted;
            return false;
        }
        const bool isOver = hasTimeout_ ? deadline_.IsOver() : NowMs() - began >= kRestartMs;
        if (isOver) {
            end_ = TalkEnd::Ended;
            return false;
        }
        progress_.Tick();
    }
}

void ChangeRun::Tell(const RequestBatch &batch, std::optional<ChangeReason> reason) {
    uint64_t blocks = 0;
    for (const BatchFile &file : batch.files) {
        blocks += file.blocks;
    }
    OutcomeTell(configPath_, batch, reason, hooks_.tell);
    progress_.Done(batch.files.size(), blocks);
}
} // namespace vesk
