#include "text/text_sink.h"

#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>

namespace vesk {
namespace {
const int kTryMs = 100;
const int kTries = 10;
} // namespace

// Waits until somebody reads. False: nobody does.
bool TextSink::MayWrite() const {
    pollfd output{fd_, POLLOUT, 0};
    for (int tries = 0; poll(&output, 1, kTryMs) <= 0;) {
        tries = isEnded_() ? tries + 1 : 0;
        if (tries > kTries) {
            return false;
        }
    }
    return true;
}

bool TextSink::Flush() {
    if (fd_ < 0) {
        return true;
    }
    for (size_t at = 0; at < kept_.size() && error_ == 0;) {
        size_t bytes = kept_.size() - at;
        if (isEnded_ != nullptr) {
            // As much as a pipe that has room takes at once.
            bytes = std::min<size_t>(bytes, PIPE_BUF);
            if (!MayWrite()) {
                error_ = EINTR;
                break;
            }
        }
        const ssize_t written = write(fd_, kept_.data() + at, bytes);
        if (written > 0) {
            at += static_cast<size_t>(written);
        } else if (written == 0 || errno != EINTR) {
            error_ = written == 0 ? ENOSPC : errno;
        }
    }
    kept_.clear();
    errno = error_ != 0 ? error_ : errno;
    return error_ == 0;
}
} // namespace vesk
