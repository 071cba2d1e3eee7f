// Figures for people. Thread rule: no state.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace vesk {
// "0 B", "1023 B", "1.0 KiB", "12 GiB", "1023 GiB": rounded, a fraction below ten only.
std::string UnitsOfBytes(uint64_t bytes);

// "12 s", "3 min 20 s", "2 h 5 min".
std::string UnitsOfSeconds(uint64_t seconds);

// The number, or "-" for what cannot be had.
std::string UnitsOfCount(const std::optional<uint64_t> &count);

// "yes", "no" or "-".
std::string UnitsOfAnswer(const std::optional<bool> &answer);

// "1 file", "2 files".
std::string UnitsOfThings(uint64_t count, const char *thing);
} // namespace vesk
