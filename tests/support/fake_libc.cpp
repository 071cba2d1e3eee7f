#include "tests/support/fake_libc.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstddef>
#include <cstring>
#include <ctime>
#include <dlfcn.h>
#include <fcntl.h>
#include <map>
#include <mutex>
#include <pthread.h>
#include <sys/ioctl.h>
#include <sys/msg.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/time.h>
#include <sys/types.h>
#include <unistd.h>

namespace vesk {
int FakeLibc::sleeps = 0;
int FakeLibc::alarmFactor = 1;
int FakeLibc::clockFactor = 1;
int FakeLibc::syncs = 0;
std::function<void(long long)> FakeLibc::onAlarm;
std::function<void()> FakeLibc::onPause;
std::function<void()> FakeLibc::onSleep;
std::function<void()> FakeLibc::onSync;
std::function<void()> FakeLibc::onMsgctl;
std::function<int(unsigned long, void *)> FakeLibc::onIoctl;
std::function<void(struct stat *)> FakeLibc::onStat;
std::function<void(int, long long, size_t)> FakeLibc::onRead;
std::function<void(const std::string &, int, unsigned)> FakeLibc::onOpen;

namespace {
struct Order {
    int calls = 0;
    int failAt = 0; // 0: never
    bool onwards = false;
    int error = 0;
    int limitAt = 0; // 0: never
    size_t limit = 0;
};

std::mutex ordersMutex;
std::map<std::string, Order> &Orders() {
    static auto *orders = new std::map<std::string, Order>;
    return *orders;
}
std::atomic<bool> anyOrder{false}; // spares the ordinary call the map

// The errno with which this call fails, or 0.
int FailureOf(const char *function) {
    if (!anyOrder) {
        return 0;
    }
    const std::lock_guard<std::mutex> lock(ordersMutex);
    const auto found = Orders().find(function);
    if (found == Orders().end()) {
        return 0;
    }
    Order &order = found->second;
    ++order.calls;
    const bool fails = order.failAt != 0 &&
                       (order.onwards ? order.calls >= order.failAt : order.calls == order.failAt);
    return fails ? order.error : 0;
}

// How many of these bytes the call that FailureOf() has just counted may move.
size_t Limited(const char *function, size_t size) {
    if (!anyOrder) {
        return size;
    }
    const std::lock_guard<std::mutex> lock(ordersMutex);
    const Order &order = Orders()[function];
    return order.limitAt != 0 && order.calls == order.limitAt ? std::min(order.limit, size) : size;
}

void SetOrder(const std::string &function, int error, int nth, bool onwards) {
    const std::lock_guard<std::mutex> lock(ordersMutex);
    Order &order = Orders()[function];
    order.failAt = order.calls + nth;
    order.onwards = onwards;
    order.error = error;
    anyOrder = true;
}

// The mode among an open call's further arguments, and the note of the call.
mode_t NoteOpen(const char *path, int flags, va_list arguments) {
    const mode_t mode = (flags & O_CREAT) != 0 ? va_arg(arguments, mode_t) : 0;
    if (FakeLibc::onOpen) {
        FakeLibc::onOpen(path, flags, mode);
    }
    return mode;
}

template <typename Function> Function Real(const char *name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}
} // namespace

void FakeLibc::Reset() {
    sleeps = 0;
    alarmFactor = 1;
    clockFactor = 1;
    syncs = 0;
    onAlarm = nullptr;
    onPause = nullptr;
    onSleep = nullptr;
    onSync = nullptr;
    onMsgctl = nullptr;
    onIoctl = nullptr;
    onStat = nullptr;
    onRead = nullptr;
    onOpen = nullptr;
    const std::lock_guard<std::mutex> lock(ordersMutex);
    Orders().clear();
    anyOrder = false;
}

void FakeLibc::Fail(const std::string &function, int error, int nth) {
    SetOrder(function, error, nth, false);
}

void FakeLibc::FailFrom(const std::string &function, int error, int nth) {
    SetOrder(function, error, nth, true);
}

void FakeLibc::Limit(const std::string &function, size_t bytes, int nth) {
    const std::lock_guard<std::mutex> lock(ordersMutex);
    Order &order = Orders()[function];
    order.limitAt = order.calls + nth;
    order.limit = bytes;
    anyOrder = true;
}

void FakeLibc::Count(const std::string &function) {
    const std::lock_guard<std::mutex> lock(ordersMutex);
    Orders()[function];
    anyOrder = true;
}

int FakeLibc::Calls(const std::string &function) {
    const std::lock_guard<std::mutex> lock(ordersMutex);
    return Orders()[function].calls;
}

// Fails the call when ordered to, otherwise calls the real function, the library's `symbol`.
#define PASS_OR_FAIL_AS(failure, name, symbol, type, ...)                                          \
    const int error = FailureOf(#name);                                                            \
    if (error != 0) {                                                                              \
        errno = error;                                                                             \
        return failure;                                                                            \
    }                                                                                              \
    static const auto real = Real<type>(symbol);                                                   \
    return real(__VA_ARGS__)
#define PASS_OR_FAIL(failure, name, type, ...)                                                     \
    PASS_OR_FAIL_AS(failure, name, #name, type, __VA_ARGS__)

// 64-bit times on a 32-bit platform have functions of their own, under which the headers also
// define the ones below.
#ifdef __USE_TIME_BITS64
#define TIME_SYMBOL(usual, wide) wide
#else
#define TIME_SYMBOL(usual, wide) usual
#endif

// CLOCK_MONOTONIC as it runs while it is slowed down.
void SlowDown(timespec *now) {
    static const timespec begin = *now;
    const long long passed = (now->tv_sec - begin.tv_sec) * 1000000000LL + now->tv_nsec;
    const long long shown = begin.tv_nsec + (passed - begin.tv_nsec) / FakeLibc::clockFactor;
    now->tv_sec = begin.tv_sec + static_cast<time_t>(shown / 1000000000);
    now->tv_nsec = static_cast<long>(shown % 1000000000);
}

int LookUp(const char *path, struct stat *status, int flags) {
    const int error = FailureOf("stat");
    if (error != 0) {
        errno = error;
        return -1;
    }
    const int result = fstatat(AT_FDCWD, path, status, flags);
    if (result == 0 && FakeLibc::onStat) {
        FakeLibc::onStat(status);
    }
    return result;
}

using SignalAction = void (*)(int);
} // namespace vesk

using namespace vesk;

extern "C" {

unsigned sleep(unsigned seconds) {
    FakeLibc::sleeps += static_cast<int>(seconds);
    if (FakeLibc::onSleep) {
        FakeLibc::onSleep();
    }
    return 0;
}

int usleep(useconds_t microseconds) {
    if (FakeLibc::onPause) {
        FakeLibc::onPause();
    }
    static const auto real = Real<int (*)(useconds_t)>("usleep");
    return real(microseconds);
}

int clock_gettime(clockid_t clock, timespec *now) noexcept {
    const long result = syscall(TIME_SYMBOL(SYS_clock_gettime, SYS_clock_gettime64), clock, now);
    if (result == 0 && clock == CLOCK_MONOTONIC && FakeLibc::clockFactor != 1) {
        SlowDown(now);
    }
    return static_cast<int>(result);
}

int setitimer(__itimer_which_t which, const itimerval *value, itimerval *old) noexcept {
    static const auto real = Real<int (*)(__itimer_which_t, const itimerval *, itimerval *)>(
        TIME_SYMBOL("setitimer", "__setitimer64"));
    const long long asked = value->it_value.tv_sec * 1000000LL + value->it_value.tv_usec;
    if (FakeLibc::onAlarm) {
        FakeLibc::onAlarm(asked);
    }
    const long long microseconds = asked * FakeLibc::alarmFactor;
    itimerval later = *value;
    later.it_value.tv_sec = static_cast<time_t>(microseconds / 1000000);
    later.it_value.tv_usec = static_cast<suseconds_t>(microseconds % 1000000);
    return real(which, &later, old);
}

void sync() noexcept {
    ++FakeLibc::syncs;
    if (FakeLibc::onSync) {
        FakeLibc::onSync();
    }
}

int ioctl(int fd, unsigned long request, ...) noexcept {
    va_list arguments;
    va_start(arguments, request);
    void *argument = va_arg(arguments, void *);
    va_end(arguments);
    if (FakeLibc::onIoctl) {
        return FakeLibc::onIoctl(request, argument);
    }
    PASS_OR_FAIL_AS(-1, ioctl, TIME_SYMBOL("ioctl", "__ioctl_time64"),
                    int (*)(int, unsigned long, ...), fd, request, argument);
}

int msgctl(int id, int command, msqid_ds *data) noexcept {
    if (FakeLibc::onMsgctl) {
        FakeLibc::onMsgctl();
    }
    PASS_OR_FAIL_AS(-1, msgctl, TIME_SYMBOL("msgctl", "__msgctl64"), int (*)(int, int, msqid_ds *),
                    id, command, data);
}

int msgget(key_t key, int flags) noexcept {
    PASS_OR_FAIL(-1, msgget, int (*)(key_t, int), key, flags);
}

int msgsnd(int id, const void *message, size_t size, int flags) {
    PASS_OR_FAIL(-1, msgsnd, int (*)(int, const void *, size_t, int), id, message, size, flags);
}

key_t ftok(const char *path, int project) noexcept {
    PASS_OR_FAIL(-1, ftok, key_t(*)(const char *, int), path, project);
}

// Under whatever names the platform's 64-bit variants have.
int open(const char *path, int flags, ...) {
    va_list arguments;
    va_start(arguments, flags);
    const mode_t mode = NoteOpen(path, flags, arguments);
    va_end(arguments);
    static const auto real = Real<int (*)(const char *, int, ...)>("open64");
    return real(path, flags, mode);
}

int openat(int folder, const char *path, int flags, ...) {
    va_list arguments;
    va_start(arguments, flags);
    const mode_t mode = NoteOpen(path, flags, arguments);
    va_end(arguments);
    static const auto real = Real<int (*)(int, const char *, int, ...)>("openat64");
    return real(folder, path, flags, mode);
}

ssize_t write(int fd, const void *data, size_t size) {
    PASS_OR_FAIL(-1, write, ssize_t(*)(int, const void *, size_t), fd, data,
                 Limited("write", size));
}

ssize_t read(int fd, void *data, size_t size) {
    if (FakeLibc::onRead) {
        static const auto realSeek = Real<off_t (*)(int, off_t, int)>("lseek64");
        FakeLibc::onRead(fd, realSeek(fd, 0, SEEK_CUR), size);
    }
    PASS_OR_FAIL(-1, read, ssize_t(*)(int, void *, size_t), fd, data, Limited("read", size));
}

off_t lseek64(int fd, off_t offset, int whence) noexcept {
    const int error = FailureOf("lseek");
    if (error != 0) {
        errno = error;
        return -1;
    }
    // Not "lseek", whose offset has 32 bits on a 32-bit platform.
    static const auto real = Real<off_t (*)(int, off_t, int)>("lseek64");
    return real(fd, offset, whence);
}

// Under whatever names the platform's 64-bit variants have; the real answers come by another call.
int stat(const char *path, struct stat *status) noexcept {
    return LookUp(path, status, 0);
}

int lstat(const char *path, struct stat *status) noexcept {
    return LookUp(path, status, AT_SYMLINK_NOFOLLOW);
}

int fsync(int fd) {
    PASS_OR_FAIL(-1, fsync, int (*)(int), fd);
}

int renameat(int oldFolder, const char *oldName, int newFolder, const char *newName) noexcept {
    const int error = FailureOf("rename");
    if (error != 0) {
        errno = error;
        return -1;
    }
    static const auto real = Real<int (*)(int, const char *, int, const char *)>("renameat");
    return real(oldFolder, oldName, newFolder, newName);
}

int fchown(int fd, uid_t owner, gid_t group) noexcept {
    PASS_OR_FAIL(-1, fchown, int (*)(int, uid_t, gid_t), fd, owner, group);
}

int pthread_mutex_init(pthread_mutex_t *mutex, const pthread_mutexattr_t *attributes) noexcept {
    const int error = FailureOf("pthread_mutex_init");
    if (error != 0) {
        return error;
    }
    static const auto real =
        Real<int (*)(pthread_mutex_t *, const pthread_mutexattr_t *)>("pthread_mutex_init");
    return real(mutex, attributes);
}

// A sanitizer that is linked into the program stands behind the function below under this name
// only. It must see every thread made: what a thread that it does not know of holds counts as
// leaked. NOLINTNEXTLINE(bugprone-reserved-identifier, readability-identifier-naming)
int __interceptor_pthread_create(pthread_t *, const pthread_attr_t *, void *(*)(void *), void *)
    __attribute__((weak));

int pthread_create(pthread_t *thread, const pthread_attr_t *attributes, void *(*start)(void *),
                   void *argument) noexcept {
    const int error = FailureOf("pthread_create");
    if (error != 0) {
        return error;
    }
    using Create = int (*)(pthread_t *, const pthread_attr_t *, void *(*)(void *), void *);
    static const Create real = __interceptor_pthread_create != nullptr
                                   ? __interceptor_pthread_create
                                   : Real<Create>("pthread_create");
    return real(thread, attributes, start, argument);
}

SignalAction signal(int number, SignalAction handler) noexcept {
    PASS_OR_FAIL(reinterpret_cast<SignalAction>(-1), signal, SignalAction(*)(int, SignalAction),
                 number, handler);
}

void *aligned_alloc(size_t alignment, size_t size) noexcept {
    PASS_OR_FAIL(nullptr, aligned_alloc, void *(*)(size_t, size_t), alignment, size);
}

char *strdup(const char *text) noexcept {
    PASS_OR_FAIL(nullptr, strdup, char *(*)(const char *), text);
}
}
