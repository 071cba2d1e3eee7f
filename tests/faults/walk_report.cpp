#include "tests/faults/walk_report.h"

#include "tests/faults/world.h"

#include <algorithm>
#include <csignal>
#include <cstring>
#include <json/value.h>

namespace vesk {
namespace {
using Names = std::set<std::string>;

std::string RelativePath(const Json::Value &path) {
    const std::string text = path.asString();
    return text.size() <= strlen(kWalkVolume) ? "" : text.substr(strlen(kWalkVolume) + 1);
}

Names PathsOf(const Json::Value &list) {
    Names paths;
    for (const Json::Value &entry : list) {
        paths.insert(RelativePath(entry.isObject() ? entry["path"] : entry));
    }
    return paths;
}

// Files that were changed meanwhile may be among them or not.
std::string Listed(const Case &the, const char *what, const Names &told, const Names &expected) {
    std::string text;
    for (const std::string &path : told) {
        if (expected.count(path) == 0 && !CaseHasChanged(the, path)) {
            text += std::string(what) + " too many: " + path + "\n";
        }
    }
    for (const std::string &path : expected) {
        if (told.count(path) == 0 && !CaseHasChanged(the, path)) {
            text += std::string(what) + " missing: " + path + "\n";
        }
    }
    return text;
}

// A neighbour that is pinned again on the way is told as a pin.
const char *Underway(const Case &the, const std::string &path) {
    const bool isPin = the.attempt.wish.isPin || the.again.count(path) > 0;
    return isPin ? "pinning" : "unpinning";
}

const char *Wanted(const Case &the, const std::string &path) {
    return the.attempt.wish.isPin || the.again.count(path) > 0 ? "pinned" : "unpinned";
}

// Its states once its request was carried out, or given up, up to the end: later requests may take
// and give blocks that it shares.
Names StatesWhenDone(const Case &the, const std::string &path) {
    Names states = PinsStates(the.after, the.disk, path);
    Pins pins = PinsAfter(the.begin.pins, the.begin.stored, the.disk);
    bool isDone = false;
    for (const StoredFiles &request : the.own) {
        PinsCarryOut(request, the.disk, &pins);
        isDone = isDone || std::any_of(request.files.begin(), request.files.end(),
                                       [&](const auto &file) { return file.first == path; });
        if (isDone) {
            states.merge(PinsStates(pins, the.disk, path));
        }
    }
    return states;
}

// The states in which the file may have been when it was told of.
Names StatesOf(const Case &the, const std::string &path) {
    const bool isSent = the.sent.count(path) > 0 || the.again.count(path) > 0;
    const bool isSteady = CaseIsWhole(the) && !CaseHasChanged(the, path);
    if (isSteady && the.attempt.wish.waits) {
        return StatesWhenDone(the, path);
    }
    Names states;
    const auto add = [&](const Pins &pins, const Disk &disk) {
        const Names more = PinsStates(pins, disk, path);
        states.insert(more.begin(), more.end());
    };
    add(the.after, the.begin.disk);
    add(the.after, the.disk);
    if (!isSteady || !isSent) {
        for (const Pins *pins : {&the.begin.pins, &the.then}) {
            add(*pins, the.begin.disk);
            add(*pins, the.disk);
        }
        // The bitmap file is written before the driver has it.
        Pins half = the.after;
        half.driverHasBitmap = the.begin.pins.driverHasBitmap;
        add(half, the.disk);
    }
    if (isSent || WishIsStored(the.begin, path)) {
        states.insert(Underway(the, path));
    }
    if (WishIsStored(the.begin, path)) {
        states.insert({"pinning", "unpinning"});
    }
    if (the.attempt.wasCacheLost || the.attempt.wasCacheAbsent) {
        states.insert("");
    }
    return states;
}

Names StatesBefore(const Case &the, const std::string &path) {
    Names states = PinsStates(the.begin.pins, the.begin.disk, path);
    if (WishIsStored(the.begin, path)) {
        states.insert({"pinning", "unpinning"});
    }
    const auto file = the.begin.disk.find(path);
    for (const auto &[inode, recorded] : the.begin.pins.records) {
        if (recorded == path && file != the.begin.disk.end() && file->second.inode != inode) {
            states.insert("replaced");
        }
    }
    return states;
}

// `*isAsAsked`: whether this file is what was asked for, as far as is told.
std::string JudgeFile(const Case &the, const Json::Value &file, bool *isAsAsked) {
    const std::string path = RelativePath(file["path"]);
    const std::string state = file["state"].asString(); // empty: null
    const std::string reason = file["reason"].asString();
    Names states = StatesOf(the, path);
    if (reason == "needs-repair") {
        // Told at once, and of each record of the path.
        const Names before = StatesBefore(the, path);
        states.insert(before.begin(), before.end());
    }
    const bool isWanted =
        state == Wanted(the, path) || (!the.attempt.wish.waits && state == Underway(the, path));
    *isAsAsked = isWanted && reason.empty();
    if (states.count(state) == 0) {
        std::string text = path + " is told as \"" + state + "\" and is";
        for (const std::string &one : states) {
            text += " \"" + one + "\"";
        }
        return text + "\n";
    }
    // That a file has other blocks by now is nobody's doing.
    const bool hasGrown = (state == "partial" || state == "unmarked") && CaseHasChanged(the, path);
    if (reason.empty() && !isWanted && !hasGrown) {
        return path + " is told as \"" + state + "\" without a reason\n";
    }
    if (!reason.empty() && isWanted && CaseIsWhole(the) && !CaseHasChanged(the, path)) {
        return path + " is told as \"" + state + "\" and all the same as " + reason + "\n";
    }
    return "";
}

bool AnyChanged(const Case &the) {
    return !(the.begin.disk == the.disk);
}

// All that was asked for is told of, and nothing else.
std::string JudgeLists(const Case &the, const Json::Value &report) {
    Names files = PathsOf(report["files"]);
    Names repinned = PathsOf(report["repinned"]);
    std::string text;
    for (const std::string &path : the.again) {
        // Such a one may be among the files: where it is not what it was, or nobody has waited.
        if (repinned.count(path) == 0 && files.erase(path) == 0) {
            text += "a neighbour that is pinned again is not told: " + path + "\n";
        }
        repinned.erase(path);
    }
    for (const std::string &path : the.plan.may) {
        files.erase(path);
    }
    Names told = the.plan.told;
    for (const std::string &path : the.plan.may) {
        told.erase(path);
    }
    text += Listed(the, "repinned", repinned, {}) + Listed(the, "files", files, told);
    if (the.attempt.wish.isPin) {
        Names skipped = PathsOf(report["skipped"]);
        if (the.plan.skipped.count(kWalkBitmapFile) == 0) {
            skipped.erase(kWalkBitmapFile); // another one's pin may have made it meanwhile
        }
        text += Listed(the, "skipped", skipped, the.plan.skipped);
    }
    if (report["requestsSent"].asUInt64() != the.own.size()) {
        text += "requests sent: " + std::to_string(report["requestsSent"].asUInt64()) + ", not " +
                std::to_string(the.own.size()) + "\n";
    }
    if (!AnyChanged(the) && the.plan.isRefused == report["errors"].empty()) {
        text += "errors are told: " + report["errors"].toStyledString();
    }
    return text;
}

std::string JudgeStatus(const Case &the, bool isAllAsAsked) {
    const Attempt &attempt = the.attempt;
    if (CaseIsWhole(the)) {
        const int right = the.plan.isAllSkipped ? 3 : isAllAsAsked ? 0 : 1;
        return attempt.status == right ? "" : "its status is not " + std::to_string(right) + "\n";
    }
    if (attempt.wasCacheAbsent) {
        return attempt.status == 3 ? "" : "its status is not 3\n";
    }
    const bool isRight = (attempt.status == 4 && attempt.wasServiceEnded) ||
                         (attempt.status == 130 && attempt.signal == SIGINT) ||
                         (attempt.status == 143 && attempt.signal == SIGTERM) ||
                         (attempt.status == 137 && attempt.signal == SIGKILL) ||
                         (attempt.wasCacheLost && attempt.status >= 0 && attempt.status <= 4);
    return isRight ? "" : "its status means something else\n";
}
} // namespace

std::string JudgeReport(const Case &the) {
    const Attempt &attempt = the.attempt;
    Json::Value report;
    if (!WorldParse(attempt.output, report)) {
        // The signal may come before it has begun, and the hard one at any time.
        const bool mayBeSilent =
            attempt.signal == SIGKILL || (attempt.signal != 0 && the.own.empty());
        return attempt.output.empty() || attempt.signal == SIGKILL
                   ? JudgeStatus(the, false) + (mayBeSilent ? "" : "it tells nothing\n")
                   : "its report is no document\n";
    }
    std::string text;
    Names told;
    bool isAllAsAsked = report["skipped"].empty();
    for (const Json::Value &file : report["files"]) {
        bool isAsAsked = false;
        text += JudgeFile(the, file, &isAsAsked);
        if (!told.insert(file["path"].asString()).second) {
            text += "told twice: " + file["path"].asString() + "\n";
        }
        isAllAsAsked = isAllAsAsked && isAsAsked;
    }
    if (CaseIsWhole(the)) {
        text += JudgeLists(the, report);
    }
    return text + JudgeStatus(the, isAllAsAsked);
}
} // namespace vesk
