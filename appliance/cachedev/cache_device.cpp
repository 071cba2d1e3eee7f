#include "cachedev/cache_device.h"

#include <algorithm>
#include <cerrno>

namespace vesk {
namespace {
bool PassesEnd(const SectorRange &range, uint64_t deviceSectors) {
    return range.startSector > deviceSectors ||
           range.sectorCount > deviceSectors - range.startSector;
}

// The blocks that a range inside the device touches.
BlockRun TouchedBlocks(const SectorRange &range) {
    if (range.sectorCount == 0) {
        return {0, 0};
    }
    const uint64_t first = range.startSector / kBlockSectors;
    const uint64_t last = (range.startSector + range.sectorCount - 1) / kBlockSectors;
    return {first, last - first + 1};
}

uint64_t RoundUpDivide(uint64_t value, uint64_t divisor) {
    return value / divisor + (value % divisor != 0 ? 1 : 0);
}
} // namespace

void CacheDeviceStart(CacheDevice &device) {
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    BlockCacheInit(device.cache, device.images.slots);
}

uint64_t CacheDeviceBitmapBytes(const CacheDevice &device) {
    return device.images.deviceBytes >> kBitmapShift;
}

void CacheDeviceSetBitmap(CacheDevice &device, std::vector<uint8_t> bitmap) {
    SharedBitmap shared = std::make_shared<const std::vector<uint8_t>>(std::move(bitmap));
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    device.bitmap.swap(shared);
}

int CacheDeviceUnpinRanges(CacheDevice &device, const std::vector<SectorRange> &ranges) {
    const uint64_t deviceSectors = device.images.deviceBytes / kSectorBytes;
    const auto passesEnd = [deviceSectors](const SectorRange &range) {
        return PassesEnd(range, deviceSectors);
    };
    if (std::any_of(ranges.begin(), ranges.end(), passesEnd)) {
        return -EINVAL;
    }
    std::vector<SectorRange> accepted = ranges;
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    for (const SectorRange &range : ranges) {
        BlockCacheUnpin(device.cache, TouchedBlocks(range));
    }
    device.lastUnpin.swap(accepted);
    device.slotReleased.notify_all();
    return 0;
}

void CacheDeviceUnpinAll(CacheDevice &device) {
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    BlockCacheUnpinAll(device.cache);
    device.bitmap.reset();
    device.slotReleased.notify_all();
}

bool CacheDeviceIsBitmapSet(CacheDevice &device) {
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    return device.bitmap != nullptr;
}

bool CacheDeviceIsAllUnpinned(CacheDevice &device) {
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    return device.cache.pinnedBlocks.empty();
}

void CacheDeviceCountRequest(CacheDevice &device, uint64_t RequestCounters::*kind, bool refused) {
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    if (kind != nullptr) {
        ++(device.requests.*kind);
    }
    if (refused) {
        ++device.requests.refused;
    }
}

CacheSnapshot CacheDeviceSnapshot(CacheDevice &device) {
    CacheSnapshot snapshot = {};
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    snapshot.deviceBytes = device.images.deviceBytes;
    snapshot.bitmap = device.bitmap;
    snapshot.pinned = BlockCachePinnedRuns(device.cache);
    snapshot.pinnedBlocks = device.cache.pinnedBlocks.size();
    snapshot.slots = device.images.slots;
    snapshot.cachedBlocks = device.cache.slotOfBlock.size();
    snapshot.evictions = device.cache.evictions;
    snapshot.counters = device.counters;
    snapshot.requests = device.requests;
    snapshot.lastUnpin = device.lastUnpin;
    return snapshot;
}

std::string CacheDeviceCachedBits(CacheDevice &device) {
    const uint64_t blocks = RoundUpDivide(device.images.deviceBytes, kBlockBytes);
    // Made before the lock is taken, which then covers one pass over the slots and no more.
    std::string bits(static_cast<size_t>(RoundUpDivide(blocks, 8)), '\0');
    const std::lock_guard<std::mutex> hold(device.stateMutex);
    for (const CacheSlot &slot : device.cache.slots) {
        if (slot.block != kNoBlock) {
            char &byte = bits[static_cast<size_t>(slot.block / 8)];
            byte = static_cast<char>(static_cast<unsigned char>(byte) | 1U << (slot.block % 8));
        }
    }
    return bits;
}
} // namespace vesk
