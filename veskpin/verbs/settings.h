// What the command line asks for. Thread rule: written once, then only read.
#pragma once

#include "text/progress.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace vesk {
struct Settings {
    std::string configPath;
    bool json = false;  // one JSON document instead of tables
    bool color = false; // of tables
    ProgressForm progress = ProgressForm::None;
    std::vector<std::string> paths; // PATHs, those of --files-from behind the others
    std::vector<std::string> volumes;
    bool nulSeparated = false;              // -0
    bool search = false;                    // --search
    unsigned reservePercent = 10;           // --reserve: of the SSD
    std::string output;                     // --output; empty: standard output
    bool waits = true;                      // without --no-wait
    bool force = false;                     // --force
    std::optional<unsigned> timeoutSeconds; // --timeout
};

enum class ExitStatus : int {
    Done = 0,          // as asked; yes; nothing found
    NotSo = 1,         // something asked for is not so
    Usage = 2,         // nothing was done
    Unknown = 3,       // what was asked for could not be looked at
    Service = 4,       // the service does not run, has ended or did not carry it out in time
    Interrupted = 130, // by SIGINT
    Terminated = 143,  // by SIGTERM, or the end of the terminal
};

// The first in the order of weight that holds.
inline ExitStatus ExitStatusOf(bool isUnknown, bool isSo) {
    return isUnknown ? ExitStatus::Unknown : isSo ? ExitStatus::Done : ExitStatus::NotSo;
}
} // namespace vesk
