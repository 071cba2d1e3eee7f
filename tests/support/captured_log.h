// What the tool logs and prints while an object of this class lives, line by line.
//
// Messages are sent to standard output, as with --stdout, and standard output is caught whole, so
// that a test sees the exact final form. Level 1 unless said otherwise.
#pragma once

#include "base/scoped_fd.h"

#include <string>
#include <vector>

namespace vesk {
// The first and the last of some texts; "(none)" of none.
std::string FirstOf(const std::vector<std::string> &texts);
std::string LastOf(const std::vector<std::string> &texts);

class CapturedLog {
public:
    explicit CapturedLog(int level = 1);
    ~CapturedLog();
    CapturedLog(const CapturedLog &) = delete;
    CapturedLog &operator=(const CapturedLog &) = delete;

    // Everything so far. Lines are without their line feed; an empty line is kept.
    std::string Text();
    std::vector<std::string> Lines();

    // The lines without the program name; at level 2 and above also with every line number as
    // "[N]": "func() [N] : ***** text".
    std::vector<std::string> Messages();

    // Whether some line of Messages() is this one, and how many are.
    bool Has(const std::string &message);
    int Count(const std::string &message);

private:
    ScopedFd savedStdout_;
    ScopedFd file_;
};
} // namespace vesk
