// A test program's own view of the mounts, with an empty tmpfs on /tmp: whatever is created or
// mounted there is seen by nobody else and is gone with the process.
//
// One file of the program calls UsePrivateMounts() from a static initialiser; a test that needs the
// private view begins with SKIP_WITHOUT_PRIVATE_MOUNTS().
#pragma once

#include <gtest/gtest.h>
#include <string>

namespace vesk {
// Sets the private view up before the program's first test. Always true.
bool UsePrivateMounts();

// Why the program has no private view; empty when it has one.
const std::string &PrivateMountsMissing();

#define SKIP_WITHOUT_PRIVATE_MOUNTS()                                                              \
    if (!PrivateMountsMissing().empty()) {                                                         \
        GTEST_SKIP() << PrivateMountsMissing();                                                    \
    }                                                                                              \
    static_assert(true, "a semicolon follows")

// Makes a node of a character device, for instance 1, 3 (null) or 1, 7 (full), at `path`. Tests
// write to such nodes in the private view, never to the machine's: code that went astray could
// replace them. False on failure.
bool MakeCharacterDevice(const std::string &path, unsigned major, unsigned minor);

// Something mounted for the length of a scope. Only in the private view.
class ScopedMount {
public:
    // A tmpfs of this size (bytes) and, unless 0, of so many inodes, its root's included; or
    // `source` bound over `target`.
    static ScopedMount Tmpfs(const std::string &target, size_t bytes, unsigned inodes = 0);
    static ScopedMount Bind(const std::string &source, const std::string &target);
    ~ScopedMount();
    ScopedMount(const ScopedMount &) = delete;
    ScopedMount &operator=(const ScopedMount &) = delete;

    bool IsMounted() const { return mounted_; }

private:
    ScopedMount(std::string target, bool mounted);
    std::string target_;
    bool mounted_;
};
} // namespace vesk
