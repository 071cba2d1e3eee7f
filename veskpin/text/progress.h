// How far a long look has come, on standard error: a line that replaces itself on a terminal, from
// the first second on, or a JSON object a line for programs.
//
// Thread rule: one owner.
#pragma once

#include <cstdint>
#include <string>

namespace vesk {
enum class ProgressForm {
    None,
    Line, // for a terminal
    Json,
};

// "auto": a line where standard error is a terminal, else nothing; "json"; anything else: nothing.
ProgressForm ProgressFormOf(const std::string &name);

class Progress {
public:
    // `total` files, 0: not known. Writes to this descriptor, which stays the caller's.
    Progress(ProgressForm form, uint64_t total, int fd = 2);
    // Clears the line.
    ~Progress();
    Progress(const Progress &) = delete;
    Progress &operator=(const Progress &) = delete;

    // One more file; written at most five times a second.
    void Step();

private:
    void Write(int64_t now);
    void Put(const std::string &text) const;
    const ProgressForm form_;
    const uint64_t total_;
    const int fd_;
    const int64_t start_; // milliseconds of the monotonic clock
    int64_t written_;
    uint64_t files_ = 0;
    bool hasLine_ = false;
};
} // namespace vesk
