#include "driver/unpin_ranges.h"

#include "driver/device.h"

#include <sys/types.h>

namespace vesk {
void DumpRanges(const UnpinInfo *ranges, size_t count) {
    for (size_t i = 0; i < count; ++i) {
        LogNotice("Unpin range [%zd] start sector = %llu num sectors = %llu",
                  static_cast<ssize_t>(i), LogU64(ranges[i].startSector),
                  LogU64(ranges[i].numSectors));
    }
}

int SendUnpinList(const char *cachePath, UnpinList *list, const LogPlace &place) {
    return DoIoctlOrSay("Send unpin inctl to driver failed", cachePath, kPinIoctlUnpinRanges, list,
                        kUnpinListBytes, place);
}

int SendUnpinInfoToDriver(const char *cachePath, const std::vector<UnpinInfo> &ranges) {
    LogTraceScope();
    LogVerbose("Pass range to driver start");
    UnpinList list{}; // zeroed: records behind the last used one end the list
    size_t count = 0;
    for (size_t i = 0; i <= ranges.size(); ++i) {
        const bool atEnd = i == ranges.size();
        if (!atEnd && count < kUnpinListRecords) {
            list.ranges[count++] = ranges[i];
            continue;
        }
        if (count == 0) {
            break;
        }
        // Sending a full list takes the turn of range i, which is itself not sent. Kept so
        // deliberately: how long lists are cut is part of the interface to the driver.
        if (LogLevel > 1) {
            LogVerbose("Send unpin inctl to driver, size=%zd",
                       static_cast<ssize_t>(kUnpinListBytes));
            DumpRanges(list.ranges, count);
        }
        if (SendUnpinList(cachePath, &list, LogHere()) < 0) {
            return -1;
        }
        list = UnpinList{};
        count = 0;
    }
    return 0;
}
} // namespace vesk
