#include "verbs/list.h"

#include "model/targets.h"
#include "verbs/verbs.h"
#include "verbs/volume_lister.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <map>
#include <memory>

namespace vesk {
namespace {
using Visit = VolumeLister::Visit;

// The path cannot be looked at. Who lacks the right to is told so, whatever else was asked for.
void NoteFailedPath(const Target &target, const std::string &text, LookErrors &errors,
                    ListResult *result) {
    ++result->failedPaths;
    if (target.error == EACCES || target.error == EPERM) {
        LookUnknownAdd(&errors, target.path, text);
    } else {
        LookErrorAdd(&errors, target.path, text);
    }
}

// A path that lies on no volume with a cache.
void ListElsewhere(const Target &target, World &world, const Visit &visit, ListResult *result) {
    const std::string none;
    const char *text = target.isWithoutCache ? "lies on a volume without a cache"
                       : target.error != 0   ? strerror(target.error)
                                             : "lies on no volume";
    NoteFailedPath(target, text, world.errors, result);
    if (target.status && S_ISREG(target.status->mode)) {
        FileFigures figures;
        figures.bytes = target.status->bytes;
        const bool isSure = world.areVolumesKnown && world.isConfigKnown;
        visit({none, target.path, target.status->inode,
               isSure ? std::optional(FileState::Unpinned) : std::nullopt, nullptr, figures});
    }
}

// The listers of the volumes that were met: what they look up for a volume is looked up once.
using Listers = std::map<const WorldVolume *, std::unique_ptr<VolumeLister>>;

void ListTarget(const Target &target, std::optional<ProgressForm> search, World &world,
                const Visit &visit, Listers *listers, ListResult *result) {
    if (target.volume == nullptr) {
        ListElsewhere(target, world, visit, result);
        return;
    }
    std::unique_ptr<VolumeLister> &owner = (*listers)[target.volume];
    if (owner == nullptr) {
        owner = std::make_unique<VolumeLister>(*target.volume, search, world, visit);
    }
    VolumeLister &lister = *owner;
    const KnownFiles &known = target.volume->known;
    const auto below = KnownFilesBelow(known, target.relativePath);
    const bool isFolder = target.status && S_ISDIR(target.status->mode);
    const bool isHidden = target.error != 0 && target.error != ENOENT && target.error != ENOTDIR;
    if (isHidden) {
        NoteFailedPath(target, strerror(target.error), world.errors, result);
    }
    if (isFolder || (!target.status && below.first < below.second)) {
        ListSum sum = lister.SumOf(target.path);
        lister.ListKnown(below, &sum);
        if (target.status && target.volume->volume.isMounted) {
            lister.ListUnknown(target.relativePath, &sum);
        }
        result->folders.push_back(lister.Total(std::move(sum)));
        return;
    }
    const auto at = KnownFilesAt(known, target.relativePath);
    if (!target.status && at.first == at.second) {
        if (!isHidden) {
            NoteFailedPath(target, strerror(target.error), world.errors, result);
        }
        return;
    }
    lister.ListAsked(target.relativePath);
}

uint64_t KnownCount(const World &world) {
    uint64_t count = 0;
    for (const WorldVolume &volume : world.volumes) {
        count += volume.known.files.size();
    }
    return count;
}
} // namespace

ListResult ListLook(World &world, const std::vector<std::string> &paths,
                    std::optional<ProgressForm> search, const Visit &visit) {
    ListResult result;
    if (paths.empty()) {
        for (const WorldVolume &volume : world.volumes) {
            if (!volume.known.files.empty()) {
                VolumeLister(volume, search, world, visit)
                    .ListKnown({0, volume.known.files.size()}, nullptr);
            }
        }
    }
    Listers listers;
    for (const std::string &path : paths) {
        ListTarget(TargetResolve(world, path), search, world, visit, &listers, &result);
    }
    return result;
}

ExitStatus ListCommand(const Settings &settings, TextSink &out) {
    World world = WorldLook(settings.configPath);
    ListView view(out, settings.json, settings.color);
    ListResult result;
    {
        // Rows on a terminal are progress enough, and a line in their midst would spoil them.
        const bool areRowsSeen =
            !settings.json && isatty(STDOUT_FILENO) == 1 && settings.progress == ProgressForm::Line;
        Progress progress(areRowsSeen ? ProgressForm::None : settings.progress,
                          settings.paths.empty() ? KnownCount(world) : 0);
        const auto search = settings.search ? std::optional(settings.progress) : std::nullopt;
        result = ListLook(world, settings.paths, search, [&](const ListedFile &file) {
            view.Put(file);
            progress.Step();
        });
    }
    view.End(result.folders, world.errors);
    const bool allFailed = !settings.paths.empty() && result.failedPaths == settings.paths.size();
    return ExitStatusOf(world.errors.isUnknown || allFailed,
                        view.IsAllPinned() && result.failedPaths == 0);
}
} // namespace vesk
