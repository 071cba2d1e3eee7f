// Lines on standard error that tell how far something has come: one that replaces itself on a
// terminal, from the first second on, or a JSON object a line for programs. At most five a second.
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

class ProgressLine {
public:
    // Writes to this descriptor, which stays the caller's.
    ProgressLine(ProgressForm form, int fd);
    // Clears the line.
    ~ProgressLine();
    ProgressLine(const ProgressLine &) = delete;
    ProgressLine &operator=(const ProgressLine &) = delete;

    ProgressForm Form() const { return form_; }

    // Milliseconds since the beginning.
    int64_t ElapsedMs() const;

    // Whether it is time for the next one.
    bool IsDue() const;

    bool HasWritten() const { return hasWritten_; }

    // Writes it: a JSON object, or a text for people.
    void Write(const std::string &text);

private:
    void Put(const std::string &text) const;
    const ProgressForm form_;
    const int fd_;
    const int64_t start_; // milliseconds of the monotonic clock
    int64_t written_;
    bool hasWritten_ = false;
};
} // namespace vesk
