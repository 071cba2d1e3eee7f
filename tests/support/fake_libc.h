// A few C library calls replaced for tests: time that does not pass, a sync that only counts, calls
// that fail when told to, and ioctl requests that a test answers.
//
// The test program defines the functions itself, so the product's code runs unchanged. Everything
// is as in production until a test asks for something else; Reset() in SetUp and TearDown.
#pragma once

#include <cstddef>
#include <functional>
#include <string>

struct stat;

namespace vesk {
struct FakeLibc {
    static void Reset();

    // sleep() returns at once, adds its seconds here and calls onSleep.
    static int sleeps;
    static std::function<void()> onSleep;

    // What setitimer() sets comes this many times later, and CLOCK_MONOTONIC runs this many times
    // slower: a busy machine needs more time than the tool gives itself.
    static int alarmFactor;
    static int clockFactor;
    // Told of what setitimer() is asked for (microseconds), and of every usleep().
    static std::function<void(long long)> onAlarm;
    static std::function<void()> onPause;

    static int syncs; // sync() only counts
    static std::function<void()> onSync;

    // The n-th next call (1: the next) of this function fails with this errno (a function that
    // returns its error returns it; aligned_alloc and strdup return null). Known: ioctl, msgctl,
    // msgget, msgsnd, write, read, lseek, fsync, rename, fchown, pthread_mutex_init,
    // pthread_create, signal, aligned_alloc, strdup, ftok, stat (lstat is one, too).
    static void Fail(const std::string &function, int error, int nth = 1);
    // The same for every call from the n-th on.
    static void FailFrom(const std::string &function, int error, int nth = 1);
    // The n-th next read or write moves at most this many bytes; 0: none, and no failure either.
    static void Limit(const std::string &function, size_t bytes, int nth = 1);
    // Counts the function's calls from now on; ordering a failure or a limit does so, too.
    static void Count(const std::string &function);
    // How often the function was called since Reset().
    static int Calls(const std::string &function);

    // Changes what stat() or lstat() has found while it is set.
    static std::function<void(struct stat *)> onStat;

    // Answers every ioctl while it is set: (request, third argument) to the result; -1 with errno.
    static std::function<int(unsigned long, void *)> onIoctl;

    // Called before every msgctl().
    static std::function<void()> onMsgctl;

    // Told of every read before it happens: descriptor, its position (bytes; -1 where there is
    // none), bytes asked for.
    static std::function<void(int, long long, size_t)> onRead;

    // Told of every open() and openat() before it happens: path as given, flags, and the mode that
    // a file to be created gets (0 without O_CREAT).
    static std::function<void(const std::string &, int, unsigned)> onOpen;
};
} // namespace vesk
