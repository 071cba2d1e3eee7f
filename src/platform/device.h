// Block devices. Thread rule: no state; callable from any thread.
#ifndef PLATFORM_DEVICE_H
#define PLATFORM_DEVICE_H

#include <cstdint>

// The size of the block device at `path` in `*sizeBytes` (bytes). 0, or -1 after an error message;
// then `*sizeBytes` is not meaningful.
int DeviceGetSizeByte(const char *path, uint64_t *sizeBytes);

#endif
