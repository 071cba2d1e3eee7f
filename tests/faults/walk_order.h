// Clients that run at once: in which order they came, and which requests are whose, nobody tells.
#pragma once

#include "tests/faults/walk_judge.h"

namespace vesk {
// Whether some order and some parting of the requests has nothing wrong with it; else what is wrong
// with the best one. One or two attempts.
std::string JudgeOrders(const std::vector<Attempt> &attempts, bool isAtOnce, const Pins &before,
                        const Disk &begin, const Disk &disk,
                        const std::vector<StoredFiles> &requests);
} // namespace vesk
