#include "text/units.h"

#include <cstdio>

namespace vesk {
std::string UnitsOfBytes(uint64_t bytes) {
    static const char *const kUnits[] = {"KiB", "MiB", "GiB", "TiB", "PiB", "EiB"};
    if (bytes < 1024) {
        return std::to_string(bytes) + " B";
    }
    double value = static_cast<double>(bytes) / 1024;
    size_t unit = 0;
    // 1023.5 would be written as 1024.
    while (value >= 1023.5) {
        value /= 1024;
        ++unit;
    }
    char text[32];
    snprintf(text, sizeof(text), value < 9.95 ? "%.1f %s" : "%.0f %s", value, kUnits[unit]);
    return text;
}

std::string UnitsOfSeconds(uint64_t seconds) {
    const uint64_t minutes = seconds / 60;
    if (minutes == 0) {
        return std::to_string(seconds) + " s";
    }
    if (minutes < 60) {
        return std::to_string(minutes) + " min " + std::to_string(seconds % 60) + " s";
    }
    return std::to_string(minutes / 60) + " h " + std::to_string(minutes % 60) + " min";
}

std::string UnitsOfCount(const std::optional<uint64_t> &count) {
    return count ? std::to_string(*count) : "-";
}

std::string UnitsOfAnswer(const std::optional<bool> &answer) {
    return !answer ? "-" : *answer ? "yes" : "no";
}

std::string UnitsOfThings(uint64_t count, const char *thing) {
    return std::to_string(count) + " " + thing + (count == 1 ? "" : "s");
}
} // namespace vesk
