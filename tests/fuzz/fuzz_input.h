// What the fuzzing targets share: reading an input piece by piece, a folder in memory for the files
// that the code under test wants, and the way in which a target says that something must not be.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace vesk {
// Every target defines this; always 0.
extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size);

// An input, read from its beginning; zeros past its end.
class FuzzInput {
public:
    FuzzInput(const uint8_t *data, size_t size) : data_(data), size_(size) {}
    bool IsEmpty() const { return at_ == size_; }
    uint8_t Byte() { return at_ < size_ ? data_[at_++] : uint8_t{0}; }
    uint64_t Number(size_t bytes);  // little-endian
    std::string Text(size_t bytes); // fewer at the end
    std::string Rest() { return Text(size_ - at_); }

private:
    const uint8_t *data_;
    size_t size_;
    size_t at_ = 0;
};

// A path in this process's own folder below /dev/shm, which is removed at its end.
std::string FuzzPath(const char *name);
void FuzzWrite(const std::string &path, const std::string &content);
std::string FuzzRead(const std::string &path);

// Ends the process with a message unless `holds`.
void FuzzExpect(bool holds, const char *what);
} // namespace vesk
