#include "text/work_progress.h"

#include "text/units.h"

#include <algorithm>
#include <cmath>

namespace vesk {
namespace {
const unsigned kBlockShift = 16; // a block is 64 KiB

std::string NumberOrNull(const std::optional<uint64_t> &number) {
    return number ? std::to_string(*number) : "null";
}

std::optional<uint64_t> PerSecond(uint64_t blocks, int64_t elapsedMs) {
    return elapsedMs > 0 ? std::optional(blocks * 1000 / static_cast<uint64_t>(elapsedMs))
                         : std::nullopt;
}

double ShareOf(uint64_t done, uint64_t all) {
    return all == 0 ? 1 : std::min(1.0, static_cast<double>(done) / static_cast<double>(all));
}
} // namespace

void WorkProgress::Done(uint64_t files, uint64_t blocks) {
    files_ += files;
    blocks_ += blocks;
    Tick();
}

void WorkProgress::Tick() {
    if (line_.IsDue()) {
        line_.Write(line_.Form() == ProgressForm::Json ? JsonText() : LineText());
    }
}

// The part that is done. Files stand for the requests, which take a second each, blocks for what is
// read: whichever is further behind tells more of the rest.
double WorkProgress::Share() const {
    const double files = ShareOf(files_, work_.files);
    return work_.blocks ? std::min(files, ShareOf(blocks_, *work_.blocks)) : files;
}

std::optional<uint64_t> WorkProgress::SecondsLeft(int64_t elapsedMs) const {
    const double elapsed = static_cast<double>(elapsedMs) / 1000;
    const double share = Share();
    if (share > 0) {
        return static_cast<uint64_t>(lround(elapsed * (1 - share) / share));
    }
    if (!work_.seconds) {
        return std::nullopt;
    }
    const double left = static_cast<double>(*work_.seconds) - elapsed;
    return left < 1 ? 1 : static_cast<uint64_t>(lround(left));
}

std::string WorkProgress::JsonText() const {
    const int64_t elapsed = line_.ElapsedMs();
    return "{\"files\":" + std::to_string(files_) + ",\"total\":" + std::to_string(work_.files) +
           ",\"blocks\":" + std::to_string(blocks_) +
           ",\"blocksTotal\":" + NumberOrNull(work_.blocks) +
           ",\"blocksPerSecond\":" + NumberOrNull(PerSecond(blocks_, elapsed)) +
           ",\"secondsLeft\":" + NumberOrNull(SecondsLeft(elapsed)) +
           ",\"milliseconds\":" + std::to_string(elapsed) + "}";
}

std::string WorkProgress::LineText() const {
    const int64_t elapsed = line_.ElapsedMs();
    const auto rate = PerSecond(blocks_, elapsed);
    const auto left = SecondsLeft(elapsed);
    return std::to_string(files_) + " of " + UnitsOfThings(work_.files, "file") + ", " +
           UnitsOfBytes(blocks_ << kBlockShift) +
           (work_.blocks ? " of " + UnitsOfBytes(*work_.blocks << kBlockShift) : "") +
           (rate ? ", " + UnitsOfBytes(*rate << kBlockShift) + "/s" : "") +
           (left ? ", " + UnitsOfSeconds(*left) + " left" : "");
}
} // namespace vesk
