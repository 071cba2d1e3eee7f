// Reads and writes of the cache device. The caller's range of blocks is held from the first look-up
// to the last transfer; within it the request is worked off in runs of blocks of one kind, each
// with as few image calls as its slots allow and straight from or into the caller's buffer.
#include "cachedev/cache_device.h"

#include "cachedev/pin_bitmap_runs.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <memory>
#include <thread>

namespace {

// Blocks of one run at most: a request of 1 MiB that begins inside a block.
constexpr size_t kRunBlocks = 17;

// The bytes of a request, or of the part of it that one run covers.
struct Span {
    uint64_t offset; // on the device
    uint64_t end;    // on the device, behind the last byte
    char *buffer;    // where the byte at `offset` is
};

// Consecutive blocks and the slots that are held in use for them.
struct Run {
    uint64_t firstBlock = 0;
    size_t count = 0;
    bool hit = false;                       // read: all of them are cached; otherwise none is
    std::array<uint32_t, kRunBlocks> slots; // kNoSlot: not cached and not to be cached
    std::array<bool, kRunBlocks> broken;    // the slot's bytes cannot be trusted

    Run() {
        slots.fill(kNoSlot);
        broken.fill(false);
    }
};

uint64_t BlockStart(const Run &run, size_t index) {
    return (run.firstBlock + index) * kBlockBytes;
}

Span RunSpan(const Run &run, const Span &request, uint64_t position) {
    return {position, std::min(request.end, BlockStart(run, run.count)),
            request.buffer + (position - request.offset)};
}

ImagePieces OnePiece(char *buffer, uint64_t bytes) {
    return {{{buffer, static_cast<size_t>(bytes)}}, 1};
}

// The end of the group of neighbouring slots that begins at `index`: their bytes follow each other
// in the SSD image as they do on the device.
size_t GroupEnd(const Run &run, size_t index) {
    size_t end = index + 1;
    while (end < run.count && run.slots[end] != kNoSlot && run.slots[end] == run.slots[end - 1] + 1)
        ++end;
    return end;
}

void MarkBroken(Run &run, size_t begin, size_t end) {
    std::fill(run.broken.begin() + static_cast<ptrdiff_t>(begin),
              run.broken.begin() + static_cast<ptrdiff_t>(end), true);
}

// Takes as many blocks of `first` .. `last` as form one run for a read. Waits only while it holds
// no slot, and whoever holds slots never waits for a block range: no deadlock.
Run TakeReadRun(CacheDevice &device, uint64_t first, uint64_t last) {
    Run run;
    run.firstBlock = first;
    const size_t most = static_cast<size_t>(std::min<uint64_t>(kRunBlocks, last - first + 1));
    BlockCache &cache = device.cache;
    std::unique_lock<std::mutex> hold(device.stateMutex);
    for (; run.count < most; ++run.count) {
        uint32_t slot = BlockCacheFind(cache, first + run.count);
        const bool hit = slot != kNoSlot;
        if (run.count > 0 && hit != run.hit)
            break;
        run.hit = hit;
        if (hit) {
            BlockCacheUse(cache, slot);
        } else {
            slot = BlockCacheTake(cache);
            while (slot == kNoSlot && run.count == 0 && BlockCacheMayTakeLater(cache)) {
                ++device.slotWaiters;
                device.slotReleased.wait(hold);
                --device.slotWaiters;
                slot = BlockCacheTake(cache);
            }
            if (slot == kNoSlot && BlockCacheMayTakeLater(cache))
                break; // this run's own slots will be free for the next one
        }
        run.slots[run.count] = slot;
    }
    return run;
}

// Takes the slots of those blocks of `first` .. `last` that are cached. Never waits.
Run TakeWriteRun(CacheDevice &device, uint64_t first, uint64_t last) {
    Run run;
    run.firstBlock = first;
    run.count = static_cast<size_t>(std::min<uint64_t>(kRunBlocks, last - first + 1));
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    for (size_t i = 0; i < run.count; ++i) {
        run.slots[i] = BlockCacheFind(device.cache, first + i);
        if (run.slots[i] != kNoSlot)
            BlockCacheUse(device.cache, run.slots[i]);
    }
    return run;
}

// Gives one slot back. stateMutex is held. `pinMarked`: pin the block when its bit is set, by the
// bitmap that is in force now.
void ReleaseSlot(CacheDevice &device, const Run &run, size_t index, bool pinMarked) {
    const uint32_t slot = run.slots[index];
    const uint64_t block = run.firstBlock + index;
    if (run.broken[index]) {
        BlockCacheDrop(device.cache, slot);
        return;
    }
    const bool marked = pinMarked && device.bitmap && PinBitmapTest(*device.bitmap, block);
    BlockCacheRelease(device.cache, slot, marked);
}

void WakeSlotWaiters(CacheDevice &device) {
    if (device.slotWaiters > 0)
        device.slotReleased.notify_all();
}

void FinishReadRun(CacheDevice &device, const Run &run, int error) {
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    const auto broken =
        static_cast<uint64_t>(std::count(run.broken.begin(), run.broken.end(), true));
    (run.hit ? device.counters.hits : device.counters.misses) += run.count;
    if (run.hit)
        device.counters.ssdReads += run.count - broken;
    if (error == 0)
        device.counters.backingReads += run.hit ? broken : run.count;
    for (size_t i = 0; i < run.count; ++i) {
        if (run.slots[i] == kNoSlot)
            continue;
        if (!run.hit && !run.broken[i])
            BlockCacheStore(device.cache, run.slots[i], run.firstBlock + i);
        ReleaseSlot(device, run, i, true);
    }
    WakeSlotWaiters(device);
}

void FinishWriteRun(CacheDevice &device, const Run &run) {
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    device.counters.writes += run.count;
    for (size_t i = 0; i < run.count; ++i) {
        if (run.slots[i] != kNoSlot)
            ReleaseSlot(device, run, i, false);
    }
    WakeSlotWaiters(device);
}

// The part of a span that lies in cached blocks which are neighbours in the SSD image.
struct Group {
    ImagePieces pieces; // its bytes in memory
    uint64_t offset;    // on the device
    uint64_t ssdOffset; // in the SSD image
};

Group MakeGroup(const Run &run, const Span &span, size_t begin, size_t end) {
    const uint64_t blocksStart = BlockStart(run, begin);
    const uint64_t offset = std::max(span.offset, blocksStart);
    const uint64_t groupEnd = std::min(span.end, BlockStart(run, end));
    return {OnePiece(span.buffer + (offset - span.offset), groupEnd - offset), offset,
            run.slots[begin] * kBlockBytes + (offset - blocksStart)};
}

int ReadHits(const CacheDevice &device, Run &run, const Span &span) {
    for (size_t begin = 0; begin < run.count;) {
        const size_t end = GroupEnd(run, begin);
        const Group group = MakeGroup(run, span, begin, end);
        if (CacheImagesReadSsd(device.images, group.ssdOffset, group.pieces) != 0) {
            // Write-through: the backing image has the same bytes.
            MarkBroken(run, begin, end);
            const int error = CacheImagesReadBacking(device.images, group.offset, group.pieces);
            if (error != 0)
                return error;
        }
        begin = end;
    }
    return 0;
}

// Memory for the parts of the first and of the last block that the request does not cover. Kept per
// thread, so that a small read costs no allocation.
char *Scratch() {
    static thread_local std::unique_ptr<char[]> scratch;
    if (!scratch)
        scratch.reset(new char[2 * kBlockBytes]);
    return scratch.get();
}

int ReadMisses(const CacheDevice &device, Run &run, const Span &span, char *scratch) {
    // What goes into a slot is read whole, what does not is read as far as it was asked for.
    uint64_t start = span.offset;
    uint64_t end = span.end;
    if (run.slots[0] != kNoSlot)
        start = BlockStart(run, 0);
    if (run.slots[run.count - 1] != kNoSlot)
        end = std::min(BlockStart(run, run.count), device.images.deviceBytes);
    const ImagePieces pieces = {{{scratch, static_cast<size_t>(span.offset - start)},
                                 {span.buffer, static_cast<size_t>(span.end - span.offset)},
                                 {scratch + kBlockBytes, static_cast<size_t>(end - span.end)}},
                                3};
    const int error = CacheImagesReadBacking(device.images, start, pieces);
    if (error != 0) {
        MarkBroken(run, 0, run.count);
        return error;
    }
    for (size_t first = 0; first < run.count;) {
        if (run.slots[first] == kNoSlot) {
            ++first;
            continue;
        }
        const size_t next = GroupEnd(run, first);
        const uint64_t groupStart = BlockStart(run, first);
        const uint64_t groupEnd = std::min(BlockStart(run, next), end);
        const ImagePieces group = ImagePiecesSlice(pieces, static_cast<size_t>(groupStart - start),
                                                   static_cast<size_t>(groupEnd - groupStart));
        // The reader has its data; a block that the SSD does not take is just not cached.
        if (CacheImagesWriteSsd(device.images, run.slots[first] * kBlockBytes, group) != 0)
            MarkBroken(run, first, next);
        first = next;
    }
    return 0;
}

int WriteRun(const CacheDevice &device, Run &run, const Span &span) {
    const ImagePieces pieces = OnePiece(span.buffer, span.end - span.offset);
    const int error = CacheImagesWriteBacking(device.images, span.offset, pieces);
    if (error != 0) {
        // Some of it may have been written: the slots can no longer be taken for a copy.
        MarkBroken(run, 0, run.count);
        return error;
    }
    for (size_t begin = 0; begin < run.count;) {
        if (run.slots[begin] == kNoSlot) {
            ++begin;
            continue;
        }
        const size_t end = GroupEnd(run, begin);
        const Group group = MakeGroup(run, span, begin, end);
        if (CacheImagesWriteSsd(device.images, group.ssdOffset, group.pieces) != 0)
            MarkBroken(run, begin, end);
        begin = end;
    }
    return 0;
}

// Reads the whole request; adds the missed blocks to `misses`. 0 or a negative errno.
int ReadRequest(CacheDevice &device, const Span &request, uint64_t &misses) {
    char *const scratch = Scratch(); // before any slot is held: it may throw
    const uint64_t lastBlock = (request.end - 1) / kBlockBytes;
    const BlockRangeGuard blocks(device.blocksInWork, {request.offset / kBlockBytes, lastBlock});
    for (uint64_t position = request.offset; position < request.end;) {
        Run run = TakeReadRun(device, position / kBlockBytes, lastBlock);
        const Span span = RunSpan(run, request, position);
        const int error =
            run.hit ? ReadHits(device, run, span) : ReadMisses(device, run, span, scratch);
        FinishReadRun(device, run, error);
        if (!run.hit)
            misses += run.count;
        if (error != 0)
            return error;
        position = span.end;
    }
    return 0;
}

} // namespace

int64_t CacheDeviceRead(CacheDevice &device, uint64_t offset, char *buffer, size_t size) {
    const CacheFaults &faults = device.settings.faults;
    const uint64_t deviceEnd = std::min(device.images.deviceBytes, faults.shortAt);
    if (offset >= deviceEnd || size == 0)
        return 0;
    const Span request = {offset, offset + std::min<uint64_t>(size, deviceEnd - offset), buffer};
    const auto fault = faults.failRead.lower_bound(offset);
    if (fault != faults.failRead.end() && fault->first < request.end)
        return -fault->second;
    uint64_t misses = 0;
    const int error = ReadRequest(device, request, misses);
    // Slept off with no lock held: other requests, on the same blocks too, go on meanwhile.
    if (misses > 0 && device.settings.missDelayMs > 0)
        std::this_thread::sleep_for(std::chrono::milliseconds(device.settings.missDelayMs) *
                                    misses);
    return error != 0 ? error : static_cast<int64_t>(request.end - request.offset);
}

int64_t CacheDeviceWrite(CacheDevice &device, uint64_t offset, const char *buffer, size_t size) {
    if (size == 0)
        return 0;
    if (offset >= device.images.deviceBytes)
        return -ENOSPC;
    // The pieces of a transfer are not const; a write only reads them.
    const Span request = {offset,
                          offset + std::min<uint64_t>(size, device.images.deviceBytes - offset),
                          const_cast<char *>(buffer)};
    const uint64_t lastBlock = (request.end - 1) / kBlockBytes;
    const BlockRangeGuard blocks(device.blocksInWork, {offset / kBlockBytes, lastBlock});
    for (uint64_t position = offset; position < request.end;) {
        Run run = TakeWriteRun(device, position / kBlockBytes, lastBlock);
        const Span span = RunSpan(run, request, position);
        const int error = WriteRun(device, run, span);
        FinishWriteRun(device, run);
        if (error != 0)
            return error;
        position = span.end;
    }
    return static_cast<int64_t>(request.end - request.offset);
}
