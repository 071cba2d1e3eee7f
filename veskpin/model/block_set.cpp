#include "model/block_set.h"

#include <algorithm>

namespace vesk {
BlockSet BlockSetOf(uint64_t blocks) {
    return BlockSet(static_cast<size_t>((blocks + 7) / 8));
}

uint64_t BlockSetAdd(BlockSet *set, const BitRun &run) {
    const uint64_t bits = uint64_t{set->size()} * 8;
    if (run.first >= bits) {
        return 0;
    }
    const uint64_t end = run.first + std::min(run.count, bits - run.first);
    const uint64_t before = BlockSetCountIn(*set, run);
    for (uint64_t bit = run.first; bit < end;) {
        const unsigned within = bit & 7;
        const auto taken = static_cast<unsigned>(std::min<uint64_t>(8 - within, end - bit));
        unsigned char &byte = (*set)[static_cast<size_t>(bit >> 3)];
        byte = static_cast<unsigned char>(byte | (0xFFU >> (8 - taken) << within));
        bit += taken;
    }
    return end - run.first - before;
}

uint64_t BlockSetCount(const BlockSet &set) {
    return BlockSetCountIn(set, {0, uint64_t{set.size()} * 8});
}

uint64_t BlockSetCountIn(const BlockSet &set, const BitRun &run) {
    return BitCountIn(set.data(), set.size(), run);
}

uint64_t BlockSetCountBoth(const BlockSet &a, const BlockSet &b) {
    uint64_t count = 0;
    for (size_t at = 0; at < std::min(a.size(), b.size()); ++at) {
        count += static_cast<unsigned>(__builtin_popcount(a[at] & b[at]));
    }
    return count;
}
} // namespace vesk
