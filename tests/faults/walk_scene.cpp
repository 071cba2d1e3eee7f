#include "tests/faults/walk_scene.h"

#include <csignal>
#include <iterator>

namespace vesk {
namespace {
const size_t kOrphansMost = 60; // of 256 blocks of the SSD
const unsigned kMomentMostUs = 70000;

template <typename Map> auto AnyOf(std::mt19937 &random, const Map &map) {
    return std::next(map.begin(), static_cast<std::ptrdiff_t>(Pick(random, map.size())));
}

// A recorded path, which may lead nowhere, or a file: rather one for which there is something to
// do.
std::string ChooseTarget(std::mt19937 &random, bool isPin, const Disk &disk, const Pins &pins) {
    if (!pins.records.empty() && Pick(random, 5) == 0) {
        return AnyOf(random, pins.records)->second;
    }
    auto file = AnyOf(random, disk);
    for (int i = 0; i < 3 && (pins.records.count(file->second.inode) > 0) == isPin; ++i) {
        file = AnyOf(random, disk);
    }
    return file->first;
}

Wish ChooseWish(std::mt19937 &random, const Disk &disk, const Pins &pins) {
    Wish wish;
    wish.isPin = Pick(random, 2) == 0;
    wish.waits = Pick(random, 4) > 0;
    if (Pick(random, 5) < 2) {
        wish.targets = {DiskFolder(random)};
    }
    for (size_t i = Pick(random, 4); wish.targets.empty() || i > 0; i -= i > 0 ? 1 : 0) {
        wish.targets.push_back(ChooseTarget(random, wish.isPin, disk, pins));
    }
    return wish;
}

size_t Orphans(const Disk &disk, const Pins &pins) {
    Blocks claimed;
    for (const auto &[path, file] : disk) {
        if (pins.records.count(file.inode) > 0) {
            claimed.insert(file.blocks.begin(), file.blocks.end());
        }
    }
    size_t orphans = 0;
    for (const uint64_t block : pins.bits) {
        orphans += claimed.count(block) == 0 ? 1 : 0;
    }
    return orphans;
}

int ChooseSignal(std::mt19937 &random) {
    const int signals[] = {SIGINT, SIGTERM, SIGKILL};
    return signals[Pick(random, std::size(signals))];
}

const char *EndingText(Ending ending) {
    switch (ending) {
    case Ending::Calm: return "";
    case Ending::ClientSignal: return "; the first gets signal ";
    case Ending::ServiceKill: return "; the service is killed";
    case Ending::ServiceGone: return "; the service is killed and stays away";
    case Ending::ServiceAbsent: return "; there is no service";
    case Ending::CacheLost: return "; the cache is lost";
    case Ending::CacheAbsent: break;
    }
    return "; the cache is not there";
}
} // namespace

Scene SceneChoose(std::mt19937 &random, const Disk &disk, const Pins &pins) {
    Scene scene;
    scene.clearsMarks = Orphans(disk, pins) > kOrphansMost;
    scene.forgetsDriver = Pick(random, 40) == 0;
    scene.momentUs = static_cast<unsigned>(Pick(random, kMomentMostUs));
    scene.wishes = {ChooseWish(random, disk, pins)};
    const Wish second = ChooseWish(random, disk, pins);
    const size_t kind = Pick(random, 100);
    if (kind < 25) {
        return scene;
    }
    if (kind < 35) {
        scene.isAtOnce = true;
        scene.wishes.push_back(second);
    } else if (kind < 52) {
        scene.isPending = true;
        scene.wishes.front().waits = false;
        scene.wishes.push_back(second);
    } else if (kind < 70) {
        scene.isPending = true;
        scene.changes = 1 + Pick(random, 6);
        if (Pick(random, 2) == 0) { // more than the service takes at once
            scene.wishes.front().targets = {""};
            scene.wishes.front().waits = true;
        }
    } else if (kind < 82) {
        scene.ending = Ending::ClientSignal;
        scene.signal = ChooseSignal(random);
        scene.isPending = Pick(random, 2) == 0;
        if (Pick(random, 3) == 0) {
            scene.isAtOnce = true;
            scene.wishes.push_back(second);
        }
    } else if (kind < 91) {
        scene.ending = Ending::ServiceKill;
        scene.isPending = Pick(random, 3) == 0;
    } else if (kind < 92) {
        scene.ending = Ending::ServiceGone;
    } else if (kind < 94) {
        scene.ending = Ending::ServiceAbsent;
    } else if (kind < 97) {
        scene.ending = Ending::CacheLost;
        scene.isPending = true;
    } else {
        scene.ending = Ending::CacheAbsent;
    }
    return scene;
}

std::string SceneText(const Scene &scene) {
    std::string text = scene.forgetsDriver ? "the driver forgets; " : "";
    text += scene.clearsMarks ? "all marks are cleared; " : "";
    text += scene.isPending ? "pending; " : "";
    for (const Wish &wish : scene.wishes) {
        text += &wish == &scene.wishes.front() ? "" : scene.isAtOnce ? " and at once " : " then ";
        text += wish.isPin ? "pin" : "unpin";
        text += wish.waits ? "" : " --no-wait";
        for (const std::string &target : wish.targets) {
            text += " " + (target.empty() ? "(all)" : target);
        }
    }
    text += scene.changes > 0 ? "; files change meanwhile" : "";
    return text + EndingText(scene.ending) +
           (scene.signal != 0 ? std::to_string(scene.signal) : "");
}
} // namespace vesk
