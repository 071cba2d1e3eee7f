#include "cachedev/pin_requests.h"

#include <cerrno>
#include <cstring>

namespace vesk {
namespace {
int SetBitmap(CacheDevice &device, const PinRequest &request) {
    unsigned char bytes[kDescriptorBytes64] = {};
    const bool is32bit = request.caller.is32bit;
    int result = CallerRead(request.caller, request.argument, bytes, DescriptorBytes(is32bit));
    if (result != 0) {
        return result;
    }
    const BitmapDescriptor descriptor = DescriptorDecode(bytes, is32bit);
    // Compared before anything of that length is allocated.
    if (descriptor.length != CacheDeviceBitmapBytes(device)) {
        return -EINVAL;
    }
    std::vector<uint8_t> bitmap(descriptor.length);
    result = CallerRead(request.caller, descriptor.address, bitmap.data(), bitmap.size());
    if (result == 0) {
        CacheDeviceSetBitmap(device, std::move(bitmap));
    }
    return result;
}

int UnpinRanges(CacheDevice &device, const PinRequest &request) {
    std::vector<SectorRange> ranges(kRangeListRecords);
    const int result = CallerRead(request.caller, request.argument, ranges.data(), kRangeListBytes);
    if (result != 0) {
        return result;
    }
    size_t used = 0;
    while (used < ranges.size() &&
           (ranges[used].startSector != 0 || ranges[used].sectorCount != 0)) {
        ++used;
    }
    ranges.resize(used);
    return CacheDeviceUnpinRanges(device, ranges);
}

int Answer(const PinRequest &request, bool value) {
    const int32_t answer = value ? 1 : 0;
    if (request.data == nullptr) {
        return -EFAULT;
    }
    memcpy(request.data, &answer, sizeof answer);
    return 0;
}

// The 32-bit number announces 4 bytes of answer although the caller's variable has 8: those are
// written directly. The 4 that are handed back through the buffer go to the same place afterwards
// and have to agree.
int GetSize(const CacheDevice &device, const PinRequest &request) {
    const uint64_t bytes = device.images.deviceBytes;
    if (request.data == nullptr) {
        return -EFAULT;
    }
    if (request.number == kRequestGetSize64Bit) {
        memcpy(request.data, &bytes, sizeof bytes);
        return 0;
    }
    memcpy(request.data, &bytes, sizeof(uint32_t));
    return CallerWrite(request.caller, request.argument, &bytes, sizeof bytes);
}

int Dispatch(CacheDevice &device, const PinRequest &request) {
    switch (request.number) {
    case kRequestSetBitmap: return SetBitmap(device, request);
    case kRequestQueryBitmapSet: return Answer(request, CacheDeviceIsBitmapSet(device));
    case kRequestUnpinRanges: return UnpinRanges(device, request);
    case kRequestUnpinAll: CacheDeviceUnpinAll(device); return 0;
    case kRequestQueryAllUnpinned: return Answer(request, CacheDeviceIsAllUnpinned(device));
    case kRequestGetSize64Bit:
    case kRequestGetSize32Bit: return GetSize(device, request);
    default: return -ENOTTY;
    }
}

uint64_t RequestCounters::*CounterOf(uint32_t number) {
    switch (number) {
    case kRequestSetBitmap: return &RequestCounters::setBitmap;
    case kRequestQueryBitmapSet: return &RequestCounters::queryBitmapSet;
    case kRequestUnpinRanges: return &RequestCounters::unpinRanges;
    case kRequestUnpinAll: return &RequestCounters::unpinAll;
    case kRequestQueryAllUnpinned: return &RequestCounters::queryAllUnpinned;
    case kRequestGetSize64Bit:
    case kRequestGetSize32Bit: return &RequestCounters::getSize;
    default: return nullptr;
    }
}
} // namespace

int PinRequestHandle(CacheDevice &device, const PinRequest &request) {
    const auto &faults = device.settings.faults.failRequest;
    const auto fault = faults.find(request.number);
    const int result = fault != faults.end() ? -fault->second : Dispatch(device, request);
    CacheDeviceCountRequest(device, CounterOf(request.number), result != 0);
    return result;
}
} // namespace vesk
