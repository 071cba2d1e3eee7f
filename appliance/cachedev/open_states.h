// A read-only file that shows the state of a cache device: what each open one shows.
//
// Thread-safe. An open file keeps showing the state of the moment at which it was opened.
#pragma once

#include "cachedev/cache_device.h"

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <string>

namespace vesk {
// Shared with the reads: a file may be closed as soon as the reply of a read is on its way, before
// the read is done with the content.
using StateContent = std::shared_ptr<const std::string>;

struct OpenStates {
    std::string (*const make)(CacheDevice &device); // what the file shows of this moment
    std::mutex mutex{};                             // guards what follows
    uint64_t lastHandle = 0;
    std::map<uint64_t, StateContent> contents{}; // by handle, which is above 0
    uint64_t lastBytes = 0;                      // length of the content that was made last
};

// Makes the content of this moment and returns its handle. Ends with OpenStatesClose.
uint64_t OpenStatesOpen(OpenStates &states, CacheDevice &device);

// What an open file shows; throws std::out_of_range for a handle that is not open.
StateContent OpenStatesContent(OpenStates &states, uint64_t handle);

// Forgets a handle; one that is not open, such as 0, is ignored.
void OpenStatesClose(OpenStates &states, uint64_t handle);

// The length in bytes to show for the file while it is not open: that of the content made last.
// Whoever polls the state asks for this each time, so no content is made for it; the file is read
// to its end whatever length it shows.
uint64_t OpenStatesBytes(OpenStates &states, CacheDevice &device);
} // namespace vesk
