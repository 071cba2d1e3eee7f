// One request on a block device or cache device node. Thread rule: no state; callable from any
// thread.
#pragma once

#include "base/log.h"

#include <cstdint>

namespace vesk {
// The size of the block device at `path` in `*sizeBytes` (bytes). 0, or -1 after an error message;
// then `*sizeBytes` is not meaningful.
int DeviceGetSizeByte(const char *path, uint64_t *sizeBytes);

// Opens the device for reading and writing, issues the request (with no third argument when `data`
// is null) and closes it. `size` (bytes of `data`) is for the error message only. 0 when the
// request returned 0 or more, else -1 after an error message.
int DoIoctl(const char *devicePath, unsigned request, void *data, int size);

// The same for a caller whose own error message is `failure`.
int DoIoctlOrSay(const char *failure, const char *devicePath, unsigned request, void *data,
                 int size, const LogPlace &place);
} // namespace vesk
