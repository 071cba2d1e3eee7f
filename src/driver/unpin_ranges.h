// Telling the cache driver which sector ranges it may release. Thread rule: no state; every request
// opens the device anew.
#pragma once

#include "base/log.h"
#include "driver/pin_interface.h"

#include <cstddef>
#include <vector>

namespace vesk {
// Logs each range, at every level.
void DumpRanges(const UnpinInfo *ranges, size_t count);

// Sends one list. 0, or -1 after an error message at the caller's place.
int SendUnpinList(const char *cachePath, UnpinList *list, const LogPlace &place);

// Releases the ranges, 1024 to a request. The range whose turn comes when a full list is sent is
// dropped: of 1025 ranges the last stays pinned, of 1026 the second list holds only the last. 0, or
// -1 after an error message; lists sent before the failure stay sent.
int SendUnpinInfoToDriver(const char *cachePath, const std::vector<UnpinInfo> &ranges);
} // namespace vesk
