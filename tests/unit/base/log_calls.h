// Log calls of every class, each in a function that readers of the log would look for. The line of
// the call is handed back.
#pragma once

#include "base/log.h"

#include <string>

namespace vesk {
inline std::string Line(int line) {
    return std::to_string(line);
}

inline int ReportError() {
    LogError("Invalid input %d", 7);
    return __LINE__ - 1;
}
inline int ReportNotice() {
    LogNotice("Send bitmap OK");
    return __LINE__ - 1;
}
inline int ReportVerbose() {
    LogVerbose("Get UUID = %s", "u");
    return __LINE__ - 1;
}
inline int ReportDebug() {
    LogDebug("Next read start = %d bytes=%d", 0, 1);
    return __LINE__ - 1;
}
} // namespace vesk
