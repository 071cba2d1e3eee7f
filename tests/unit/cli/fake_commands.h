// The operations behind the commands, replaced by ones that print their name and arguments to
// standard output and answer what the test says. What space/ and driver/ do for main is real.
#pragma once

#include <cstdint>

namespace vesk {
struct FakeCommands {
    static int result;          // of every operation
    static uint64_t bitmapSize; // bytes; what GetBitmapSizeByte finds
};
} // namespace vesk
