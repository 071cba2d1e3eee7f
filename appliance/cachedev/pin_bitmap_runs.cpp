#include "cachedev/pin_bitmap_runs.h"

namespace {

constexpr uint64_t kByteBits = 8;

} // namespace

bool PinBitmapTest(const std::vector<uint8_t> &bitmap, uint64_t block) {
    if (block / kByteBits >= bitmap.size()) {
        return false;
    }
    const unsigned byte = bitmap[static_cast<size_t>(block / kByteBits)];
    return ((byte >> (block % kByteBits)) & 1U) != 0;
}

std::vector<BlockRun> PinBitmapRuns(const std::vector<uint8_t> &bitmap) {
    std::vector<BlockRun> runs;
    uint64_t open = 0; // length of the run that ends just before the current bit
    const uint64_t bits = uint64_t{bitmap.size()} * kByteBits;
    uint64_t bit = 0;
    const auto close = [&] {
        if (open > 0) {
            runs.push_back({bit - open, open});
        }
        open = 0;
    };
    while (bit < bits) {
        const unsigned byte = bitmap[static_cast<size_t>(bit / kByteBits)];
        // Bitmaps are long and mostly all clear or all set: take such bytes whole.
        if (bit % kByteBits == 0 && byte == 0x00) {
            close();
            bit += kByteBits;
        } else if (bit % kByteBits == 0 && byte == 0xFF) {
            open += kByteBits;
            bit += kByteBits;
        } else {
            if (((byte >> (bit % kByteBits)) & 1U) == 0) {
                close();
            } else {
                ++open;
            }
            ++bit;
        }
    }
    close();
    return runs;
}
