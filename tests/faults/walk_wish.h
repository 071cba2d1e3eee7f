// What a `veskpin pin` or `unpin` of the walk has to do: the model of the client, by its rules.
#pragma once

#include "tests/faults/walk_pins.h"

namespace vesk {
struct Wish {
    bool isPin = true;
    bool waits = true;
    std::vector<std::string> targets; // files and folders below the volume; "" is all of it
};

// What is known when it begins.
struct Beginning {
    Pins pins;
    std::vector<StoredFiles> stored; // requests that are not carried out yet
    Disk disk;
};

struct Plan {
    std::set<std::string> must;    // files to be sent,
    std::set<std::string> may;     // these too: what is stored makes them what is asked for
    std::set<std::string> told;    // what the report tells of, beyond what is left out
    std::set<std::string> skipped; // pin: left out
    bool isAllSkipped = false;     // none of the targets could be looked at
    bool isRefused = false;        // all that could be pinned has no room
};

// Whether a request that is not carried out yet names the file.
bool WishIsStored(const Beginning &beginning, const std::string &path);

Plan WishPlan(const Wish &wish, const Beginning &beginning);

// Files that stay recorded, have the recorded inode and share a block with these.
std::set<std::string> Neighbours(const Pins &pins, const std::set<std::string> &letGo,
                                 const Disk &disk, const Blocks &blocks);
} // namespace vesk
