// The pin interface of the cache driver, byte for byte: ioctl request numbers and payload records.
//
// Numbers are fixed constants: the two requests that hand over a record carry no size and no
// direction in their encoding although the driver follows the pointer.
#pragma once

#include <cstddef>
#include <cstdint>

namespace vesk {
const unsigned kPinIoctlSetBitmap = 0x0000FECF;        // payload: PinBitmap, the bitmap descriptor
const unsigned kPinIoctlQueryBitmapSet = 0x8004FECF;   // payload: 32-bit int, filled by the driver
const unsigned kPinIoctlUnpinRanges = 0x0000FED0;      // payload: a whole range list
const unsigned kPinIoctlUnpinAll = 0x0000FED1;         // no payload
const unsigned kPinIoctlQueryAllUnpinned = 0x8004FED2; // payload: 32-bit int, filled by the driver

// Size of the bitmap descriptor (bytes): a 32-bit address and a 32-bit length.
const int kPinBitmapDescriptorBytes = 8;

// A pin bitmap, and the descriptor that the driver reads (8 bytes on the 32-bit target): field
// order counts. What the bits mean stands in bitmap/pin_bitmap.h.
struct PinBitmap {
    unsigned char *data; // malloc'd, owned by the record
    uint32_t size;       // bytes of data
};

// One sector range to release; 16 bytes, little-endian on the target.
struct UnpinInfo {
    alignas(8) uint64_t
        startSector;     // 512-byte sectors, from the start of the volume's block device
    uint64_t numSectors; // 512-byte sectors
};
static_assert(sizeof(UnpinInfo) == 16, "the driver reads 16-byte records");

// The range list: filled from the front; an all-zero record ends it unless all records are used.
const size_t kUnpinListRecords = 1024;
const size_t kUnpinListBytes = 16384;
struct UnpinList {
    UnpinInfo ranges[kUnpinListRecords];
};
static_assert(sizeof(UnpinList) == kUnpinListBytes, "the driver copies 16384 bytes");
} // namespace vesk
