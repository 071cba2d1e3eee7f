// The answer of `metrics`: Prometheus's text format. Thread rule: no state.
#pragma once

#include "verbs/file_state.h"
#include "verbs/status.h"

#include <array>
#include <cstdint>
#include <map>
#include <string>

namespace vesk {
using StateCounts = std::array<uint64_t, kFileStates>; // files, by FileState

struct MetricsView {
    StatusView status;
    std::map<std::string, StateCounts> states; // by mount path
    uint64_t errors = 0;                       // things that could not be looked at
    int64_t lookedAt = 0;                      // seconds since 1970
};

std::string MetricsText(const MetricsView &view);
} // namespace vesk
