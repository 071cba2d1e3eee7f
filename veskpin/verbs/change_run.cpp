#include "verbs/change_run.h"

#include "act/interrupt.h"
#include "act/last_look.h"
#include "base/clock.h"
#include "config/config_records.h"
#include "model/look_errors.h"
#include "model/volume_look.h"

#include <utility>

namespace vesk {
namespace {
const size_t kSettledMost = 4096; // told together, by one look
const size_t kStoredMost = 2;     // so that the service never waits for the next one
const unsigned kPauseMs = 50;
// How long the next service is waited for where no time was given.
const int64_t kRestartMs = 1500;
} // namespace

ChangeRun::ChangeRun(const Settings &settings, RequestType type, ChangePace pace,
                     const Deadline &deadline, WorkProgress &progress, LookErrors &errors,
                     ChangeHooks hooks)
    : configPath_(settings.configPath), waits_(settings.waits),
      hasTimeout_(settings.timeoutSeconds.has_value()), type_(type),
      pace_(settings.waits ? pace : ChangePace::AtOnce), deadline_(deadline), progress_(progress),
      errors_(errors), hooks_(std::move(hooks)), talk_(configPath_), watch_(configPath_),
      open_(EmptyBatch("")), settled_(EmptyBatch("")) {}

bool ChangeRun::Add(const std::string &mountPath, const BatchFile &file) {
    const std::string path = VolumePath(mountPath, file.relativePath);
    if (RequestPathCheck(mountPath, path, file.inode) != RequestPathFault::None) {
        // Only records can name such a path: as part of a request it would be another file's.
        const bool isPin = type_ == kRequestPinFiles;
        hooks_.tell(
            {path, std::nullopt, isPin ? ChangeReason::NotTaken : ChangeReason::NeedsRepair});
        return true;
    }
    if (end_ != TalkEnd::Done) {
        return false;
    }
    if (open_.mountPath == mountPath && BatchAdd(&open_, file)) {
        return true;
    }
    Flush();
    if (end_ != TalkEnd::Done) {
        return false;
    }
    open_.mountPath = mountPath;
    BatchAdd(&open_, file); // an empty one has room for every path that can be named
    return true;
}

void ChangeRun::AddSettled(const std::string &mountPath, const BatchFile &file) {
    if (settled_.mountPath != mountPath || settled_.files.size() >= kSettledMost) {
        TellSettled();
        settled_.mountPath = mountPath;
    }
    settled_.files.push_back(file);
}

void ChangeRun::TellSettled() {
    if (settled_.files.empty()) {
        return;
    }
    settled_.isSettled = true;
    OutcomeTell(configPath_, {settled_}, std::nullopt, hooks_.tell, &errors_);
    settled_ = EmptyBatch("");
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
    TellSettled();
    Tell(watch_.TakeAll(), waits_ ? std::optional(ChangeReason::NotTaken) : std::nullopt);
    progress_.End();
}

// What the service would end by, or drop records for, is not sent.
bool ChangeRun::MaySendTo(const std::string &mountPath) {
    ConfigRecords records;
    const bool isRead = ConfigReadRecords(configPath_.c_str(), &records) == 0;
    LookLogTake("");
    if (!isRead || !records.areVolumesKnown || !records.areRequestsKnown) {
        end_ = TalkEnd::BadConfig;
    } else if (!VolumeCanPin(mountPath)) {
        end_ = TalkEnd::NoCache;
    }
    return end_ == TalkEnd::Done;
}

void ChangeRun::Skip(const RequestBatch &batch, SkipReason reason) {
    if (!hooks_.skip) {
        Tell({batch}, ChangeReason::NeedsRepair);
        return;
    }
    for (const BatchFile &file : batch.files) {
        hooks_.skip(VolumePath(batch.mountPath, file.relativePath), reason);
        progress_.Done(1, file.sectors);
    }
}

// Files that have changed since they were looked at are given to `changed`, or sent where that is
// null.
void ChangeRun::Send(const RequestBatch &batch, std::vector<BatchFile> *changed) {
    const bool maySend = end_ == TalkEnd::Done &&
                         (pace_ == ChangePace::AtOnce || AwaitRoom(kStoredMost - 1)) &&
                         AwaitTurn() && MaySendTo(batch.mountPath);
    if (!maySend) {
        Tell({batch}, ChangeReason::NotTaken);
        return;
    }
    LastLook last = LastLookAt(batch);
    Tell({last.gone},
         type_ == kRequestPinFiles ? ChangeReason::Vanished : ChangeReason::NeedsRepair);
    Skip(last.empty, SkipReason::NoBlocks);
    Skip(last.unreadable, SkipReason::Unreadable);
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
    const TalkEnd sent = talk_.Send(batch);
    if (sent == TalkEnd::Ended && AwaitRestart()) {
        Send(batch, nullptr); // much may have changed meanwhile
        return;
    }
    if (sent != TalkEnd::Done) {
        end_ = end_ == TalkEnd::Done ? sent : end_;
        Tell({batch}, ChangeReason::NotTaken);
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
    Tell({batch}, ChangeReason::NotTaken);
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
        Tell(watch_.TakeFinished(), std::nullopt);
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

void ChangeRun::Tell(const std::vector<RequestBatch> &batches, std::optional<ChangeReason> reason) {
    uint64_t files = 0;
    uint64_t sectors = 0;
    for (const RequestBatch &batch : batches) {
        files += batch.files.size();
        for (const BatchFile &file : batch.files) {
            sectors += file.sectors;
        }
    }
    if (files > 0) {
        OutcomeTell(configPath_, batches, reason, hooks_.tell, &errors_);
        progress_.Done(files, sectors);
    }
}
} // namespace vesk
