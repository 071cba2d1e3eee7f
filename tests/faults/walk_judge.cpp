#include "tests/faults/walk_judge.h"

#include "tests/faults/walk_report.h"

namespace vesk {
namespace {
using Paths = std::set<std::string>;

void Add(Blocks *blocks, const Blocks &more) {
    blocks->insert(more.begin(), more.end());
}

// Files that share a block with one that may be let go, as they were or as they are.
Paths MayBeAgain(const Case &the) {
    Blocks blocks;
    Paths letGo = the.plan.must;
    letGo.insert(the.plan.may.begin(), the.plan.may.end());
    for (const Disk *disk : {&the.begin.disk, &the.disk}) {
        for (const std::string &path : letGo) {
            const auto file = disk->find(path);
            if (file != disk->end()) {
                Add(&blocks, file->second.blocks);
            }
        }
    }
    Paths again = Neighbours(the.then, the.plan.must, the.disk, blocks);
    again.merge(Neighbours(the.then, the.plan.must, the.begin.disk, blocks));
    // Also those whose inode stays recorded under another path.
    for (const StoredFiles &request : the.begin.stored) {
        for (const auto &[path, inode] : request.files) {
            if (request.isPin && the.plan.must.count(path) == 0) {
                again.insert(path);
            }
        }
    }
    return again;
}

// Those that its requests take a block from. Who does not wait for it cannot know of changes.
Paths MustBeAgain(const Case &the) {
    const bool hasWaited = the.attempt.wish.waits && CaseIsWhole(the);
    const Disk &disk = hasWaited ? the.disk : the.begin.disk;
    Blocks cleared;
    for (const StoredFiles &request : the.own) {
        if (!request.isPin) {
            Add(&cleared, RequestBlocks(request, disk).value_or(Blocks()));
        }
    }
    return Neighbours(the.then, the.sent, disk, cleared);
}

// First what was asked for, then the neighbours; each file once, none without need.
std::string LookAtRequests(Case *the) {
    const Paths mayBeAgain = MayBeAgain(*the);
    const bool isPin = the->attempt.wish.isPin;
    std::string complaint;
    for (const StoredFiles &request : the->own) {
        const bool isAgain = !isPin && request.isPin;
        if (request.isPin != isPin && !isAgain) {
            complaint += "it unpins\n";
        }
        if (!isAgain && !the->again.empty()) {
            complaint += "it unpins after it has pinned again\n";
        }
        for (const auto &[path, inode] : request.files) {
            const bool isWanted = the->plan.must.count(path) > 0 || the->plan.may.count(path) > 0;
            // What an interrupted one has not let go stays pinned.
            const bool isKept = isWanted && the->sent.count(path) == 0 && !CaseIsWhole(*the);
            const bool isAllowed = isAgain ? mayBeAgain.count(path) > 0 || isKept : isWanted;
            const bool isNew = (isAgain ? the->again : the->sent).insert(path).second;
            if (!isAllowed || !isNew) {
                complaint +=
                    (isAgain ? "pinned again without need: " : "sent without need: ") + path + "\n";
            }
        }
    }
    return complaint;
}

std::string LookForMissing(const Case &the) {
    std::string complaint;
    for (const std::string &path : the.plan.must) {
        if (the.sent.count(path) == 0 && !CaseHasChanged(the, path)) {
            complaint += "not sent: " + path + "\n";
        }
    }
    return complaint;
}

std::string LookForNeighbours(const Case &the) {
    std::string complaint;
    const bool hasWaited = the.attempt.wish.waits && CaseIsWhole(the);
    for (const std::string &path : MustBeAgain(the)) {
        // Blocks that were not known of at first may be another neighbour's, too, who gives them
        // back.
        const bool isMended = hasWaited && PinsAre(the.after, the.disk, path, "pinned");
        if (the.again.count(path) == 0 && !isMended && !CaseHasChanged(the, path)) {
            complaint += "a neighbour is not pinned again: " + path + "\n";
        }
    }
    return complaint;
}

// A signal that it may notice leaves no neighbour behind.
bool IsEndedInOrder(const Case &the) {
    return !the.attempt.wasServiceEnded && !the.attempt.wasCacheLost &&
           (the.attempt.status == 130 || the.attempt.status == 143);
}
} // namespace

bool CaseHasChanged(const Case &the, const std::string &path) {
    const auto before = the.begin.disk.find(path);
    const auto after = the.disk.find(path);
    const bool wasThere = before != the.begin.disk.end();
    const bool isThere = after != the.disk.end();
    return wasThere && isThere ? !(before->second == after->second) : wasThere != isThere;
}

bool CaseIsWhole(const Case &the) {
    const int status = the.attempt.status;
    return !the.attempt.wasCacheLost && !the.attempt.wasCacheAbsent &&
           (status == 0 || status == 1 || (status == 3 && the.plan.isAllSkipped));
}

std::string JudgeAttempt(const Attempt &attempt, const Beginning &begin,
                         const std::vector<StoredFiles> &own, const Disk &disk) {
    Case the{attempt, begin, own, disk, WishPlan(attempt.wish, begin), {}, {}, {}, {}};
    the.then = PinsAfter(begin.pins, begin.stored, begin.disk);
    the.after = PinsAfter(PinsAfter(begin.pins, begin.stored, disk), own, disk);
    if (attempt.wasCacheLost && !own.empty()) {
        the.after.records.clear();
    }
    std::string complaint = LookAtRequests(&the);
    if (attempt.wasCacheAbsent && !own.empty()) {
        complaint += "it has sent what the service must drop, and the records with it\n";
    }
    if (CaseIsWhole(the)) {
        complaint += LookForMissing(the);
    }
    if (!attempt.wish.isPin && (CaseIsWhole(the) || IsEndedInOrder(the))) {
        complaint += LookForNeighbours(the);
    }
    return complaint + JudgeReport(the);
}
} // namespace vesk
