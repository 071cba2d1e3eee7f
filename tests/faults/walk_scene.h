// One step of the walk: what happens at once or one after the other, until all is at rest.
#pragma once

#include "tests/faults/walk_disk.h"
#include "tests/faults/walk_wish.h"

#include <random>
#include <string>
#include <vector>

namespace vesk {
enum class Ending {
    Calm,          // clients run to their end
    ClientSignal,  // the first gets a signal at a random moment
    ServiceKill,   // the service is killed at one, and started again at once
    ServiceGone,   // the same, and it is started when the clients have ended
    ServiceAbsent, // there is none
    CacheLost,     // the cache is not in the list while requests are stored
    CacheAbsent,   // nor while the clients run
};

struct Scene {
    std::vector<Wish> wishes;
    bool isAtOnce = false;  // else the next begins when the one before has ended
    bool isPending = false; // the volume is, until the clients have ended or wait
    size_t changes = 0;     // of files meanwhile
    Ending ending = Ending::Calm;
    int signal = 0; // to the first client
    unsigned momentUs = 0;
    bool forgetsDriver = false; // before, as when the machine is started again
    bool clearsMarks = false;   // before, by hand
};

Scene SceneChoose(std::mt19937 &random, const Disk &disk, const Pins &pins);
std::string SceneText(const Scene &scene);
} // namespace vesk
