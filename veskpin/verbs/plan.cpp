#include "verbs/plan.h"

#include "bitmap/pin_bitmap.h"
#include "model/path_walk.h"
#include "model/targets.h"
#include "verbs/answer.h"
#include "verbs/file_state.h"
#include "verbs/verbs.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <memory>
#include <utility>

namespace vesk {
namespace {
// The plan for one volume.
class VolumePlanner {
public:
    VolumePlanner(World &world, const WorldVolume &volume, Plan &plan, Progress &progress,
                  const PlanHooks &hooks)
        : world_(volume), errors_(world.errors), plan_(plan), progress_(progress), hooks_(hooks),
          looker_(volume.volume.mountPath), sum_(volume) {
        WorldVolumeUse(world, volume);
        NoteWhatIsLetGo();
    }

    const WorldVolume &Of() const { return world_; }

    bool GoesOn() const { return !hooks_.goesOn || hooks_.goesOn(); }

    void AddFile(const std::string &relativePath, const FileStat *status) {
        const FileLook &look = looker_.Look(relativePath, status);
        const std::string &mountPath = world_.volume.mountPath;
        if (const auto reason = SkipReasonOf(mountPath, relativePath, look)) {
            Skip(relativePath, *reason);
        } else if (const auto state = StateOf(relativePath, look);
                   !sum_.Add(relativePath, look, state == FileState::Pinned)) {
            Skip(relativePath, SkipReason::SameInode);
        } else if (hooks_.visit) {
            hooks_.visit(world_, relativePath, look, state);
        }
        progress_.Step();
    }

    void AddFolder(const std::string &folder) {
        const auto visit = [&](const WalkEntry &entry) {
            switch (entry.kind) {
            case WalkKind::File: AddFile(entry.relativePath, &entry.status); break;
            case WalkKind::Other: Skip(entry.relativePath, SkipReason::NotRegular); break;
            case WalkKind::OtherFileSystem:
                Skip(entry.relativePath, SkipReason::OtherFileSystem);
                break;
            case WalkKind::Unreadable:
                Skip(entry.relativePath, SkipReasonOfError(entry.error));
                break;
            }
            return true;
        };
        PathWalk(looker_, folder, visit, [this] { return GoesOn(); });
    }

    PlannedVolume Total(unsigned reservePercent) {
        for (const KnownFile &known : world_.known.files) {
            if (known.stored == kRequestPinFiles && GoesOn()) {
                sum_.AddStored(looker_.Look(known.relativePath));
                progress_.Step();
            }
        }
        return {world_.volume.mountPath, sum_.Total(reservePercent)};
    }

private:
    // A stored request to let a file go takes the blocks of its neighbours along.
    void NoteWhatIsLetGo() {
        for (const KnownFile &known : world_.known.files) {
            if (known.stored != kRequestUnpinFiles || !GoesOn()) {
                continue;
            }
            if (letGo_.empty()) {
                letGo_ = BlockSetOf(world_.volume.deviceBytes.value_or(0) >> kBitmapByteShift);
            }
            for (const BitRun &run : looker_.Look(known.relativePath).blocks) {
                BlockSetAdd(&letGo_, run);
            }
        }
    }

    // By its inode, also where that is recorded under another path: then it is pinned already.
    std::optional<FileState> StateOf(const std::string &relativePath, const FileLook &look) const {
        const auto ofInode = KnownFileByInode(world_.known, look.status.inode);
        const KnownFile *known = ofInode ? &*ofInode : nullptr;
        const auto at = KnownFilesAt(world_.known, relativePath);
        if (known == nullptr && at.first < at.second) {
            known = &world_.known.files[at.first];
        }
        const FileFigures figures = FileFiguresOf(look, world_.volume);
        const auto state = FileStateOf(known, look, figures, world_.volume);
        const bool willLoseBlocks =
            std::any_of(look.blocks.begin(), look.blocks.end(),
                        [&](const BitRun &run) { return BlockSetCountIn(letGo_, run) > 0; });
        return state == FileState::Pinned && willLoseBlocks ? FileState::Partial : state;
    }

    void Skip(const std::string &relativePath, SkipReason reason) {
        const std::string path = VolumePath(world_.volume.mountPath, relativePath);
        plan_.skipped.push_back({path, reason});
        if (reason == SkipReason::NoPermission) {
            LookUnknownAdd(&errors_, path, strerror(EACCES));
        }
    }

    const WorldVolume &world_;
    LookErrors &errors_;
    Plan &plan_;
    Progress &progress_;
    const PlanHooks &hooks_;
    FileLooker looker_;
    BlockSet letGo_; // blocks that stored requests let go
    PlanSum sum_;
};

SkipReason ReasonOfTarget(const Target &target) {
    return target.error != 0 ? SkipReasonOfError(target.error) : SkipReason::NoVolume;
}

bool CanBePlanned(const Target &target) {
    return target.error == 0 && target.volume != nullptr && !target.isWithoutCache &&
           target.volume->volume.isMounted;
}

// With "/" at the end: in the order of these texts a folder's neighbours ("a-b") do not stand
// between it and what lies below it.
std::string FolderText(const std::string &path) {
    return path == "/" ? path : path + "/";
}

// Without those that are, or lie below, another one of the same volume.
std::vector<Target> ResolveOnce(const World &world, const std::vector<std::string> &paths,
                                const PlanHooks &hooks) {
    std::vector<Target> targets;
    targets.reserve(paths.size());
    for (const std::string &path : paths) {
        if (hooks.goesOn && !hooks.goesOn()) {
            break;
        }
        targets.push_back(TargetResolve(world, path));
    }
    std::stable_sort(targets.begin(), targets.end(), [](const Target &a, const Target &b) {
        return FolderText(a.path) < FolderText(b.path);
    });
    std::vector<Target> once;
    std::vector<std::pair<std::string, const WorldVolume *>> folders; // each within the one before
    for (Target &target : targets) {
        const std::string text = FolderText(target.path);
        while (!folders.empty() &&
               text.compare(0, folders.back().first.size(), folders.back().first) != 0) {
            folders.pop_back();
        }
        // What cannot be looked at is told, also below a folder that is taken whole.
        const bool isBelow = target.error == 0 &&
                             std::any_of(folders.begin(), folders.end(), [&](const auto &folder) {
                                 return folder.second == target.volume;
                             });
        const bool isSame = !once.empty() && once.back().path == target.path;
        if (isBelow || isSame) {
            continue;
        }
        if (target.status && S_ISDIR(target.status->mode)) {
            folders.emplace_back(text, target.volume);
        }
        once.push_back(std::move(target));
    }
    return once;
}
} // namespace

Plan PlanLook(World &world, const std::vector<std::string> &paths, unsigned reservePercent,
              Progress &progress, const PlanHooks &hooks) {
    Plan plan;
    std::vector<std::unique_ptr<VolumePlanner>> planners;
    const auto plannerOf = [&](const WorldVolume &volume) -> VolumePlanner & {
        for (const auto &planner : planners) {
            if (&planner->Of() == &volume) {
                return *planner;
            }
        }
        planners.push_back(std::make_unique<VolumePlanner>(world, volume, plan, progress, hooks));
        return *planners.back();
    };
    const std::vector<Target> targets = ResolveOnce(world, paths, hooks);
    size_t failed = 0;
    for (const Target &target : targets) {
        if (!CanBePlanned(target)) {
            const bool isSure = target.error != 0 || world.areVolumesKnown;
            plan.skipped.push_back(
                {target.path, isSure ? ReasonOfTarget(target) : SkipReason::Unreadable});
            ++failed;
            if (target.error == EACCES || target.error == EPERM) {
                LookUnknownAdd(&world.errors, target.path, strerror(target.error));
            }
        } else if (S_ISDIR(target.status->mode)) {
            plannerOf(*target.volume).AddFolder(target.relativePath);
        } else {
            plannerOf(*target.volume).AddFile(target.relativePath, nullptr);
        }
        if (hooks.goesOn && !hooks.goesOn()) {
            break;
        }
    }
    plan.isAllFailed = failed == targets.size();
    for (const auto &planner : planners) {
        const Volume &volume = planner->Of().volume;
        if (volume.supportsPin.has_value() && !*volume.supportsPin) {
            LookUnknownAdd(&world.errors, volume.mountPath, "its cache is not up or cannot pin");
        }
        plan.volumes.push_back(planner->Total(reservePercent));
    }
    return plan;
}

ExitStatus PlanCommand(const Settings &settings, TextSink &out) {
    World world = WorldLook(settings.configPath);
    Plan plan;
    {
        Progress progress(settings.progress, 0);
        plan = PlanLook(world, settings.paths, settings.reservePercent, progress);
    }
    if (settings.json) {
        PlanShowJson(plan, world.errors, out);
    } else {
        PlanShowTable(plan, settings.color, out);
        AnswerErrors(world.errors);
    }
    return PlanStatus(plan, world.errors);
}
} // namespace vesk
