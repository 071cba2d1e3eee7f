// The open state files: what each of them shows.
//
// Thread-safe. An open state file keeps showing the state of the moment at which it was opened.
#pragma once

#include "cachedev/cache_device.h"

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <string>

namespace vesk {
// Shared with the reads: a file may be closed as soon as the reply of a read is on its way, before
// the read is done with the text.
using StateText = std::shared_ptr<const std::string>;

struct OpenStates {
    std::mutex mutex; // guards what follows
    uint64_t lastHandle = 0;
    std::map<uint64_t, StateText> texts; // by handle, which is above 0
    uint64_t lastBytes = 0;              // length of the text that was made last
};

// Takes a snapshot of the device and returns the handle of its text. Ends with OpenStatesClose.
uint64_t OpenStatesOpen(OpenStates &states, CacheDevice &device);

// The text of an open state file; throws std::out_of_range for a handle that is not open.
StateText OpenStatesText(OpenStates &states, uint64_t handle);

// Forgets a handle; one that is not open, such as 0, is ignored.
void OpenStatesClose(OpenStates &states, uint64_t handle);

// The length in bytes to show for a state file that is not open: that of the text made last.
// Whoever polls the state asks for this each time, so no text is made for it; the file is read to
// its end whatever length it shows.
uint64_t OpenStatesBytes(OpenStates &states, CacheDevice &device);
} // namespace vesk
