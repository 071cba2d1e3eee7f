#include "act/interrupt.h"
#include "base/clock.h"
#include "bitmap/pin_bitmap.h"
#include "text/units.h"
#include "verbs/change_end.h"
#include "verbs/plan.h"
#include "verbs/verbs.h"

#include <algorithm>
#include <cstdlib>

namespace vesk {
namespace {
// After a signal the files that were not reached are told as such for so long.
const int64_t kTellMs = 1000;

// What keeps the whole call from being sent.
void NoteWhatDoesNotFit(const Plan &plan, LookErrors *errors) {
    for (const PlannedVolume &volume : plan.volumes) {
        const PlanFigures &figures = volume.figures;
        if (!figures.fits) {
            LookUnknownAdd(errors, volume.mountPath,
                           "whether all fits is not known; nothing is sent");
        } else if (!*figures.fits) {
            const auto more = static_cast<uint64_t>(llabs(*figures.headroom));
            LookErrorAdd(errors, volume.mountPath,
                         UnitsOfBytes(more << kBitmapByteShift) +
                             " more than fits with the reserve; nothing is sent");
        }
    }
}

bool Fits(const Plan &plan) {
    return std::all_of(plan.volumes.begin(), plan.volumes.end(),
                       [](const PlannedVolume &volume) { return volume.figures.fits == true; });
}

Work WorkOf(const Plan &plan) {
    Work work{0, 0, 0};
    for (const PlannedVolume &volume : plan.volumes) {
        work.files += volume.figures.filesToSend;
        *work.blocks += volume.figures.blocksToSend;
        *work.seconds += volume.figures.seconds;
    }
    return work;
}

// One call: the files are looked at twice, first for what they cost together, then each to be sent.
class PinCall {
public:
    PinCall(const Settings &settings, const Deadline &deadline, TextSink &out)
        : settings_(settings), deadline_(deadline), world_(WorldLook(settings.configPath)),
          view_("pin", FileState::Pinned, FileState::Pinning, settings, out) {}

    ExitStatus Carry() {
        const Plan whole = LookAtAll();
        if (InterruptSignal() != 0) {
            LookErrorAdd(&world_.errors, "", "ended by a signal; nothing was sent");
            view_.End(0, {}, world_.errors);
            return ChangeStatus({}, ExitStatus::Done);
        }
        isRefused_ = !settings_.force && !Fits(whole);
        if (isRefused_) {
            NoteWhatDoesNotFit(whole, &world_.errors);
        }
        WorkProgress progress(isRefused_ ? ProgressForm::None : settings_.progress, WorkOf(whole));
        ChangeRun run(settings_, kRequestPinFiles, ChangePace::Steady, deadline_, progress,
                      {[this](const ChangedFile &file) { view_.Put(file); }, {}});
        const Plan each = SendEach(run);
        run.Finish();
        for (const SkippedPath &skipped : each.skipped) {
            view_.Skip(skipped.path, skipped.reason);
        }
        ChangeNoteEnd(run, &world_.errors);
        view_.End(run.RequestsSent(), {}, world_.errors);
        return ChangeStatus({&run}, ExitStatusOf(world_.errors.isUnknown || each.isAllFailed,
                                                 view_.IsAllAsAsked()));
    }

private:
    Plan LookAtAll() {
        Progress progress(settings_.progress, 0);
        return PlanLook(world_, settings_.paths, settings_.reservePercent, progress,
                        {{}, [] { return InterruptSignal() == 0; }});
    }

    Plan SendEach(ChangeRun &run) {
        Progress quiet(ProgressForm::None, 0);
        Plan plan;
        std::vector<SkippedPath> refused;
        const PlanVisit visit = [&](const WorldVolume &volume, const std::string &relativePath,
                                    const FileLook &look, std::optional<FileState> state) {
            const std::string &mountPath = volume.volume.mountPath;
            const std::string path = VolumePath(mountPath, relativePath);
            if (isRefused_) {
                refused.push_back({path, SkipReason::NoRoom});
            } else if (state == FileState::Pinned ||
                       (state == FileState::Pinning && !settings_.waits)) {
                view_.Put({path, state, std::nullopt});
            } else if (volume.volume.supportsPin != true) {
                // The service would drop the volume's records.
                view_.Put({path, state, ChangeReason::NotTaken});
            } else {
                run.Add(mountPath, relativePath, look, state);
            }
        };
        std::optional<int64_t> signalSeen;
        plan = PlanLook(world_, settings_.paths, settings_.reservePercent, quiet,
                        {visit, [&] {
                             if (InterruptSignal() == 0) {
                                 return true;
                             }
                             signalSeen = signalSeen.value_or(NowMs());
                             return NowMs() - *signalSeen < kTellMs;
                         }});
        plan.skipped.insert(plan.skipped.end(), refused.begin(), refused.end());
        return plan;
    }

    const Settings &settings_;
    const Deadline &deadline_;
    World world_;
    ChangeView view_;
    bool isRefused_ = false;
};
} // namespace

ExitStatus PinCommand(const Settings &settings, TextSink &out) {
    const Deadline deadline(settings.timeoutSeconds);
    const ChangeLock lock = ChangeBegin(deadline);
    if (lock.error != 0) {
        ChangeView view("pin", FileState::Pinned, FileState::Pinning, settings, out);
        return ChangeLockStatus(lock, view);
    }
    return PinCall(settings, deadline, out).Carry();
}
} // namespace vesk
