#include "state/service_state.h"

#include "base/log.h"

#include <algorithm>
#include <atomic>
#include <memory>
#include <pthread.h>
#include <string>
#include <vector>

namespace vesk {
ServiceLockName serviceLock;

namespace {
using PendingSpaces = std::vector<std::string>;

// Never destroyed: a thread may still use the state while the process ends.
struct ServiceState {
    pthread_mutex_t lock = PTHREAD_MUTEX_INITIALIZER;
    pthread_cond_t requestArrived = PTHREAD_COND_INITIALIZER; // waited for with `lock`
    int state GUARDED_BY_LOCK(serviceLock) = 0;
    // The list is replaced as a whole, under `lock`; readers take the pointer atomically and keep
    // the snapshot they got.
    std::shared_ptr<const PendingSpaces> pending = std::make_shared<PendingSpaces>();
    std::atomic<bool> anyPending{false}; // follows `pending`; spares readers the snapshot
};

ServiceState &State() {
    static auto *state = new ServiceState;
    return *state;
}

void PublishPending(PendingSpaces spaces) NEEDS_LOCK(serviceLock) {
    const bool any = !spaces.empty();
    std::atomic_store(&State().pending, std::shared_ptr<const PendingSpaces>(
                                            std::make_shared<PendingSpaces>(std::move(spaces))));
    State().anyPending = any;
}

PendingSpaces CopyPending() {
    return *std::atomic_load(&State().pending);
}
} // namespace

// There is one thread only.
int ServiceStateInitialize() NOT_ANALYSED {
    State().state = 2;
    const int result = pthread_mutex_init(&State().lock, nullptr);
    if (result != 0) {
        return result;
    }
    State().requestArrived = PTHREAD_COND_INITIALIZER;
    PublishPending({});
    return 0;
}

// The lock behind the name cannot be seen by the analysis.
void ServiceLock() NOT_ANALYSED {
    pthread_mutex_lock(&State().lock);
}

void ServiceUnlock() NOT_ANALYSED {
    pthread_mutex_unlock(&State().lock);
}

void ServiceWaitForRequest() {
    pthread_cond_wait(&State().requestArrived, &State().lock);
}

void ServiceSignalRequest() {
    pthread_cond_signal(&State().requestArrived);
}

int ServiceGetState() {
    const ServiceLockGuard lock;
    return State().state;
}

void ServiceSetState(const int *state) {
    const ServiceLockGuard lock;
    State().state = *state;
}

bool ServiceIsPendingSpace(const char *mountPath) {
    if (!State().anyPending) {
        return false;
    }
    const std::shared_ptr<const PendingSpaces> spaces = std::atomic_load(&State().pending);
    return std::find(spaces->begin(), spaces->end(), mountPath) != spaces->end();
}

// Not analysed for the failure that keeps the lock.
int ServiceAddPendingSpaceAtomic(char *mountPath) NOT_ANALYSED {
    ServiceLock();
    if (ServiceIsPendingSpace(mountPath)) {
        // The lock is kept: whoever gets here has raced with another addition, and the list must
        // not change under either of them.
        LogError("Space (%s) is already pending", mountPath);
        return -1;
    }
    {
        const ServiceLockGuard lock(ServiceLockGuard::kAdopt);
        PendingSpaces spaces = CopyPending();
        spaces.emplace_back(mountPath);
        PublishPending(std::move(spaces));
    }
    LogVerbose("Add pending space = %s", mountPath);
    return 0;
}

int ServiceRemovePendingSpaceLocked(const char *mountPath) {
    PendingSpaces spaces = CopyPending();
    const auto found = std::find(spaces.begin(), spaces.end(), mountPath);
    if (found == spaces.end()) {
        return -1;
    }
    spaces.erase(found);
    PublishPending(std::move(spaces));
    return 0;
}

int ServiceRemovePendingSpaceAtomic(char *mountPath) {
    int result = 0;
    {
        const ServiceLockGuard lock;
        result = ServiceRemovePendingSpaceLocked(mountPath);
    }
    if (result < 0) {
        LogError("Space (%s) is not pending", mountPath);
        return -1;
    }
    LogVerbose("Remove pending space (%s)", mountPath);
    return 0;
}
} // namespace vesk
