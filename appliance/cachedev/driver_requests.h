// The cache driver's request numbers and payload records, as the emulated driver sees them.
//
// Written down a second time on purpose: the client has its own header, so that a slip in either of
// them shows up as a refused request instead of cancelling itself out. Constants only, no state.
#pragma once

#include <cstddef>
#include <cstdint>

namespace vesk {
// The full 32-bit numbers tell the requests apart; the direction and size bits of a number do not
// describe its payload (the two requests that pass a record carry neither).
constexpr uint32_t kRequestSetBitmap = 0x0000FECF;      // argument: address of a bitmap descriptor
constexpr uint32_t kRequestQueryBitmapSet = 0x8004FECF; // answer: 32-bit int
constexpr uint32_t kRequestUnpinRanges = 0x0000FED0;    // argument: address of a range list
constexpr uint32_t kRequestUnpinAll = 0x0000FED1;       // no argument
constexpr uint32_t kRequestQueryAllUnpinned = 0x8004FED2; // answer: 32-bit int

// BLKGETSIZE64. Its number holds sizeof(size_t), the answer has 8 bytes all the same.
constexpr uint32_t kRequestGetSize64Bit = 0x80081272;
constexpr uint32_t kRequestGetSize32Bit = 0x80041272;

constexpr uint64_t kSectorBytes = 512;
constexpr uint64_t kBlockBytes = 65536; // one cache block, one bit of the pin bitmap
constexpr uint64_t kBlockSectors = kBlockBytes / kSectorBytes;

// One byte of the pin bitmap stands for 8 blocks: bitmap bytes = device bytes >> kBitmapShift.
constexpr unsigned kBitmapShift = 19;

// One record of the range list.
struct SectorRange {
    uint64_t startSector; // first sector on the cache device, in 512-byte sectors
    uint64_t sectorCount; // in 512-byte sectors
};
static_assert(sizeof(SectorRange) == 16, "record of the unpin-ranges request");

// The range list is always handed over whole; an all-zero record ends it early.
constexpr size_t kRangeListRecords = 1024;
constexpr size_t kRangeListBytes = kRangeListRecords * sizeof(SectorRange);
static_assert(kRangeListBytes == 16384, "payload of the unpin-ranges request");
} // namespace vesk
