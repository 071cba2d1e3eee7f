#include "text/progress_line.h"

#include "base/clock.h"

#include <poll.h>
#include <unistd.h>

namespace vesk {
namespace {
const int64_t kPauseMs = 200;  // between two lines
const int64_t kQuietMs = 1000; // what is done within this needs no line on a terminal
} // namespace

ProgressForm ProgressFormOf(const std::string &name) {
    if (name == "json") {
        return ProgressForm::Json;
    }
    return name == "auto" && isatty(STDERR_FILENO) == 1 ? ProgressForm::Line : ProgressForm::None;
}

ProgressLine::ProgressLine(ProgressForm form, int fd)
    : form_(form), fd_(fd), start_(NowMs()), written_(start_) {}

ProgressLine::~ProgressLine() {
    if (hasWritten_ && form_ == ProgressForm::Line) {
        Put("\r\033[K");
    }
}

int64_t ProgressLine::ElapsedMs() const {
    return NowMs() - start_;
}

bool ProgressLine::IsDue() const {
    const int64_t now = NowMs();
    return form_ != ProgressForm::None && now - written_ >= kPauseMs &&
           (form_ == ProgressForm::Json || now - start_ >= kQuietMs);
}

void ProgressLine::Write(const std::string &text) {
    written_ = NowMs();
    hasWritten_ = true;
    if (form_ == ProgressForm::Json) {
        Put(text + "\n");
    } else {
        Put("\r" + text + "\033[K");
    }
}

void ProgressLine::Put(const std::string &text) const {
    // A line that is lost harms nobody, and a reader who sleeps must not keep the work waiting.
    pollfd output{fd_, POLLOUT, 0};
    if (poll(&output, 1, 0) > 0) {
        const ssize_t written = write(fd_, text.data(), text.size());
        static_cast<void>(written);
    }
}
} // namespace vesk
