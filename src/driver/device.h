// Block devices. Thread rule: no state; callable from any thread.
#pragma once

#include <cstdint>

namespace vesk {

// The size of the block device at `path` in `*sizeBytes` (bytes). 0, or -1 after an error message;
// then `*sizeBytes` is not meaningful.
int DeviceGetSizeByte(const char *path, uint64_t *sizeBytes);

} // namespace vesk
