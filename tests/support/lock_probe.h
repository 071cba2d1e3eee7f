// Whether the service lock is held at a certain moment, whoever holds it.
#pragma once

#include "state/service_state.h"
#include "tests/support/thread_state.h"

#include <atomic>
#include <sys/syscall.h>
#include <thread>
#include <unistd.h>

namespace vesk {
class LockProbe {
public:
    LockProbe() = default;
    LockProbe(const LockProbe &) = delete;
    LockProbe &operator=(const LockProbe &) = delete;
    // Whoever holds the lock must give it back.
    ~LockProbe() {
        if (other_.joinable()) {
            other_.join();
        }
    }

    // Looks, the first time that it is asked to: a thread that wants the lock gets it or has to
    // wait.
    void Look() {
        if (looked_) {
            return;
        }
        looked_ = true;
        other_ = std::thread([this] {
            thread_ = static_cast<pid_t>(syscall(SYS_gettid));
            ServiceLock();
            taken_ = true;
            ServiceUnlock();
        });
        while (!taken_ && (thread_ == 0 || !ThreadSleeps(getpid(), thread_))) {
            std::this_thread::yield();
        }
        held_ = !taken_;
    }
    bool FoundItHeld() const { return held_; }

private:
    bool looked_ = false;
    bool held_ = false;
    std::atomic<pid_t> thread_{0};
    std::atomic<bool> taken_{false};
    std::thread other_;
};
} // namespace vesk
