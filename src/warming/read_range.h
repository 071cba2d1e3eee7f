// Reading ranges of the cache device to nowhere: what is read through the device enters the cache.
//
// Descriptors are opened for direct I/O, so the buffer is aligned and one buffer serves a whole
// operation.
//
// Thread rule: no state; a buffer belongs to one call at a time.
#pragma once

#include "base/malloc_text.h"
#include "bitmap/bit_runs.h"

#include <cstddef>
#include <cstdint>
#include <memory>

namespace vesk {
const size_t kWarmBufferBytes = 65536;
const size_t kWarmBufferAlignment = 4096;
const unsigned kSectorByteShift = 9; // sectors to bytes

using WarmBuffer = std::unique_ptr<char, FreeDeleter>;

// An aligned buffer of kWarmBufferBytes, or null when memory runs out.
WarmBuffer WarmBufferAllocate();

// Reads the low 32 bits of `count` (bytes) from `offset` (bytes), `bufferSize` bytes at a time. 0,
// or -1 after an error message; the end of the device is an error.
int ReadFdToNull(int fd, uint64_t offset, uint64_t count, char *buffer, size_t bufferSize);

// The same for blocks of 64 KiB, counted from the start of the device.
int ReadFdToNullByRange(int fd, const BitRun &range, char *buffer, size_t bufferSize);
} // namespace vesk
