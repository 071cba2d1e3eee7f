// A part of a test in a process of its own, with its standard output in a pipe: for what ends the
// process or changes its signals.
//
// Messages go to standard output; pauses last a millisecond. The limit that the tool sets to its
// own end is stretched, unless the child cannot end otherwise: what ends orderly is then seen to,
// however busy the machine is. The child is killed when the object goes or the test program does.
#pragma once

#include <chrono>
#include <cstdlib>
#include <functional>
#include <string>
#include <sys/types.h>
#include <vector>

namespace vesk {
// The thread sanitizer holds signals back until the thread calls something that it knows, and calls
// a handler's output an error: what is meant to end a process inside such a call cannot be shown.
#ifdef __SANITIZE_THREAD__
#define SKIP_WHERE_SIGNALS_COME_LATE()                                                             \
    GTEST_SKIP() << "under the thread sanitizer signals come late"
#else
#define SKIP_WHERE_SIGNALS_COME_LATE() static_assert(true, "a semicolon follows")
#endif

// User-mode emulation catches signals itself, so the kernel does not tell which ones the test's
// process catches.
#define SKIP_WHERE_SIGNALS_ARE_EMULATED()                                                          \
    if (getenv("VESK_USER_EMULATION") != nullptr) {                                                \
        GTEST_SKIP() << "the emulator, not the process, catches the signals here";                 \
    }                                                                                              \
    static_assert(true, "a semicolon follows")

class ChildProcess {
public:
    struct Setup {
        int logLevel = 1;
        bool stuffedPipe = false;  // the pipe is full before the child starts; real limit
        bool lineBuffered = false; // else its output comes in blocks, or at its end
    };
    // Runs `body` on a thread of the child; the child's exit status is what it returns. When it
    // ends its thread instead, the child goes on.
    ChildProcess(const Setup &setup, const std::function<int()> &body);
    ~ChildProcess();
    ChildProcess(const ChildProcess &) = delete;
    ChildProcess &operator=(const ChildProcess &) = delete;

    pid_t Id() const { return pid_; }
    void Signal(int number) const;

    // The exit status, 128 + the number of the signal that ended it, or -1 where it has not ended
    // within this time.
    int AwaitEnd(std::chrono::milliseconds limit = std::chrono::seconds(30));

    // Whether it still runs.
    bool Runs();

    // Whether the condition comes true within half a minute.
    static bool Await(const std::function<bool()> &condition);
    // Whether the child has a handler for this signal.
    bool Catches(int number) const;
    // Whether all its threads wait for something.
    bool Sleeps() const;

    // Whether it writes this text within half a minute.
    bool AwaitOutput(const std::string &text);

    // What the child has written so far: lines without the program's name, with every line number
    // as "[N]".
    std::vector<std::string> Messages();

private:
    void ReadOutput();
    pid_t pid_ = -1;
    int output_ = -1;
    bool ended_ = false;
    int result_ = -1; // of AwaitEnd, once it has ended
    std::string text_;
};
} // namespace vesk
