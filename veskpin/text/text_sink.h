// Where an answer goes: written piece by piece, so that an answer of any length needs little
// memory. Thread rule: one owner, no locking.
#pragma once

#include <string>
#include <string_view>

namespace vesk {
class TextSink {
public:
    // Writes to this descriptor, which stays the caller's; without one all is kept.
    explicit TextSink(int fd = -1) : fd_(fd) {}

    void Put(std::string_view text);
    // What was put and is not written yet. False with errno: the text could not be written whole,
    // now or earlier.
    bool Flush();
    const std::string &Kept() const { return kept_; }

private:
    int fd_;
    int error_ = 0; // the errno of the write that failed
    std::string kept_;
};
} // namespace vesk
