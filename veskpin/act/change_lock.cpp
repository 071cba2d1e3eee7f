#include "act/change_lock.h"

#include "act/interrupt.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <string>

namespace vesk {
namespace {
const unsigned kPauseMs = 50;
} // namespace

ChangeLock ChangeLockTake(const Deadline &deadline, const std::function<void()> &tell,
                          const char *folder) {
    ChangeLock lock;
    if (mkdir(folder, 0755) != 0 && errno != EEXIST) {
        lock.error = errno;
        return lock;
    }
    const std::string path = std::string(folder) + "/lock";
    lock.file = ScopedFd(open(path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600));
    if (!lock.file.IsOpen()) {
        lock.error = errno;
        return lock;
    }
    for (bool isTold = false; flock(lock.file.Get(), LOCK_EX | LOCK_NB) != 0; isTold = true) {
        lock.error = errno;
        if (errno != EWOULDBLOCK && errno != EINTR) {
            return lock;
        }
        if (!isTold) {
            tell();
        }
        if (!InterruptPause(kPauseMs)) {
            lock.error = EINTR;
            return lock;
        }
        if (deadline.IsOver()) {
            lock.error = EAGAIN;
            return lock;
        }
    }
    lock.error = 0;
    return lock;
}
} // namespace vesk
