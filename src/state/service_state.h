// The state that the pin service's threads share: the service lock, the request-arrived condition,
// the service state word and the pending-space list.
//
// A pending space is a volume that is being mounted or unmounted: its queued requests are held back
// and warming it gives way. The list holds mount paths exactly as they were sent, each at most
// once.
//
// Locks: the service lock guards every read-change-write cycle of the configuration file, every
// change of the pending-space list and the state word. It is not recursive and never held while a
// request is carried out. Reading the list takes no service lock: readers see a snapshot that never
// changes under them.
#pragma once

#include "state/thread_annotations.h"

namespace vesk {
// The service lock's name for the annotations below; the lock itself is nobody else's business.
struct LOCK_KIND("service lock") ServiceLockName {};
extern ServiceLockName serviceLock;

// Sets the state word to 2, makes the lock and the condition, empties the list. To be called before
// any thread is started. 0, or what pthread_mutex_init returned; nothing else may be used then.
int ServiceStateInitialize();

void ServiceLock() TAKES_LOCK(serviceLock);
void ServiceUnlock() GIVES_LOCK_BACK(serviceLock);

// Waits for the request-arrived condition; the caller holds the service lock, which is released
// while waiting and held again on return. Wake-ups without a request happen.
void ServiceWaitForRequest() NEEDS_LOCK(serviceLock);

// Wakes a waiting worker; called without the lock.
void ServiceSignalRequest() NEEDS_NO_LOCK(serviceLock);

// The state word, read and written under the lock.
int ServiceGetState() NEEDS_NO_LOCK(serviceLock);
void ServiceSetState(const int *state) NEEDS_NO_LOCK(serviceLock);

// Whether the mount path is in the list, compared whole. Callable with or without the lock, from
// any thread; cheap when nothing is pending.
bool ServiceIsPendingSpace(const char *mountPath);

// 0 when added; -1 after an error message when it was there already, and then the service lock
// stays held: callers ask ServiceIsPendingSpace first.
int ServiceAddPendingSpaceAtomic(char *mountPath) NEEDS_NO_LOCK(serviceLock);

// 0 when removed; -1 after an error message when it was not there. Takes the lock.
int ServiceRemovePendingSpaceAtomic(char *mountPath) NEEDS_NO_LOCK(serviceLock);

// The same for a caller that holds the lock; logs nothing.
int ServiceRemovePendingSpaceLocked(const char *mountPath) NEEDS_LOCK(serviceLock);

// Holds the service lock for a scope.
class LOCK_SCOPE ServiceLockGuard {
public:
    ServiceLockGuard() TAKES_LOCK(serviceLock) { ServiceLock(); }
    // For a caller that has taken the lock already.
    enum Adopt { kAdopt };
    explicit ServiceLockGuard(Adopt /*taken*/) NEEDS_LOCK(serviceLock) {}
    ~ServiceLockGuard() GIVES_LOCK_BACK() { ServiceUnlock(); }
    ServiceLockGuard(const ServiceLockGuard &) = delete;
    ServiceLockGuard &operator=(const ServiceLockGuard &) = delete;
};
} // namespace vesk
