#include "act/interrupt.h"
#include "model/targets.h"
#include "verbs/change_end.h"
#include "verbs/neighbours.h"
#include "verbs/verbs.h"

#include <cerrno>
#include <cstring>
#include <map>
#include <set>
#include <utility>

namespace vesk {
namespace {
const unsigned kGraceMs = 1000;

// The known files of each volume, by their indexes.
using FilesOf = std::map<const WorldVolume *, std::set<size_t>>;

// What is nowhere is not recorded either; what is hidden may be.
void NoteFailedPath(const Target &target, LookErrors *errors) {
    if (target.error == ENOENT || target.error == ENOTDIR) {
        LookErrorAdd(errors, target.path, strerror(target.error));
    } else if (target.error != 0) {
        LookUnknownAdd(errors, target.path, strerror(target.error));
    }
}

// Those at and below the paths.
FilesOf FilesBelow(World &world, const std::vector<std::string> &paths) {
    FilesOf files;
    for (const std::string &path : paths) {
        const Target target = TargetResolve(world, path);
        if (target.volume == nullptr) {
            NoteFailedPath(target, &world.errors);
            continue;
        }
        WorldVolumeUse(world, *target.volume);
        std::set<size_t> &indexes = files[target.volume];
        const KnownFiles &known = target.volume->known;
        for (const auto &range : {KnownFilesAt(known, target.relativePath),
                                  KnownFilesBelow(known, target.relativePath)}) {
            for (size_t i = range.first; i < range.second; ++i) {
                indexes.insert(i);
            }
        }
    }
    return files;
}

// The service finds the blocks to let go by the file: one without any is given up.
bool IsItself(const KnownFile &file, const FileLook &look) {
    return look.error == 0 && !look.blocks.empty() &&
           (!file.inode || *file.inode == static_cast<uint32_t>(look.status.inode));
}

void SendUnpins(const WorldVolume &world, const std::set<size_t> &indexes, ChangeRun &run,
                ChangeView &view) {
    const Volume &volume = world.volume;
    FileLooker looker(volume.mountPath);
    const std::vector<KnownFile> &files = world.known.files;
    for (auto index = indexes.begin(); index != indexes.end();) {
        const KnownFile *file = &files[*index];
        const FileLook &look = looker.Look(file->relativePath);
        bool isItself = IsItself(*file, look);
        // A path has a record for each inode that was pinned under it; it is told once.
        while (++index != indexes.end() && files[*index].relativePath == file->relativePath) {
            if (!isItself) {
                file = &files[*index];
                isItself = IsItself(*file, look);
            }
        }
        const auto state = FileStateOf(file, look, FileFiguresOf(look, volume), volume);
        if (isItself) {
            run.Add(volume.mountPath, file->relativePath, look, state);
        } else {
            view.Put({VolumePath(volume.mountPath, file->relativePath), state,
                      ChangeReason::NeedsRepair});
        }
    }
}

// Sends the neighbours of what was sent. That is not left half done: neither a signal nor the end
// of the time keeps it from being sent within a second.
void SendNeighbours(Neighbours &neighbours, const Settings &settings, ChangeRun &pins) {
    InterruptGrace(kGraceMs);
    neighbours.Send(settings.configPath, pins);
    pins.Flush();
    InterruptGrace(0);
}
} // namespace

ExitStatus UnpinCommand(const Settings &settings, TextSink &out) {
    const Deadline deadline(settings.timeoutSeconds);
    const ChangeLock lock = ChangeBegin(deadline);
    ChangeView view("unpin", FileState::Unpinned, FileState::Unpinning, settings, out);
    if (lock.error != 0) {
        return ChangeLockStatus(lock, view);
    }
    World world = WorldLook(settings.configPath);
    const FilesOf files = FilesBelow(world, settings.paths);
    Work work;
    for (const auto &[volume, indexes] : files) {
        work.files += indexes.size();
    }
    WorkProgress progress(settings.progress, work);
    Neighbours neighbours(world.errors);
    ChangeRun unpins(settings, kRequestUnpinFiles, ChangePace::Steady, deadline, progress,
                     {[&](const ChangedFile &file) { view.Put(file); },
                      [&](const RequestBatch &batch) { neighbours.Note(batch, world); }});
    for (const auto &[volume, indexes] : files) {
        SendUnpins(*volume, indexes, unpins, view);
    }
    unpins.Flush();

    const Deadline soon(1);
    std::vector<std::string> repinned;
    WorkProgress quiet(ProgressForm::None, {});
    ChangeRun pins(settings, kRequestPinFiles, ChangePace::AtOnce,
                   unpins.End() == TalkEnd::TimeOver ? soon : deadline, quiet,
                   {[&](const ChangedFile &file) {
                        const bool isUnderway = !settings.waits && file.state == FileState::Pinning;
                        // Of a neighbour that is not what it was each has to be told.
                        if ((file.state == FileState::Pinned || isUnderway) && !file.reason) {
                            repinned.push_back(file.path);
                        } else {
                            view.Put(file);
                        }
                    },
                    {}});
    SendNeighbours(neighbours, settings, pins);
    unpins.Finish();
    pins.Finish();

    ChangeNoteEnd(unpins, &world.errors);
    ChangeNoteEnd(pins, &world.errors);
    view.End(unpins.RequestsSent() + pins.RequestsSent(), repinned, world.errors);
    return ChangeStatus({&unpins, &pins},
                        ExitStatusOf(world.errors.isUnknown, view.IsAllAsAsked()));
}
} // namespace vesk
