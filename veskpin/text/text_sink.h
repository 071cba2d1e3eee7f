// Where an answer goes: written piece by piece, so that an answer of any length needs little
// memory. Thread rule: one owner, no locking.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace vesk {
class TextSink {
public:
    // Writes to this descriptor, which stays the caller's; without one all is kept.
    explicit TextSink(int fd = -1) : fd_(fd) {}

    // From here on nothing waits for a reader who takes nothing for a second while `isEnded` holds.
    void GiveUpWhen(bool (*isEnded)()) { isEnded_ = isEnded; }

    // These are called for every word of an answer.
    void Put(std::string_view text) {
        kept_.append(text);
        if (fd_ >= 0 && kept_.size() >= kKeptMax) {
            Flush();
        }
    }
    void Put(char letter) { kept_.push_back(letter); } // written with the text that follows
    // What was put and is not written yet. False with errno: the text could not be written whole,
    // now or earlier.
    bool Flush();
    const std::string &Kept() const { return kept_; }

private:
    static constexpr size_t kKeptMax = 65536; // bytes
    bool MayWrite() const;
    int fd_;
    bool (*isEnded_)() = nullptr;
    int error_ = 0; // the errno of the write that failed
    std::string kept_;
};
} // namespace vesk
