// A moment up to which something is waited for. Thread rule: no state.
#pragma once

#include "base/clock.h"

#include <cstdint>
#include <optional>

namespace vesk {
class Deadline {
public:
    // Absent: never.
    explicit Deadline(const std::optional<unsigned> &seconds) {
        if (seconds) {
            end_ = NowMs() + int64_t{*seconds} * 1000;
        }
    }
    bool IsOver() const { return end_ && NowMs() >= *end_; }

private:
    std::optional<int64_t> end_;
};
} // namespace vesk
