// What a crash can leave on the disk, at every point of a recorded run.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace vesk {
using Files = std::map<std::string, std::string>; // path: content

struct CrashPoint {
    size_t operations = 0; // how many were done before
    // False: the process was killed, the machine goes on. True: what was not synced is lost,
    // wholly or in part.
    bool powerCut = false;
    Files files;
    std::string driverBitmap; // what the driver was told last
    int acknowledged = 0;     // messages that the service had done with when it asked for the next
};

// The points of a run that began with these files, all of them durable, and with the driver told of
// the bitmap file's content. `record` is what record_calls wrote down. Points that leave the same
// are listed once.
std::vector<CrashPoint> CrashPointsOf(const std::string &record, const Files &start,
                                      const std::string &bitmapPath);
} // namespace vesk
