#include "tests/faults/walk_wish.h"

#include <algorithm>

namespace vesk {
namespace {
const size_t kSsdBlocks = 256;
const size_t kReserveBlocks = 26; // a tenth of them, rounded up

bool IsAtOrBelow(const std::string &path, const std::string &target) {
    return target.empty() || path == target || path.rfind(target + "/", 0) == 0;
}

bool IsWanted(const Wish &wish, const std::string &path) {
    return std::any_of(wish.targets.begin(), wish.targets.end(),
                       [&](const std::string &target) { return IsAtOrBelow(path, target); });
}

// The blocks of the files in stored requests of one kind.
Blocks StoredBlocks(const Beginning &beginning, bool isPin) {
    Blocks blocks;
    for (const StoredFiles &request : beginning.stored) {
        for (const auto &[path, inode] : request.files) {
            const auto file = beginning.disk.find(path);
            if (request.isPin == isPin && file != beginning.disk.end()) {
                blocks.insert(file->second.blocks.begin(), file->second.blocks.end());
            }
        }
    }
    return blocks;
}

// Marked blocks, stored pins, what is planned and a reserve stay within the SSD.
bool Fits(const Beginning &beginning, const std::set<std::string> &planned) {
    Blocks blocks = StoredBlocks(beginning, true);
    blocks.insert(beginning.pins.bits.begin(), beginning.pins.bits.end());
    for (const std::string &path : planned) {
        const Blocks &more = beginning.disk.at(path).blocks;
        blocks.insert(more.begin(), more.end());
    }
    return blocks.size() + kReserveBlocks <= kSsdBlocks;
}

// The same for the path under which its inode is recorded.
bool IsRecordStored(const Beginning &beginning, const std::string &path) {
    const auto record = beginning.pins.records.find(beginning.disk.at(path).inode);
    return record != beginning.pins.records.end() && WishIsStored(beginning, record->second);
}

void PlanPin(const Wish &wish, const Beginning &beginning, Plan *plan) {
    size_t missing = 0;
    for (const std::string &target : wish.targets) {
        const bool isThere = DiskHasFolder(target) ||
                             std::any_of(beginning.disk.begin(), beginning.disk.end(),
                                         [&](const auto &file) { return file.first == target; });
        if (!isThere) {
            plan->skipped.insert(target);
            ++missing;
        }
    }
    plan->isAllSkipped = missing == wish.targets.size();
    for (const auto &[path, file] : beginning.disk) {
        if (IsWanted(wish, path)) {
            const bool isPlanned = path != kWalkBitmapFile && !file.blocks.empty();
            (isPlanned ? plan->told : plan->skipped).insert(path);
        }
    }
    if (!Fits(beginning, plan->told)) {
        plan->skipped.insert(plan->told.begin(), plan->told.end());
        plan->told.clear();
        plan->isRefused = true;
    }
    const Pins then = PinsAfter(beginning.pins, beginning.stored, beginning.disk);
    const Blocks letGo = StoredBlocks(beginning, false);
    for (const std::string &path : plan->told) {
        if (PinsStates(then, beginning.disk, path).count("pinned") == 0) {
            plan->must.insert(path);
        } else if (WishIsStored(beginning, path) || IsRecordStored(beginning, path) ||
                   SharesBlock(beginning.disk.at(path).blocks, letGo) ||
                   !PinsAre(beginning.pins, beginning.disk, path, "pinned")) {
            plan->may.insert(path);
        }
    }
}

void PlanUnpin(const Wish &wish, const Beginning &beginning, Plan *plan) {
    const Pins then = PinsAfter(beginning.pins, beginning.stored, beginning.disk);
    for (const auto &[inode, path] : then.records) {
        if (!IsWanted(wish, path)) {
            continue;
        }
        plan->told.insert(path);
        if (PinsHave(then, beginning.disk, path) && !beginning.disk.at(path).blocks.empty()) {
            plan->must.insert(path);
        }
    }
    const auto mayBe = [&](const std::string &path) {
        if (IsWanted(wish, path) && plan->must.count(path) == 0) {
            plan->may.insert(path);
        }
    };
    for (const auto &[inode, path] : beginning.pins.records) {
        mayBe(path);
    }
    for (const StoredFiles &request : beginning.stored) {
        for (const auto &[path, inode] : request.files) {
            mayBe(path);
        }
    }
}
} // namespace

bool WishIsStored(const Beginning &beginning, const std::string &path) {
    return std::any_of(beginning.stored.begin(), beginning.stored.end(),
                       [&](const StoredFiles &request) {
                           return std::any_of(request.files.begin(), request.files.end(),
                                              [&](const auto &file) { return file.first == path; });
                       });
}

Plan WishPlan(const Wish &wish, const Beginning &beginning) {
    Plan plan;
    wish.isPin ? PlanPin(wish, beginning, &plan) : PlanUnpin(wish, beginning, &plan);
    return plan;
}

std::set<std::string> Neighbours(const Pins &pins, const std::set<std::string> &letGo,
                                 const Disk &disk, const Blocks &blocks) {
    std::set<std::string> paths;
    for (const auto &[inode, path] : pins.records) {
        if (letGo.count(path) == 0 && PinsHave(pins, disk, path) &&
            SharesBlock(disk.at(path).blocks, blocks)) {
            paths.insert(path);
        }
    }
    return paths;
}
} // namespace vesk
