#include "act/interrupt.h"
#include "bitmap/pin_bitmap.h"
#include "text/units.h"
#include "verbs/change_end.h"
#include "verbs/change_queue.h"
#include "verbs/plan.h"
#include "verbs/verbs.h"

#include <algorithm>
#include <cstdlib>

namespace vesk {
namespace {
// What needs nothing to be sent always fits.
bool Fits(const PlannedVolume &volume) {
    return volume.figures.filesToSend == 0 || volume.figures.fits == true;
}

bool Fits(const Plan &plan) {
    return std::all_of(plan.volumes.begin(), plan.volumes.end(),
                       [](const PlannedVolume &volume) { return Fits(volume); });
}

// What keeps the whole call from being sent.
void NoteWhatDoesNotFit(const Plan &plan, LookErrors *errors) {
    for (const PlannedVolume &volume : plan.volumes) {
        const PlanFigures &figures = volume.figures;
        if (Fits(volume)) {
            continue;
        }
        if (!figures.fits) {
            LookUnknownAdd(errors, volume.mountPath,
                           "whether all fits is not known; nothing is sent");
        } else {
            const auto more = static_cast<uint64_t>(llabs(*figures.headroom));
            LookErrorAdd(errors, volume.mountPath,
                         UnitsOfBytes(more << kBitmapByteShift) +
                             " more than fits with the reserve; nothing is sent");
        }
    }
}

Work WorkOf(const Plan &plan) {
    Work work{0, 0, 0};
    for (const PlannedVolume &volume : plan.volumes) {
        work.files += volume.figures.filesToSend;
        *work.sectors += volume.figures.sectorsToSend;
        *work.seconds += volume.figures.seconds;
    }
    return work;
}

// One call: all files are looked at and kept before the first is sent.
class PinCall {
public:
    PinCall(const Settings &settings, const Deadline &deadline, TextSink &out)
        : settings_(settings), deadline_(deadline), world_(WorldLook(settings.configPath)),
          view_("pin", FileState::Pinned, FileState::Pinning, settings, out) {}

    ExitStatus Carry() {
        Plan plan = LookAtAll();
        if (InterruptSignal() != 0 || deadline_.IsOver() || queue_.Error() != 0) {
            return ChangeEndUnsent(queue_.Error(), view_, world_.errors);
        }
        queue_.Close();
        if (!settings_.force && !Fits(plan)) {
            NoteWhatDoesNotFit(plan, &world_.errors);
            queue_.SkipAll(SkipReason::NoRoom, view_);
            End(plan, 0);
            return ExitStatusOf(world_.errors.isUnknown || plan.isAllFailed, false);
        }
        WorkProgress progress(settings_.progress, WorkOf(plan));
        const ChangeTeller tell = [this](const ChangedFile &file) { view_.Put(file); };
        ChangeRun run(settings_, kRequestPinFiles, ChangePace::Steady, deadline_, progress,
                      world_.errors,
                      {tell,
                       [&](const std::string &path, SkipReason reason) {
                           plan.skipped.push_back({path, reason});
                       },
                       {}});
        queue_.SendAll(run, tell);
        run.Finish();
        queue_.TellRest(tell, &world_.errors);
        ChangeNoteEnd(run, &world_.errors);
        End(plan, run.RequestsSent());
        const bool isUnknown = world_.errors.isUnknown || plan.isAllFailed;
        return ChangeStatus({&run}, ExitStatusOf(isUnknown, view_.IsAllAsAsked()));
    }

private:
    Plan LookAtAll() {
        Progress progress(settings_.progress, 0);
        const PlanVisit keep = [this](const WorldVolume &volume, const std::string &relativePath,
                                      const FileLook &look, std::optional<FileState> state) {
            const bool isUnderway = state == FileState::Pinning && !settings_.waits;
            // The service would drop the records of a volume that cannot be pinned to.
            const auto action = state == FileState::Pinned || isUnderway ? QueueAction::TellOnly
                                : volume.volume.supportsPin == true      ? QueueAction::Send
                                                                         : QueueAction::CannotSend;
            queue_.Put(volume.volume.mountPath, relativePath, look, state, action);
        };
        return PlanLook(world_, settings_.paths, settings_.reservePercent, progress,
                        {keep, [this] { return InterruptSignal() == 0 && !deadline_.IsOver(); }});
    }

    void End(const Plan &plan, uint64_t requestsSent) {
        for (const SkippedPath &skipped : plan.skipped) {
            view_.Skip(skipped.path, skipped.reason);
        }
        view_.End(requestsSent, {}, world_.errors);
    }

    const Settings &settings_;
    const Deadline &deadline_;
    World world_;
    ChangeQueue queue_;
    ChangeView view_;
};
} // namespace

ExitStatus PinCommand(const Settings &settings, TextSink &out) {
    const Deadline deadline(settings.timeoutSeconds);
    const ChangeLock lock = ChangeBegin(deadline, out);
    if (lock.error != 0) {
        ChangeView view("pin", FileState::Pinned, FileState::Pinning, settings, out);
        return ChangeLockStatus(lock, view);
    }
    return PinCall(settings, deadline, out).Carry();
}
} // namespace vesk
