#include "tests/faults/walk_pins.h"

#include <algorithm>

namespace vesk {
namespace {
std::string FolderOf(const std::string &path) {
    const size_t slash = path.rfind('/');
    return slash == std::string::npos ? "" : path.substr(0, slash);
}

const DiskFile *FindInFolder(const Disk &disk, const std::string &folder, uint32_t inode) {
    const auto found = std::find_if(disk.begin(), disk.end(), [&](const auto &file) {
        return file.second.inode == inode && FolderOf(file.first) == folder;
    });
    return found == disk.end() ? nullptr : &found->second;
}

size_t MarkedOf(const Blocks &blocks, const Blocks &bits) {
    return static_cast<size_t>(std::count_if(
        blocks.begin(), blocks.end(), [&](uint64_t block) { return bits.count(block) > 0; }));
}

// Of a file whose inode is recorded.
const char *RecordedState(const Pins &pins, const Blocks &blocks) {
    const size_t marked = MarkedOf(blocks, pins.bits);
    if (marked < blocks.size()) {
        return marked == 0 ? "unmarked" : "partial";
    }
    return pins.driverHasBitmap ? "pinned" : "marked";
}
} // namespace

std::optional<Blocks> RequestBlocks(const StoredFiles &request, const Disk &disk) {
    Blocks all;
    for (const auto &[path, inode] : request.files) {
        const DiskFile *file = FindInFolder(disk, FolderOf(path), inode);
        if (file == nullptr || file->blocks.empty()) {
            return std::nullopt;
        }
        all.insert(file->blocks.begin(), file->blocks.end());
    }
    return all;
}

void PinsCarryOut(const StoredFiles &request, const Disk &disk, Pins *pins) {
    const std::optional<Blocks> blocks = RequestBlocks(request, disk);
    if (!blocks) {
        return;
    }
    for (const uint64_t block : *blocks) {
        if (request.isPin) {
            pins->bits.insert(block);
            pins->warm.insert(block);
        } else {
            pins->bits.erase(block);
            pins->warm.erase(block);
        }
    }
    for (const auto &[path, inode] : request.files) {
        if (request.isPin) {
            pins->records.emplace(inode, path); // a record keeps its path
        } else {
            pins->records.erase(inode);
        }
    }
    pins->driverHasBitmap = true;
}

Pins PinsAfter(Pins pins, const std::vector<StoredFiles> &requests, const Disk &disk) {
    for (const StoredFiles &request : requests) {
        PinsCarryOut(request, disk, &pins);
    }
    return pins;
}

void PinsForgetDriver(Pins *pins) {
    pins->driverHasBitmap = false;
    pins->warm.clear();
}

std::set<std::string> PinsStates(const Pins &pins, const Disk &disk, const std::string &path) {
    const auto file = disk.find(path);
    const bool isPathRecorded =
        std::any_of(pins.records.begin(), pins.records.end(),
                    [&](const auto &record) { return record.second == path; });
    if (file == disk.end()) {
        return isPathRecorded ? std::set<std::string>{"missing"}
                              : std::set<std::string>{"unpinned", ""};
    }
    const bool isInodeRecorded = pins.records.count(file->second.inode) > 0;
    std::set<std::string> states;
    if (isInodeRecorded) {
        states.insert(RecordedState(pins, file->second.blocks));
    }
    if (isPathRecorded && !PinsHave(pins, disk, path)) {
        states.insert("replaced");
    }
    return states.empty() ? std::set<std::string>{"unpinned"} : states;
}

bool PinsAre(const Pins &pins, const Disk &disk, const std::string &path, const char *state) {
    return PinsStates(pins, disk, path) == std::set<std::string>{state};
}

bool PinsHave(const Pins &pins, const Disk &disk, const std::string &path) {
    const auto file = disk.find(path);
    if (file == disk.end()) {
        return false;
    }
    const auto record = pins.records.find(file->second.inode);
    return record != pins.records.end() && record->second == path;
}

bool SharesBlock(const Blocks &a, const Blocks &b) {
    return MarkedOf(a, b) > 0;
}
} // namespace vesk
