// Keeps requests on overlapping blocks apart: first come, first served.
//
// A request on the cache device holds its range of blocks from before it looks into the cache until
// its last image I/O is done. So a block is worked on by one request at a time: nobody reads a
// block that is half written, and nobody puts a block into the cache that was changed while it was
// being loaded. Requests on different blocks run side by side. Waiting in order of arrival rules
// out starvation, and taking the whole range at once rules out deadlock. Thread-safe.
#pragma once

#include <condition_variable>
#include <cstdint>
#include <list>
#include <mutex>

namespace vesk {
struct BlockRange {
    uint64_t first; // block number
    uint64_t last;  // block number, not less than first
};

struct BlockRangeLock {
    std::mutex mutex;                 // guards what follows
    std::condition_variable released; // signalled when a range is given back and someone waits
    std::list<BlockRange> queue;      // held and awaited ranges in order of arrival
    unsigned waiting = 0;             // threads that wait
};

// Holds a range of blocks for its lifetime.
class BlockRangeGuard {
public:
    // Waits until no range that arrived earlier overlaps.
    BlockRangeGuard(BlockRangeLock &rangeLock, const BlockRange &range);
    ~BlockRangeGuard();
    BlockRangeGuard(const BlockRangeGuard &) = delete;
    BlockRangeGuard &operator=(const BlockRangeGuard &) = delete;

private:
    BlockRangeLock &lock_;
    std::list<BlockRange>::iterator place_; // this range in lock_.queue
};
} // namespace vesk
