// What the kernel tells about a thread.
#pragma once

#include <fstream>
#include <iterator>
#include <string>
#include <sys/types.h>

namespace vesk {
// Whether this thread of this process waits for something: false while it runs, while it only waits
// for a processor, and where there is none.
inline bool ThreadSleeps(pid_t process, pid_t thread) {
    std::ifstream file("/proc/" + std::to_string(process) + "/task/" + std::to_string(thread) +
                       "/stat");
    const std::string status((std::istreambuf_iterator<char>(file)), {});
    return status.rfind(") S") != std::string::npos;
}
} // namespace vesk
