// Reads and writes of the cache device. The request's blocks are held from the first look-up until
// the data is handed over; within them the request is worked off in runs of blocks of one kind.
#include "cachedev/cache_device.h"

#include "cachedev/cache_run.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <memory>
#include <thread>

namespace vesk {
namespace {
// The bytes of a request, or of the part of it that one run covers.
struct Span {
    uint64_t offset; // on the device
    uint64_t end;    // on the device, behind the last byte
    char *buffer;    // where the byte at `offset` belongs
};

Span SpanOfRun(const CacheRun &run, const Span &request, uint64_t position) {
    return {position, std::min(request.end, CacheRunBlockStart(run, run.count)),
            request.buffer + (position - request.offset)};
}

ImagePieces OnePiece(const Span &span) {
    ImagePieces pieces;
    ImagePiecesAdd(pieces, span.buffer, static_cast<size_t>(span.end - span.offset));
    return pieces;
}

// Calls `move` for every part of the span that lies in neighbouring slots, with that part and the
// slot and byte within it where it begins. Stops at the first result other than 0 and returns it.
template <typename Move> int ForEachGroup(const CacheRun &run, const Span &span, Move move) {
    for (size_t first = 0; first < run.count;) {
        if (run.slots[first] == kNoSlot) {
            ++first;
            continue;
        }
        const size_t next = CacheRunGroupEnd(run, first);
        const uint64_t start = CacheRunBlockStart(run, first);
        Span part = {std::max(span.offset, start),
                     std::min(span.end, CacheRunBlockStart(run, next)), nullptr};
        if (span.buffer != nullptr) {
            part.buffer = span.buffer + (part.offset - span.offset);
        }
        const int result = move(part, run.slots[first], static_cast<size_t>(part.offset - start));
        if (result != 0) {
            return result;
        }
        first = next;
    }
    return 0;
}

// From the slots into the span's buffer.
int CopyFromSlots(const CacheImages &images, const CacheRun &run, const Span &span) {
    return ForEachGroup(run, span, [&](const Span &part, uint32_t slot, size_t within) {
        return CacheImagesReadSsd(images, slot * kBlockBytes + within, OnePiece(part));
    });
}

int CopyToSlots(const CacheImages &images, const CacheRun &run, const Span &span) {
    return ForEachGroup(run, span, [&](const Span &part, uint32_t slot, size_t within) {
        return CacheImagesWriteSsd(images, slot * kBlockBytes + within, OnePiece(part));
    });
}

// The mapped bytes of the span in the run's slots.
void AddSlotPieces(const CacheImages &images, const CacheRun &run, const Span &span,
                   ImagePieces &pieces) {
    ForEachGroup(run, span, [&](const Span &part, uint32_t slot, size_t within) {
        ImagePiecesAdd(pieces, CacheImagesSlotAddress(images, slot, within),
                       static_cast<size_t>(part.end - part.offset));
        return 0;
    });
}

// Fills the slots of a run, whole blocks, from the backing image.
int LoadSlots(const CacheImages &images, const CacheRun &run) {
    const Span blocks = {CacheRunBlockStart(run, 0),
                         std::min(CacheRunBlockStart(run, run.count), images.deviceBytes), nullptr};
    ImagePieces pieces;
    AddSlotPieces(images, run, blocks, pieces);
    return CacheImagesReadBacking(images, blocks.offset, pieces);
}

// Gets the bytes of a run: leaves them in its slots if it had to load them and `mayStay`, otherwise
// copies them into the span's buffer. 0 or a negative errno.
int Fetch(const CacheImages &images, CacheRun &run, const Span &span, bool mayStay, bool &stayed) {
    stayed = false;
    if (run.kind != RunKind::Bypass) {
        const int loaded = run.kind == RunKind::Load ? LoadSlots(images, run) : 0;
        stayed = run.kind == RunKind::Load && loaded == 0 && mayStay;
        if (stayed || (loaded == 0 && CopyFromSlots(images, run, span) == 0)) {
            return 0;
        }
        run.broken = true; // the backing image has the same bytes
    }
    return CacheImagesReadBacking(images, span.offset, OnePiece(span));
}

// Memory for the bytes of a read, kept per thread; at least `bytes`.
char *ReadBuffer(size_t bytes) {
    static thread_local std::unique_ptr<char[]> buffer;
    static thread_local size_t capacity = 0;
    if (capacity < bytes) {
        capacity = 0;
        buffer.reset(new char[bytes]);
        capacity = bytes;
    }
    return buffer.get();
}

// Where the data is slow to come by, whoever wants the same blocks waits along; nobody else does.
void DelayMisses(CacheDevice &device, uint64_t firstBlock, uint64_t lastBlock) {
    if (device.settings.missDelayMs == 0) {
        return;
    }
    const std::chrono::milliseconds delay(device.settings.missDelayMs);
    for (uint64_t missing = CacheRunCountMissing(device, firstBlock, lastBlock); missing > 0;
         --missing) {
        std::this_thread::sleep_for(delay);
    }
}

int ReadRequest(CacheDevice &device, const Span &request, const CacheReader &deliver) {
    const uint64_t lastBlock = (request.end - 1) / kBlockBytes;
    const BlockRangeGuard blocks(device.blocksInWork, {request.offset / kBlockBytes, lastBlock});
    DelayMisses(device, request.offset / kBlockBytes, lastBlock);
    for (uint64_t position = request.offset;;) {
        CacheRun run = CacheRunTakeForRead(device, position / kBlockBytes, lastBlock);
        const Span span = SpanOfRun(run, request, position);
        const bool isLast = span.end == request.end;
        bool stayed = false;
        const int error = Fetch(device.images, run, span, isLast, stayed);
        CacheRunPublish(device, run, error);
        if (isLast && error == 0) {
            // What is in the buffer, then what is still in the last run's slots. Earlier runs may
            // not stay in theirs: a request that holds slots must not wait for more.
            ImagePieces pieces =
                OnePiece({request.offset, stayed ? position : request.end, request.buffer});
            if (stayed) {
                AddSlotPieces(device.images, run, span, pieces);
            }
            deliver(pieces);
        }
        CacheRunRelease(device, run);
        if (isLast || error != 0) {
            return error;
        }
        position = span.end;
    }
}

int WriteRequest(CacheDevice &device, const Span &request) {
    const uint64_t lastBlock = (request.end - 1) / kBlockBytes;
    const BlockRangeGuard blocks(device.blocksInWork, {request.offset / kBlockBytes, lastBlock});
    for (uint64_t position = request.offset; position < request.end;) {
        CacheRun run = CacheRunTakeForWrite(device, position / kBlockBytes, lastBlock);
        const Span span = SpanOfRun(run, request, position);
        const int error = CacheImagesWriteBacking(device.images, span.offset, OnePiece(span));
        // After a failure some of the bytes may have been written: the slots are no copy any more.
        run.broken = error != 0 || CopyToSlots(device.images, run, span) != 0;
        CacheRunPublish(device, run, error);
        CacheRunRelease(device, run);
        if (error != 0) {
            return error;
        }
        position = span.end;
    }
    return 0;
}
} // namespace

int64_t CacheDeviceRead(CacheDevice &device, uint64_t offset, size_t size,
                        const CacheReader &deliver) {
    const CacheFaults &faults = device.settings.faults;
    const uint64_t deviceEnd = std::min(device.images.deviceBytes, faults.shortAt);
    if (offset >= deviceEnd || size == 0) {
        return 0;
    }
    const uint64_t end = offset + std::min<uint64_t>(size, deviceEnd - offset);
    const auto fault = faults.failRead.lower_bound(offset);
    if (fault != faults.failRead.end() && fault->first < end) {
        return -fault->second;
    }
    const auto bytes = static_cast<size_t>(end - offset);
    const int error = ReadRequest(device, {offset, end, ReadBuffer(bytes)}, deliver);
    return error != 0 ? error : static_cast<int64_t>(bytes);
}

int64_t CacheDeviceWrite(CacheDevice &device, uint64_t offset, const char *buffer, size_t size) {
    if (size == 0) {
        return 0;
    }
    if (offset >= device.images.deviceBytes) {
        return -ENOSPC;
    }
    const uint64_t end = offset + std::min<uint64_t>(size, device.images.deviceBytes - offset);
    // The pieces of a transfer are not const; a write only reads them.
    const int error = WriteRequest(device, {offset, end, const_cast<char *>(buffer)});
    return error != 0 ? error : static_cast<int64_t>(end - offset);
}
} // namespace vesk
