// Whether what a veskpin of the walk has told is true.
#pragma once

#include "tests/faults/walk_judge.h"

namespace vesk {
std::string JudgeReport(const Case &the);
} // namespace vesk
