#include "text/progress.h"

#include <unistd.h>

#include <ctime>

namespace vesk {
namespace {
const int64_t kPauseMs = 200;  // between two lines
const int64_t kQuietMs = 1000; // what is done within this needs no line on a terminal

int64_t NowMs() {
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return int64_t{now.tv_sec} * 1000 + now.tv_nsec / 1000000;
}
} // namespace

ProgressForm ProgressFormOf(const std::string &name) {
    if (name == "json") {
        return ProgressForm::Json;
    }
    return name == "auto" && isatty(STDERR_FILENO) == 1 ? ProgressForm::Line : ProgressForm::None;
}

Progress::Progress(ProgressForm form, uint64_t total, int fd)
    : form_(form), total_(total), fd_(fd), start_(NowMs()), written_(start_) {}

Progress::~Progress() {
    if (hasLine_) {
        Put("\r\033[K");
    }
}

void Progress::Step() {
    ++files_;
    // The clock is asked now and then only: most steps take a few microseconds.
    if (form_ == ProgressForm::None || files_ % 64 != 0) {
        return;
    }
    const int64_t now = NowMs();
    if (now - written_ >= kPauseMs) {
        Write(now);
    }
}

void Progress::Write(int64_t now) {
    const std::string files = std::to_string(files_);
    if (form_ == ProgressForm::Json) {
        Put("{\"files\":" + files +
            ",\"total\":" + (total_ == 0 ? "null" : std::to_string(total_)) +
            ",\"milliseconds\":" + std::to_string(now - start_) + "}\n");
    } else if (now - start_ >= kQuietMs) {
        const std::string of = total_ == 0 ? "" : " of " + std::to_string(total_);
        Put("\r" + files + of + " files looked at\033[K");
        hasLine_ = true;
    }
    written_ = now;
}

void Progress::Put(const std::string &text) const {
    // A line that is lost harms nobody.
    const ssize_t written = write(fd_, text.data(), text.size());
    static_cast<void>(written);
}
} // namespace vesk
