#include "verbs/list.h"

#include "bitmap/pin_bitmap.h"
#include "model/path_walk.h"
#include "model/renamed.h"
#include "model/targets.h"
#include "verbs/verbs.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <map>
#include <memory>

namespace vesk {
namespace {
using Visit = std::function<void(const ListedFile &)>;

// The folder that is being summed up, with its blocks; null where none is.
struct Sum {
    ListedFolder folder;
    BlockSet blocks;
};

// The listing of one volume.
class VolumeLister {
public:
    VolumeLister(const WorldVolume &volume, std::optional<ProgressForm> search, World &world,
                 const Visit &visit)
        : world_(volume), errors_(world.errors), visit_(visit),
          isConfigKnown_(world.isConfigKnown && world.areSentKnown),
          looker_(volume.volume.mountPath) {
        if (search) {
            renamed_ = RenamedFind(volume, *search, &errors_);
        }
        absent_.error = ENODEV;
        WorldVolumeUse(world, volume);
        if (!volume.volume.isMounted) {
            LookUnknownAdd(&errors_, volume.volume.mountPath, "is not mounted");
        } else if (!volume.volume.hasCache) {
            LookUnknownAdd(&errors_, volume.volume.mountPath, "has no cache");
        } else if (looker_.Error() != 0) {
            LookUnknownAdd(&errors_, volume.volume.mountPath, strerror(looker_.Error()));
        }
    }

    // The known files with these indexes, each path once.
    void ListKnown(std::pair<size_t, size_t> range, Sum *sum) {
        for (size_t i = range.first; i < range.second;) {
            size_t end = i + 1;
            const auto &files = world_.known.files;
            while (end < range.second && files[end].relativePath == files[i].relativePath) {
                ++end;
            }
            ListPath(files[i].relativePath, nullptr, {i, end}, sum);
            i = end;
        }
    }

    // A file that was asked for, or met in a folder that was.
    void ListAsked(const std::string &relativePath, const FileStat *status, Sum *sum) {
        ListPath(relativePath, status, KnownFilesAt(world_.known, relativePath), sum);
    }

    // The files of a folder that the configuration does not know by their paths.
    void ListUnknown(const std::string &folder, Sum *sum) {
        PathWalk(looker_, folder, [&](const WalkEntry &entry) {
            const std::string &path = entry.relativePath;
            if (entry.kind == WalkKind::Unreadable && entry.error == ENAMETOOLONG) {
                // No file that deep can be pinned.
                LookErrorAdd(&errors_, PathOf(path), strerror(entry.error));
            } else if (entry.kind == WalkKind::Unreadable) {
                LookUnknownAdd(&errors_, PathOf(path), strerror(entry.error));
            } else if (entry.kind == WalkKind::File) {
                const auto range = KnownFilesAt(world_.known, path);
                if (range.first == range.second) {
                    ListPath(path, &entry.status, range, sum);
                }
            }
        });
    }

    Sum SumOf(const std::string &path) const {
        Sum sum;
        sum.folder.path = path;
        sum.blocks = BlockSetOf((world_.volume.deviceBytes.value_or(0) >> kBitmapByteShift) + 1);
        return sum;
    }

    ListedFolder Total(Sum sum) const {
        const Volume &volume = world_.volume;
        if (volume.deviceBytes) {
            sum.folder.blocks = BlockSetCount(sum.blocks);
        }
        if (volume.deviceBytes && volume.marked) {
            sum.folder.marked = BlockSetCountBoth(sum.blocks, *volume.marked);
        }
        if (volume.deviceBytes && volume.resident) {
            sum.folder.resident = BlockSetCountBoth(sum.blocks, *volume.resident);
        }
        return sum.folder;
    }

private:
    std::string PathOf(const std::string &relativePath) const {
        return VolumePath(world_.volume.mountPath, relativePath);
    }

    // What the configuration has of the file: the entry of this path with the inode that is there,
    // else any of this path, else, for a path that it does not have, the entry of this inode: a
    // hard link is judged by its own.
    const KnownFile *KnownOf(std::pair<size_t, size_t> range, const FileLook &look) const {
        for (size_t i = range.first; i < range.second; ++i) {
            const KnownFile &known = world_.known.files[i];
            if (known.inode && look.error == 0 &&
                *known.inode == static_cast<uint32_t>(look.status.inode)) {
                return &known;
            }
        }
        if (range.first < range.second) {
            return &world_.known.files[range.first];
        }
        return look.error == 0 ? KnownFileByInode(world_.known, look.status.inode) : nullptr;
    }

    void ListPath(const std::string &relativePath, const FileStat *status,
                  std::pair<size_t, size_t> range, Sum *sum) {
        const Volume &volume = world_.volume;
        const FileLook &look = volume.isMounted ? looker_.Look(relativePath, status) : absent_;
        const KnownFile *known = KnownOf(range, look);
        const FileFigures figures = FileFiguresOf(look, volume);
        const auto state = StateOf(known, look, figures);
        const std::string path = PathOf(relativePath);
        if (state == FileState::Missing || state == FileState::Replaced) {
            const auto now = renamed_.find(*known->inode);
            if (now != renamed_.end()) {
                ListRenamed(path, *known->inode, now->second);
                return;
            }
        }
        std::optional<uint64_t> inode;
        if (known != nullptr && known->inode) {
            inode = *known->inode;
        } else if (look.error == 0) {
            inode = look.status.inode;
        }
        NoteWhatIsHidden(path, look);
        visit_({volume.mountPath, path, inode, state, nullptr, figures});
        if (sum != nullptr && look.error == 0 && S_ISREG(look.status.mode)) {
            ++sum->folder.files;
            sum->folder.filesPinned += state == FileState::Pinned ? 1U : 0U;
            for (const BitRun &run : look.blocks) {
                BlockSetAdd(&sum->blocks, run);
            }
        }
    }

    // A file that the records do not have is unpinned only where they are whole.
    std::optional<FileState> StateOf(const KnownFile *known, const FileLook &look,
                                     const FileFigures &figures) {
        const bool isSure = known != nullptr || (world_.known.isWhole && world_.volume.isMounted);
        if (isConfigKnown_ && isSure) {
            return FileStateOf(known, look, figures, world_.volume);
        }
        errors_.isUnknown = true;
        return std::nullopt;
    }

    // With the figures of the file where it is now.
    void ListRenamed(const std::string &path, uint32_t inode, const std::string &relativePath) {
        const std::string pathNow = PathOf(relativePath);
        const FileFigures figures = FileFiguresOf(looker_.Look(relativePath), world_.volume);
        visit_({world_.volume.mountPath, path, inode, FileState::Renamed, &pathNow, figures});
    }

    // Root may look at everything; for others a "cannot be read" may be a lack of rights.
    void NoteWhatIsHidden(const std::string &path, const FileLook &look) {
        const bool isHidden = look.error == EACCES || look.error == EPERM;
        const bool isMapped = look.error != 0 || look.hasExtents || !S_ISREG(look.status.mode);
        if (isHidden || (!isMapped && geteuid() != 0)) {
            LookUnknownAdd(&errors_, path, strerror(isHidden ? look.error : EACCES));
        } else if (!isMapped) {
            LookErrorAdd(&errors_, path, "its blocks cannot be looked at");
        } else if (look.error != 0 && look.error != ENOENT && look.error != ENOTDIR &&
                   look.error != ENODEV) {
            LookErrorAdd(&errors_, path, strerror(look.error));
        }
    }

    const WorldVolume &world_;
    LookErrors &errors_;
    const Visit &visit_;
    const bool isConfigKnown_; // without it, and the queue, no file's state can be told
    FileLooker looker_;
    RenamedFiles renamed_;
    FileLook absent_; // of every file where the volume is not there
};

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
        Sum sum = lister.SumOf(target.path);
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
    lister.ListAsked(target.relativePath, nullptr, nullptr);
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
