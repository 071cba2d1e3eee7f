#include "tests/faults/walk_order.h"

#include <algorithm>

namespace vesk {
namespace {
using Requests = std::vector<StoredFiles>;

// Keeps the shorter of two complaints.
void KeepBest(const std::string &complaint, bool *isFirst, std::string *best) {
    if (*isFirst || complaint.size() < best->size()) {
        *best = complaint;
    }
    *isFirst = false;
}
} // namespace

std::string JudgeOrders(const std::vector<Attempt> &attempts, bool isAtOnce, const Pins &before,
                        const Disk &begin, const Disk &disk, const Requests &requests) {
    bool isFirst = true;
    std::string best;
    if (attempts.size() == 1) {
        const Attempt &attempt = attempts.front();
        const std::string complaint = JudgeAttempt(attempt, {before, {}, begin}, requests, disk);
        // Files may have been changed before it had begun to look.
        const bool isRight =
            complaint.empty() || JudgeAttempt(attempt, {before, {}, disk}, requests, disk).empty();
        return isRight ? "" : complaint;
    }
    for (const bool isTurned : {false, true}) {
        if (isTurned && !isAtOnce) {
            break;
        }
        const Attempt &one = attempts[isTurned ? 1 : 0];
        const Attempt &other = attempts[isTurned ? 0 : 1];
        for (size_t parting = 0; parting <= requests.size(); ++parting) {
            const auto middle = requests.begin() + static_cast<std::ptrdiff_t>(parting);
            const Requests first(requests.begin(), middle);
            const Requests rest(middle, requests.end());
            const std::string complaint = JudgeAttempt(one, {before, {}, begin}, first, disk);
            // What the first has sent is carried out when the other begins, or not.
            const Beginning held{before, first, begin};
            const Beginning done{PinsAfter(before, first, disk), {}, disk};
            KeepBest(complaint + JudgeAttempt(other, held, rest, disk), &isFirst, &best);
            KeepBest(complaint + JudgeAttempt(other, done, rest, disk), &isFirst, &best);
        }
    }
    return best;
}
} // namespace vesk
