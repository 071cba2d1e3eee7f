#include "bitmap/file_blocks.h"

#include "bitmap/pin_bitmap.h"

#include <algorithm>

namespace vesk {
std::vector<BitRun> FileBlocksOf(const FileMappingTable &table) {
    std::vector<BitRun> all;
    all.reserve(table.entries.size());
    for (const FileMappingEntry &entry : table.entries) {
        all.push_back(BitmapBlocksOf(entry.deviceStartSector, entry.numSectors));
    }
    std::sort(all.begin(), all.end(),
              [](const BitRun &a, const BitRun &b) { return a.first < b.first; });
    std::vector<BitRun> runs;
    for (const BitRun &run : all) {
        if (run.count == 0) {
            continue;
        }
        if (runs.empty() || run.first > runs.back().first + runs.back().count) {
            runs.push_back(run);
            continue;
        }
        const uint64_t end = std::max(runs.back().first + runs.back().count, run.first + run.count);
        runs.back().count = end - runs.back().first;
    }
    return runs;
}
} // namespace vesk
