// The walk's model of what the service does: what is recorded and marked after each request. By the
// rules of the system, with nothing of its code.
#pragma once

#include "tests/faults/walk_disk.h"

#include <optional>
#include <utility>
#include <vector>

namespace vesk {
// As it is stored.
struct StoredFiles {
    bool isPin = true;
    std::vector<std::pair<std::string, uint32_t>> files; // path below the volume, inode
};

struct Pins {
    std::map<uint32_t, std::string> records; // inode to path
    Blocks bits;                             // of the bitmap file
    bool driverHasBitmap = false;            // the same bits
    Blocks warm; // blocks that were read since they were marked: the driver keeps them
};

// The blocks of a request's files, each found by its inode in the folder of its path. Absent: one
// is not there or has none, and the request is given up as a whole.
std::optional<Blocks> RequestBlocks(const StoredFiles &request, const Disk &disk);

// Nothing changes by one that is given up.
void PinsCarryOut(const StoredFiles &request, const Disk &disk, Pins *pins);
Pins PinsAfter(Pins pins, const std::vector<StoredFiles> &requests, const Disk &disk);

// The driver forgets, as it does when the machine is started again.
void PinsForgetDriver(Pins *pins);

// The states by which the companion may call this path; the empty text: that none can be told. More
// than one where the path was recorded with another inode and the inode with another path.
std::set<std::string> PinsStates(const Pins &pins, const Disk &disk, const std::string &path);

// Whether all of them are this one.
bool PinsAre(const Pins &pins, const Disk &disk, const std::string &path, const char *state);

// Whether the path is recorded with the inode that it has.
bool PinsHave(const Pins &pins, const Disk &disk, const std::string &path);

bool SharesBlock(const Blocks &a, const Blocks &b);
} // namespace vesk
