// The emulated cache device: a backing image served through a read cache on the SSD image.
//
// 64 KiB blocks, write-through, no allocation on write, least-recently-used replacement among
// unpinned blocks. A block whose bit is set in the pin bitmap becomes pinned when it is read and
// stays cached until its range is released or everything is unpinned.
//
// Every function is thread-safe. Two locks, taken in this order and never the other way round:
//  - blocksInWork (BlockRangeLock): a read or write holds its blocks until its image I/O is done,
//  so
//    the I/O itself needs no lock and requests on different blocks run side by side;
//  - stateMutex: guards the book-keeping, held only for look-ups and updates, never during I/O,
//    during the delay of a miss or while a caller's memory is read.
#pragma once

#include "cachedev/block_cache.h"
#include "cachedev/block_range_lock.h"
#include "cachedev/cache_images.h"
#include "cachedev/driver_requests.h"

#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace vesk {
// Faults to order, for tests.
struct CacheFaults {
    std::map<uint32_t, int> failRequest; // request number -> errno
    std::map<uint64_t, int> failRead;    // byte offset -> errno of reads that touch it
    uint64_t shortAt = UINT64_MAX;       // byte offset from which on reads find nothing
};

struct CacheSettings {
    unsigned missDelayMs = 0; // milliseconds that every missed block adds to its read
    CacheFaults faults;
};

struct CacheCounters {
    uint64_t hits = 0;         // blocks read that were cached
    uint64_t misses = 0;       // blocks read that were not
    uint64_t ssdReads = 0;     // blocks served from the SSD image
    uint64_t backingReads = 0; // blocks read from the backing image
    uint64_t writes = 0;       // blocks written, whole or in part
};

// Requests received, by kind, whether they were accepted or not.
struct RequestCounters {
    uint64_t setBitmap = 0;
    uint64_t queryBitmapSet = 0;
    uint64_t unpinRanges = 0;
    uint64_t unpinAll = 0;
    uint64_t queryAllUnpinned = 0;
    uint64_t getSize = 0;
    uint64_t refused = 0; // requests of any kind, unknown ones included, that ended with an error
};

using SharedBitmap = std::shared_ptr<const std::vector<uint8_t>>;

struct CacheDevice {
    // Fixed once the device is opened.
    CacheImages images;
    CacheSettings settings;

    BlockRangeLock blocksInWork;

    std::mutex stateMutex; // guards everything below
    std::condition_variable slotReleased;
    unsigned slotWaiters = 0; // reads that wait on slotReleased
    BlockCache cache;
    SharedBitmap bitmap; // null: none set; replaced as a whole, its bytes never change
    std::vector<SectorRange> lastUnpin;
    CacheCounters counters;
    RequestCounters requests;
};

// Everything worth knowing at one moment.
struct CacheSnapshot {
    uint64_t deviceBytes;
    SharedBitmap bitmap; // null: none set
    std::vector<BlockRun> pinned;
    uint64_t pinnedBlocks;
    uint32_t slots;
    uint64_t cachedBlocks;
    uint64_t evictions;
    CacheCounters counters;
    RequestCounters requests;
    std::vector<SectorRange> lastUnpin; // records of the last accepted unpin-ranges request
};

// Starts with an empty cache on `device.images`, which must be open. Before any other use.
void CacheDeviceStart(CacheDevice &device);

// Receives the data of a read, in pieces of memory whose bytes follow each other. Some may lie in
// the mapped SSD image: pass them to system calls, see cache_images.h. They hold the data only
// until the function returns. Must not throw, nor call the device again.
using CacheReader = std::function<void(const ImagePieces &pieces)>;

// Reads up to `size` bytes at `offset` through the cache: bytes read, fewer at the device's end, 0
// past it, or a negative errno. `deliver` is called once, when the result is above 0, with that
// many bytes. A block that cannot be had from the SSD image is read from the backing image instead
// and leaves the cache. A missed block stays uncached only while every slot is pinned.
int64_t CacheDeviceRead(CacheDevice &device, uint64_t offset, size_t size,
                        const CacheReader &deliver);

// Writes up to `size` bytes at `offset` to the backing image and to the slots of cached blocks:
// bytes written, fewer at the device's end, -ENOSPC past it, or another negative errno (the blocks
// concerned then leave the cache).
int64_t CacheDeviceWrite(CacheDevice &device, uint64_t offset, const char *buffer, size_t size);

// Length in bytes that a pin bitmap of this device has.
uint64_t CacheDeviceBitmapBytes(const CacheDevice &device);

// Replaces the pin bitmap; its length must be CacheDeviceBitmapBytes. Unpins nothing.
void CacheDeviceSetBitmap(CacheDevice &device, std::vector<uint8_t> bitmap);

// Unpins every block that one of the ranges touches. 0, or -EINVAL when a range passes the device's
// end; nothing is changed then. A range without sectors releases nothing.
int CacheDeviceUnpinRanges(CacheDevice &device, const std::vector<SectorRange> &ranges);

// Unpins every block and drops the pin bitmap.
void CacheDeviceUnpinAll(CacheDevice &device);

bool CacheDeviceIsBitmapSet(CacheDevice &device);
bool CacheDeviceIsAllUnpinned(CacheDevice &device);

// Counts a request of one kind (null: of none of the known kinds) and whether it was refused.
void CacheDeviceCountRequest(CacheDevice &device, uint64_t RequestCounters::*kind, bool refused);

// A consistent picture of the device; changes nothing.
CacheSnapshot CacheDeviceSnapshot(CacheDevice &device);

// The blocks that are cached at this moment as set bits, numbered as in the pin bitmap; changes
// nothing. Longer than a pin bitmap where the device does not end with 8 whole blocks: every block
// has its bit, and those behind the last one, up to a whole byte, are 0.
std::string CacheDeviceCachedBits(CacheDevice &device);
} // namespace vesk
