// The files of a request right before it is sent, looked at as the receiver will look at them: it
// ends by one that is not there, and takes the rest of its request along.
//
// Thread rule: no state.
#pragma once

#include "act/request_batch.h"

#include <vector>

namespace vesk {
struct LastLook {
    RequestBatch calm;              // as they were when they were looked at before
    std::vector<BatchFile> changed; // what something changes now, with its size and blocks
    RequestBatch gone;              // no longer there, or another file
    RequestBatch empty;             // without blocks now
    RequestBatch unreadable;        // whose blocks cannot be looked at now
};

LastLook LastLookAt(const RequestBatch &batch);

// Whether the service would find a cache that can pin on the volume now. It drops the records of a
// volume without one.
bool VolumeCanPin(const std::string &mountPath);
} // namespace vesk
