// A file that answers a cache driver's pin request, or does not, for tests of those who ask it.
//
// Thread rule: to be used by the test's main thread; the answers come from a process of its own.
#pragma once

#include <sys/types.h>

#include <string>

namespace vesk {
class FakeDriver {
public:
    // Serves the file in a FUSE filesystem at /mnt/<name>. It knows the query-all-unpinned request
    // when `hasPinInterface` is set and no other request in any case.
    FakeDriver(const std::string &name, bool hasPinInterface);
    FakeDriver(const FakeDriver &) = delete;
    FakeDriver &operator=(const FakeDriver &) = delete;
    ~FakeDriver();

    std::string skipReason; // why there is none; empty: it answers
    std::string devicePath;

private:
    std::string mountPath_;
    pid_t server_ = -1; // process; negative: none
};
} // namespace vesk
