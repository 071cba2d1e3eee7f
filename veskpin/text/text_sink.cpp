#include "text/text_sink.h"

#include <unistd.h>

#include <cerrno>

namespace vesk {
bool TextSink::Flush() {
    if (fd_ < 0) {
        return true;
    }
    for (size_t at = 0; at < kept_.size() && error_ == 0;) {
        const ssize_t written = write(fd_, kept_.data() + at, kept_.size() - at);
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
