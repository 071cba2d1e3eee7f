// The pin services that run on the machine, found from outside: from what the kernel shows of
// processes and their threads. Nothing is asked of them.
//
// Thread rule: no state.
#pragma once

#include <sys/types.h>

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace vesk {
struct ServiceThread {
    pid_t id = 0;
    std::string folder; // below task/
    std::string name;
    char state = '?';        // the kernel's letter
    uint64_t startTicks = 0; // of the machine's clock, since its start
};

struct ServiceProcess {
    pid_t pid = 0;
    std::vector<ServiceThread> threads; // in ascending order of their ids: the first takes requests
    std::optional<std::string> config;  // absolute path in its own mount namespace
    // Its namespaces are others than ours ("ipc", "mnt"). Absent where that cannot be told.
    std::optional<std::vector<std::string>> otherNamespaces;
    std::string root; // the folder of the root file system that it sees, as we see it
    int error = 0;    // errno: not every thread can be looked at
};

// Whether it has not ended.
bool ServiceThreadLives(const ServiceThread &thread);

// The services of root and of the caller's own user, in ascending order of their pids, from what
// the kernel shows in `procFolder`. `*error` becomes an errno when not every process can be looked
// at.
std::vector<ServiceProcess> ServiceProcessesFind(const std::string &procFolder, int *error);

// The one with this number; nothing: it has ended, is none, or cannot be looked at (`*error`).
std::optional<ServiceProcess> ServiceProcessAt(const std::string &procFolder, pid_t pid,
                                               int *error);
} // namespace vesk
