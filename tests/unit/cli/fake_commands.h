// The operations behind the commands, replaced by ones that print their name and arguments to
// standard output and answer what the test says. What space/ and driver/ do for main is real.
#pragma once

#include <cstdint>
#include <functional>

namespace vesk {
struct FakeCommands {
    static int result;                        // of every operation
    static std::function<void()> onOperation; // called by each, where set
    static uint64_t bitmapSize;               // bytes; what GetBitmapSizeByte finds
};
} // namespace vesk
