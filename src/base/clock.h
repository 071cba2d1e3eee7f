// The clock that nobody sets. Thread rule: no state.
#pragma once

#include <cstdint>
#include <ctime>

namespace vesk {
// Milliseconds since some moment before the process began.
inline int64_t NowMs() {
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return int64_t{now.tv_sec} * 1000 + now.tv_nsec / 1000000;
}
} // namespace vesk
