#include "act/interrupt.h"
#include "model/targets.h"
#include "verbs/change_end.h"
#include "verbs/change_queue.h"
#include "verbs/neighbours.h"
#include "verbs/verbs.h"

#include <cerrno>
#include <cstring>
#include <map>
#include <set>
#include <utility>

namespace vesk {
namespace {
const unsigned kSendSeconds = 1;

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

// Those at and below the paths, as far as there is time.
FilesOf FilesBelow(World &world, const std::vector<std::string> &paths, const Deadline &deadline) {
    FilesOf files;
    for (const std::string &path : paths) {
        if (InterruptSignal() != 0 || deadline.IsOver()) {
            break;
        }
        const Target target = TargetResolve(world, path);
        if (target.isWithoutCache) {
            LookUnknownAdd(&world.errors, target.path, "lies on a volume without a cache");
        }
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

// The service finds the blocks to let go by the file: one without any is given up. A file that has
// taken the place of a recorded one may have a pin that is not carried out yet.
bool IsItself(const KnownFile &file, const FileLook &look) {
    const auto inode = static_cast<uint32_t>(look.status.inode);
    return look.error == 0 && !look.blocks.empty() &&
           (!file.inode || file.inode == inode || file.storedInode == inode);
}

// One call: all files are looked at and kept before the first is sent.
class UnpinCall {
public:
    UnpinCall(const Settings &settings, const Deadline &deadline, ChangeView &view)
        : settings_(settings), deadline_(deadline), world_(WorldLook(settings.configPath)),
          view_(view), neighbours_(world_.errors) {}

    ExitStatus Carry() {
        for (const auto &[volume, indexes] : FilesBelow(world_, settings_.paths, deadline_)) {
            LookAt(*volume, indexes);
        }
        if (InterruptSignal() != 0 || deadline_.IsOver() || queue_.Error() != 0) {
            return ChangeEndUnsent(queue_.Error(), view_, world_.errors);
        }
        queue_.Close();
        Work work;
        work.files = queue_.Count();
        WorkProgress progress(settings_.progress, work);
        ChangeRun unpins(settings_, kRequestUnpinFiles, ChangePace::Steady, deadline_, progress,
                         world_.errors,
                         {[this](const ChangedFile &file) { Tell(file); },
                          {},
                          [this](const RequestBatch &batch) { neighbours_.Note(batch, world_); }});
        queue_.SendAll(unpins, [this](const ChangedFile &file) { Tell(file); });
        unpins.Flush();
        const Deadline soon(kSendSeconds);
        const bool isShort = unpins.End() == TalkEnd::TimeOver;
        ChangeRun pins(settings_, kRequestPinFiles, ChangePace::AtOnce, isShort ? soon : deadline_,
                       progress, world_.errors,
                       {[this](const ChangedFile &file) { TellNeighbour(file); },
                        {},
                        [this](const RequestBatch &batch) { neighbours_.NoteAgain(batch); }});
        SendNeighbours(pins, progress);
        // The next service is waited for once.
        if (pins.End() == TalkEnd::Ended) {
            unpins.GiveUp();
        }
        unpins.Finish();
        if (unpins.End() == TalkEnd::Ended) {
            pins.GiveUp();
        }
        pins.Finish();
        if (settings_.waits && unpins.End() == TalkEnd::Done && pins.End() == TalkEnd::Done) {
            neighbours_.SendOfLost(settings_.configPath, pins);
            pins.Finish();
            TellUnsent();
        }
        queue_.TellRest([this](const ChangedFile &file) { Tell(file); }, &world_.errors);
        ChangeNoteEnd(unpins, &world_.errors);
        ChangeNoteEnd(pins, &world_.errors);
        view_.End(unpins.RequestsSent() + pins.RequestsSent(), repinned_, world_.errors);
        return ChangeStatus({&unpins, &pins},
                            ExitStatusOf(world_.errors.isUnknown, view_.IsAllAsAsked()));
    }

private:
    void LookAt(const WorldVolume &world, const std::set<size_t> &indexes) {
        const Volume &volume = world.volume;
        const std::vector<KnownFile> &files = world.known.files;
        if (!volume.isMounted && !indexes.empty()) {
            LookUnknownAdd(&world_.errors, volume.mountPath, "is not mounted");
        }
        FileLooker looker(volume.mountPath);
        for (auto index = indexes.begin(); index != indexes.end();) {
            if (InterruptSignal() != 0 || deadline_.IsOver()) {
                return;
            }
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
            const std::string path = VolumePath(volume.mountPath, file->relativePath);
            const auto state = FileStateOf(file, look, FileFiguresOf(look, volume), volume);
            if (!volume.isMounted) {
                view_.Put({path, std::nullopt, std::nullopt});
            } else if (isItself) {
                const bool isUnderway = state == FileState::Unpinning && !settings_.waits;
                queue_.Put(volume.mountPath, file->relativePath, look, state,
                           isUnderway ? QueueAction::TellOnly : QueueAction::Send);
            } else {
                view_.Put({path, state, ChangeReason::NeedsRepair});
            }
        }
    }

    // Those of what was sent. That is not left half done: neither a signal nor the end of the time
    // keeps it from being sent within a second.
    void SendNeighbours(ChangeRun &pins, WorkProgress &progress) {
        InterruptGrace(kSendSeconds * 1000);
        neighbours_.Send(settings_.configPath, pins);
        progress.More(neighbours_.Count());
        pins.Flush();
        InterruptGrace(0);
        TellUnsent();
    }

    void TellUnsent() {
        for (const std::string &path : neighbours_.TakeUnsent()) {
            TellNeighbour({path, std::nullopt, ChangeReason::NotTaken});
        }
    }

    void Tell(const ChangedFile &file) {
        // One that was not sent may be a neighbour of what was.
        if (file.reason != ChangeReason::NotTaken || told_.insert(file.path).second) {
            view_.Put(file);
        }
    }

    // Of one that is not what it was each has to be told.
    void TellNeighbour(const ChangedFile &file) {
        const bool isUnderway = !settings_.waits && file.state == FileState::Pinning;
        if ((file.state == FileState::Pinned || isUnderway) && !file.reason) {
            repinned_.push_back(file.path);
        } else if (told_.insert(file.path).second) {
            view_.Put(file);
        }
    }

    const Settings &settings_;
    const Deadline &deadline_;
    World world_;
    ChangeView &view_;
    ChangeQueue queue_;
    Neighbours neighbours_;
    std::set<std::string> told_; // absolute paths, of those that could be told twice
    std::vector<std::string> repinned_;
};
} // namespace

ExitStatus UnpinCommand(const Settings &settings, TextSink &out) {
    const Deadline deadline(settings.timeoutSeconds);
    const ChangeLock lock = ChangeBegin(deadline, out);
    ChangeView view("unpin", FileState::Unpinned, FileState::Unpinning, settings, out);
    return lock.error != 0 ? ChangeLockStatus(lock, view)
                           : UnpinCall(settings, deadline, view).Carry();
}
} // namespace vesk
