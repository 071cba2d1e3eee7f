#include "text/work_progress.h"

#include "text/units.h"

#include <algorithm>
#include <cmath>

namespace vesk {
namespace {
const unsigned kSectorShift = 9;
const uint64_t kBlockSectors = 128; // of 64 KiB

std::string NumberOrNull(const std::optional<uint64_t> &number) {
    return number ? std::to_string(*number) : "null";
}

std::optional<uint64_t> PerSecond(uint64_t sectors, int64_t elapsedMs) {
    return elapsedMs > 0 ? std::optional(sectors * 1000 / static_cast<uint64_t>(elapsedMs))
                         : std::nullopt;
}

double ShareOf(uint64_t done, uint64_t all) {
    return all == 0 ? 1 : std::min(1.0, static_cast<double>(done) / static_cast<double>(all));
}
} // namespace

void WorkProgress::Done(uint64_t files, uint64_t sectors) {
    files_ += files;
    sectors_ += sectors;
    Tick();
}

void WorkProgress::End() {
    if (line_.Form() == ProgressForm::Json && line_.HasWritten() && files_ != filesTold_) {
        line_.Write(JsonText());
        filesTold_ = files_;
    }
}

void WorkProgress::Tick() {
    if (line_.IsDue()) {
        filesTold_ = files_;
        line_.Write(line_.Form() == ProgressForm::Json ? JsonText() : LineText());
    }
}

// The part that is done. Files stand for the requests, which take a second each, sectors for what
// is read: whichever is further behind tells more of the rest.
double WorkProgress::Share() const {
    const double files = ShareOf(files_, work_.files);
    return work_.sectors ? std::min(files, ShareOf(sectors_, *work_.sectors)) : files;
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
    const auto total = work_.sectors ? std::optional(*work_.sectors / kBlockSectors) : std::nullopt;
    return "{\"files\":" + std::to_string(files_) + ",\"total\":" + std::to_string(work_.files) +
           ",\"blocks\":" + std::to_string(sectors_ / kBlockSectors) +
           ",\"blocksTotal\":" + NumberOrNull(total) +
           ",\"blocksPerSecond\":" + NumberOrNull(PerSecond(sectors_ / kBlockSectors, elapsed)) +
           ",\"secondsLeft\":" + NumberOrNull(SecondsLeft(elapsed)) +
           ",\"milliseconds\":" + std::to_string(elapsed) + "}";
}

std::string WorkProgress::LineText() const {
    const int64_t elapsed = line_.ElapsedMs();
    const auto rate = PerSecond(sectors_, elapsed);
    const auto left = SecondsLeft(elapsed);
    return std::to_string(files_) + " of " + UnitsOfThings(work_.files, "file") + ", " +
           UnitsOfBytes(sectors_ << kSectorShift) +
           (work_.sectors ? " of " + UnitsOfBytes(*work_.sectors << kSectorShift) : "") +
           (rate ? ", " + UnitsOfBytes(*rate << kSectorShift) + "/s" : "") +
           (left ? ", " + UnitsOfSeconds(*left) + " left" : "");
}
} // namespace vesk
