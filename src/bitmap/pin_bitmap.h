// A volume's pin bitmap in memory: one bit for each block of 128 sectors (64 KiB) of the cache
// device; a set bit means pinned.
//
// Bit b is bit (b mod 8) of byte (b div 8), bit 0 the least significant, and covers sectors 128*b
// to 128*b + 127.
//
// Thread rule: no locking; a bitmap belongs to one thread at a time.
#pragma once

#include "bitmap/bit_runs.h"
#include "driver/pin_interface.h"

#include <cstdint>

namespace vesk {
const unsigned kBitmapSectorShift = 7; // sectors to blocks: 128 sectors of 512 bytes
const unsigned kBitmapByteShift = 16;  // bytes to blocks: 64 KiB
const unsigned kBitmapSizeShift = 19; // device bytes to bitmap bytes: 8 blocks a byte, rounded down

// Frees the bytes and the record (both malloc'd). A null record or null bytes are an error message.
void BitmapFree(PinBitmap *bitmap);

// The blocks that a sector range touches, rounded outwards to whole blocks. The last block is that
// of sector startSector + numSectors - 1, in 64-bit arithmetic that wraps; so a range of no sectors
// touches nothing where startSector is a multiple of 128, except at 0, where it wraps to
// everything, and startSector's own block elsewhere.
BitRun BitmapBlocksOf(uint64_t startSector, uint64_t numSectors);

// Sets (op 1) or clears (any other op) the bits of these blocks. Bits past the bitmap's end are
// ignored. Always 0.
int BitmapOperation(PinBitmap *bitmap, uint64_t startSector, uint64_t numSectors, int op);
int BitmapSetRange(PinBitmap *bitmap, uint64_t startSector, uint64_t numSectors);
int BitmapUnsetRange(PinBitmap *bitmap, uint64_t startSector, uint64_t numSectors);
} // namespace vesk
