#include "bitmap/bit_runs.h"

#include <algorithm>
#include <cstring>
#include <utility>

namespace vesk {
namespace {
const size_t kStretchBytes = 4096;

// How many bytes from `bytes` on are equal, `size` at most.
size_t CountEqualBytes(const unsigned char *bytes, size_t size) {
    // Equal to their neighbours, all of them: the C library compares faster than any loop here.
    if (memcmp(bytes, bytes + 1, size - 1) == 0) {
        return size;
    }
    return static_cast<size_t>(
        std::find_if(bytes, bytes + size, [bytes](unsigned char byte) { return byte != *bytes; }) -
        bytes);
}

// How many bits are equal from bit `within` of the first byte on: up to the end of that byte, or,
// where it is equal as a whole, of those after it that are the same.
uint64_t CountEqualBits(const unsigned char *bytes, size_t size, unsigned within) {
    const bool set = (*bytes >> within & 1) != 0;
    const unsigned others = (set ? ~*bytes & 0xFFU : *bytes) >> within;
    if (others != 0) {
        return static_cast<uint64_t>(__builtin_ctz(others));
    }
    return within != 0 ? 8 - within
                       : uint64_t{CountEqualBytes(bytes, std::min(size, kStretchBytes))} * 8;
}
} // namespace

bool BitScanStep(BitScan &scan, BitRun &run) {
    run = {0, 0};
    const auto at = static_cast<size_t>(scan.next >> 3);
    if (at == scan.size) {
        std::swap(run, scan.open);
        return false;
    }
    const unsigned within = scan.next & 7;
    const uint64_t equal = CountEqualBits(scan.bytes + at, scan.size - at, within);
    if ((scan.bytes[at] >> within & 1) == 0) {
        std::swap(run, scan.open);
    } else if (scan.open.count == 0) {
        scan.open = {scan.next, equal};
    } else {
        scan.open.count += equal;
    }
    scan.next += equal;
    return true;
}

std::vector<BitRun> BitRunsOf(const unsigned char *bytes, size_t size) {
    std::vector<BitRun> runs;
    BitScan scan{bytes, size};
    bool more = true;
    while (more) {
        BitRun run{0, 0};
        more = BitScanStep(scan, run);
        if (run.count > 0) {
            runs.push_back(run);
        }
    }
    return runs;
}

uint64_t BitCountIn(const unsigned char *bytes, size_t size, const BitRun &run) {
    const uint64_t bits = uint64_t{size} * 8;
    if (run.first >= bits) {
        return 0;
    }
    const uint64_t end = run.first + std::min(run.count, bits - run.first);
    uint64_t count = 0;
    for (uint64_t bit = run.first; bit < end;) {
        const auto at = static_cast<size_t>(bit >> 3);
        const unsigned within = bit & 7;
        const auto taken = static_cast<unsigned>(std::min<uint64_t>(8 - within, end - bit));
        const unsigned byte = bytes[at] >> within & (0xFFU >> (8 - taken));
        count += static_cast<unsigned>(__builtin_popcount(byte));
        bit += taken;
    }
    return count;
}

bool BitIsSet(const unsigned char *bytes, size_t size, uint64_t bit) {
    return bit >> 3 < size && (bytes[static_cast<size_t>(bit >> 3)] >> (bit & 7) & 1) != 0;
}
} // namespace vesk
