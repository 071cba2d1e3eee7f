#include "text/text_sink.h"

#include <unistd.h>

#include <cerrno>

namespace vesk {
namespace {
const size_t kKeptMax = 65536; // bytes
} // namespace

void TextSink::Put(std::string_view text) {
    kept_.append(text);
    if (fd_ >= 0 && kept_.size() >= kKeptMax) {
        Flush();
    }
}

bool TextSink::Flush() {
    if (fd_ < 0) {
        return true;
    }
    for (size_t at = 0; at < kept_.size() && !failed_;) {
        const ssize_t written = write(fd_, kept_.data() + at, kept_.size() - at);
        if (written > 0) {
            at += static_cast<size_t>(written);
        } else if (written == 0 || errno != EINTR) {
            failed_ = true;
        }
    }
    kept_.clear();
    return !failed_;
}
} // namespace vesk
