// What became of the requests that were sent: whether the document has them still.
//
// Thread rule: one owner.
#pragma once

#include "act/request_batch.h"

#include <sys/stat.h>

#include <cstdint>
#include <string>
#include <vector>

namespace vesk {
class RequestWatch {
public:
    explicit RequestWatch(const std::string &configPath) : configPath_(configPath) {}

    // One that the receiver has taken.
    void Add(RequestBatch batch) {
        waiting_.push_back(std::move(batch));
        seen_ = {}; // it may be gone from the document that was read last
    }

    const std::vector<RequestBatch> &Waiting() const { return waiting_; }

    // Takes those out that are no longer stored: carried out, or given up. None where the document
    // cannot be read.
    std::vector<RequestBatch> TakeFinished();

    // Takes all out, whatever became of them.
    std::vector<RequestBatch> TakeAll();

private:
    bool HasChanged();
    const std::string configPath_;
    std::vector<RequestBatch> waiting_;
    struct stat seen_ {}; // the document when it was read last
    int64_t readAt_ = 0;  // milliseconds of the monotonic clock
};
} // namespace vesk
