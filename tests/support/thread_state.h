// What the kernel tells about a thread.
#pragma once

#include <fstream>
#include <linux/futex.h>
#include <string>
#include <sys/types.h>

namespace vesk {
// Whether this thread of this process waits for something: false while it runs, while it only waits
// for a processor, and where there is none.
inline bool ThreadSleeps(pid_t process, pid_t thread) {
    std::ifstream file("/proc/" + std::to_string(process) + "/task/" + std::to_string(thread) +
                       "/stat");
    std::string status;
    std::getline(
        file, status); // which, unlike an iterator, does not throw where the thread ends meanwhile
    return status.rfind(") S") != std::string::npos;
}

// Whether this thread waits for a condition, as opposed to a lock, and does so without a limit of
// time. Told by the arguments of the call that it is in.
inline bool ThreadAwaitsConditionForGood(pid_t process, pid_t thread) {
    std::ifstream file("/proc/" + std::to_string(process) + "/task/" + std::to_string(thread) +
                       "/syscall");
    std::string number; // differs from machine to machine
    unsigned long long word = 0;
    unsigned long long operation = 0;
    unsigned long long value = 0;
    unsigned long long limit = 0; // an address
    const auto command = static_cast<unsigned>(FUTEX_CMD_MASK);
    return file >> number >> std::hex >> word >> operation >> value >> limit &&
           (operation & command) == FUTEX_WAIT_BITSET && limit == 0;
}
} // namespace vesk
