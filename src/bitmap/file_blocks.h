// The blocks that a file's extents touch, for those who only count them.
//
// Thread rule: no state.
#pragma once

#include "bitmap/bit_runs.h"

#include "vesk/storage_core.h"

#include <vector>

namespace vesk {
// Each block once, in ascending order, no two runs adjacent: just the bits that marking the file
// sets, also those past a bitmap's end.
std::vector<BitRun> FileBlocksOf(const FileMappingTable &table);
} // namespace vesk
