// Setting and clearing ranges in a bitmap in memory.
#include "bench_names.h"

#include "bitmap/pin_bitmap.h"

#include <cstring>
#include <random>
#include <vector>

namespace vesk {
namespace {
const int64_t kFullBytes = 32 << 20; // of a 16 TiB device
const size_t kExtentCount = 1000000;

struct Bytes {
    explicit Bytes(int64_t size) : bytes(static_cast<size_t>(size)) {}
    std::vector<unsigned char> bytes;
    PinBitmap Bitmap() { return {bytes.data(), static_cast<uint32_t>(bytes.size())}; }
};

// Sets and clears everything.
void MarkAll(benchmark::State &state) {
    Bytes bytes(state.range(0));
    PinBitmap bitmap = bytes.Bitmap();
    const uint64_t sectors = static_cast<uint64_t>(state.range(0)) << (kBitmapSectorShift + 3);
    for (auto _ : state) {
        BitmapSetRange(&bitmap, 0, sectors);
        benchmark::ClobberMemory();
        BitmapUnsetRange(&bitmap, 0, sectors);
        benchmark::ClobberMemory();
    }
}

void FillAll(benchmark::State &state) {
    Bytes bytes(state.range(0));
    for (auto _ : state) {
        memset(bytes.bytes.data(), 0xFF, bytes.bytes.size());
        benchmark::ClobberMemory();
        memset(bytes.bytes.data(), 0, bytes.bytes.size());
        benchmark::ClobberMemory();
    }
}

struct Extent {
    uint64_t start; // blocks
    uint64_t count; // blocks
};

// Random extents of 1 to `most` blocks, inside one 64-bit word where that is 64 or less.
std::vector<Extent> RandomExtents(uint64_t blocks, uint64_t most) {
    std::mt19937_64 random(1);
    std::vector<Extent> extents;
    for (size_t i = 0; i < kExtentCount; ++i) {
        const uint64_t count = random() % most + 1;
        uint64_t start = random() % (blocks - most);
        if (most <= 64) {
            start = start / 64 * 64 + random() % (64 - count + 1);
        }
        extents.push_back({start, count});
    }
    return extents;
}

// The time is that of one extent, in a bitmap of as many bytes as the argument says.
template <uint64_t most> void MarkExtents(benchmark::State &state) {
    Bytes bytes(state.range(0));
    PinBitmap bitmap = bytes.Bitmap();
    const auto extents = RandomExtents(bytes.bytes.size() * 8, most);
    size_t i = 0;
    for (auto _ : state) {
        const Extent &extent = extents[i++ % kExtentCount];
        BitmapSetRange(&bitmap, extent.start << kBitmapSectorShift,
                       extent.count << kBitmapSectorShift);
    }
    benchmark::ClobberMemory();
}

// Setting bits in a word whose place and mask are known.
void MarkWords(benchmark::State &state) {
    std::vector<uint64_t> words(static_cast<size_t>(state.range(0)) / sizeof(uint64_t));
    std::vector<Extent> masks = RandomExtents(words.size() * 64, 64);
    for (Extent &mask : masks) {
        mask.count = UINT64_MAX >> (64 - mask.count) << mask.start % 64;
        mask.start /= 64;
    }
    size_t i = 0;
    for (auto _ : state) {
        const Extent &mask = masks[i++ % kExtentCount];
        words[mask.start] |= mask.count;
    }
    benchmark::ClobberMemory();
}

// Filling the bytes of the extents, where they do not end inside a byte.
void FillExtents(benchmark::State &state) {
    Bytes bytes(state.range(0));
    const auto extents = RandomExtents(bytes.bytes.size() * 8, 4096);
    size_t i = 0;
    for (auto _ : state) {
        const Extent &extent = extents[i++ % kExtentCount];
        memset(bytes.bytes.data() + extent.start / 8, 0xFF,
               (extent.start + extent.count - 1) / 8 - extent.start / 8 + 1);
    }
    benchmark::ClobberMemory();
}

const bool kRegistered = [] {
    BenchPair("mark_all", {kFullBytes / 16, kFullBytes / 4, kFullBytes}, MarkAll, FillAll);
    BenchPair("mark_word", {kFullBytes / 1024, kFullBytes / 16, kFullBytes}, MarkExtents<64>,
              MarkWords);
    BenchPair("mark_extent", {kFullBytes / 16, kFullBytes / 4, kFullBytes}, MarkExtents<4096>,
              FillExtents);
    return true;
}();
} // namespace
} // namespace vesk
