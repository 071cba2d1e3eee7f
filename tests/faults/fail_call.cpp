// Loaded before the C library: lets the n-th call of one kind that the program makes fail.
//
// VESK_FAIL_CALL names the kind, VESK_FAIL_NUMBER the call counted from 1, VESK_FAIL_ERRNO the
// error; 0 halves the length of a read or write instead. Counting begins when main looks at its
// options (the companion: at the variable that stands for one), and covers the program and its
// libraries, but not what the C library calls inside itself. When the call is reached, a byte goes
// to descriptor 9. At the program's orderly end the number of allocations that are not freed
// follows there as " N".
#include "tests/faults/real_call.h"

#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <getopt.h>
#include <pthread.h>
#include <sys/msg.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

using namespace vesk;

// The C library's own names for what is replaced here.
extern "C" void *__libc_malloc(size_t size);
extern "C" void *__libc_realloc(void *memory, size_t size);
extern "C" void __libc_free(void *memory);
extern "C" void *__libc_calloc(size_t number, size_t size);
extern "C" void *__libc_memalign(size_t alignment, size_t size);

namespace {
const int kReportFd = 9;

std::atomic<bool> armed{false};
std::atomic<long> calls{0};
std::atomic<long> live{0}; // allocations
char failingKind[32];
long failingNumber = 0;
int failingErrno = 0;

void Arm() {
    // Which of two runs is the first to say something must not show in their allocations.
    static char output[4096];
    setvbuf(stdout, output, _IOLBF, sizeof(output));
    const char *kind = getenv("VESK_FAIL_CALL");
    const char *number = getenv("VESK_FAIL_NUMBER");
    const char *error = getenv("VESK_FAIL_ERRNO");
    if (kind == nullptr || number == nullptr || error == nullptr) {
        return;
    }
    strncpy(failingKind, kind, sizeof(failingKind) - 1);
    failingNumber = strtol(number, nullptr, 10);
    failingErrno = static_cast<int>(strtol(error, nullptr, 10));
    armed = true;
}

void *Counted(void *memory) {
    live += memory != nullptr ? 1 : 0;
    return memory;
}

__attribute__((destructor)) void ReportLive() {
    char text[32];
    const int length = snprintf(text, sizeof(text), " %ld", live.load());
    syscall(SYS_write, kReportFd, text, static_cast<size_t>(length));
}

// A transfer of half the length, or the failure.
template <typename Call> ssize_t Transfer(const char *kind, size_t size, Call call) {
    if (!FailsNow(kind)) {
        return call(size);
    }
    return failingErrno == 0 ? call(size > 1 ? size / 2 : size) : -1;
}
} // namespace

bool vesk::FailsNow(const char *kind) {
    if (!armed || strcmp(kind, failingKind) != 0 || ++calls != failingNumber) {
        return false;
    }
    syscall(SYS_write, kReportFd, "x", 1);
    errno = failingErrno;
    return true;
}

extern "C" {

int getopt_long(int argc, char *const *argv, const char *shortOptions, const option *longOptions,
                int *index) {
    static const auto real = REAL(getopt_long);
    static bool begun = false;
    if (!begun) {
        begun = true;
        Arm();
    }
    return real(argc, argv, shortOptions, longOptions, index);
}

char *getenv(const char *name) noexcept {
    static const auto real = REAL(getenv);
    static bool begun = false;
    if (!begun && strcmp(name, "VESKPIN_CONFIG") == 0) {
        begun = true;
        Arm();
    }
    return real(name);
}

void *malloc(size_t size) {
    return FailsNow("malloc") ? nullptr : Counted(__libc_malloc(size));
}
void *calloc(size_t number, size_t size) {
    return FailsNow("malloc") ? nullptr : Counted(__libc_calloc(number, size));
}
void *realloc(void *memory, size_t size) {
    if (FailsNow("malloc")) {
        return nullptr;
    }
    void *moved = __libc_realloc(memory, size);
    live += memory == nullptr && moved != nullptr ? 1 : 0;
    return moved;
}
void *aligned_alloc(size_t alignment, size_t size) {
    return FailsNow("malloc") ? nullptr : Counted(__libc_memalign(alignment, size));
}
void free(void *memory) {
    live -= memory != nullptr ? 1 : 0;
    __libc_free(memory);
}

#define OPEN(name)                                                                                 \
    int name(const char *path, int flags, ...) {                                                   \
        static const auto real = REAL(name);                                                       \
        va_list arguments;                                                                         \
        va_start(arguments, flags);                                                                \
        const mode_t mode = ModeOf(flags, arguments);                                              \
        va_end(arguments);                                                                         \
        return FailsNow("open") ? -1 : real(path, flags, mode);                                    \
    }
OPEN(open64)
#define OPEN_AT(name)                                                                              \
    int name(int folder, const char *path, int flags, ...) {                                       \
        static const auto real = REAL(name);                                                       \
        va_list arguments;                                                                         \
        va_start(arguments, flags);                                                                \
        const mode_t mode = ModeOf(flags, arguments);                                              \
        va_end(arguments);                                                                         \
        return FailsNow("open") ? -1 : real(folder, path, flags, mode);                            \
    }
OPEN_AT(openat64)
FILE *fopen64(const char *path, const char *mode) {
    static const auto real = REAL(fopen64);
    return FailsNow("open") ? nullptr : real(path, mode);
}
ssize_t read(int fd, void *buffer, size_t size) {
    static const auto real = REAL(read);
    return Transfer("read", size, [&](size_t part) { return real(fd, buffer, part); });
}
ssize_t write(int fd, const void *buffer, size_t size) {
    static const auto real = REAL(write);
    return Transfer("write", size, [&](size_t part) { return real(fd, buffer, part); });
}
size_t fwrite(const void *buffer, size_t size, size_t number, FILE *stream) {
    static const auto real = REAL(fwrite);
    return stream != stdout && FailsNow("write") ? 0 : real(buffer, size, number, stream);
}
int fsync(int fd) {
    static const auto real = REAL(fsync);
    return FailsNow("fsync") ? -1 : real(fd);
}
int renameat(int oldFolder, const char *oldName, int newFolder, const char *newName) noexcept {
    static const auto real = REAL(renameat);
    return FailsNow("rename") ? -1 : real(oldFolder, oldName, newFolder, newName);
}
int unlink(const char *path) noexcept {
    static const auto real = REAL(unlink);
    return FailsNow("unlink") ? -1 : real(path);
}
int stat64(const char *path, struct stat64 *status) noexcept {
    static const auto real = REAL(stat64);
    return FailsNow("stat") ? -1 : real(path, status);
}
int fstat64(int fd, struct stat64 *status) noexcept {
    static const auto real = REAL(fstat64);
    return FailsNow("stat") ? -1 : real(fd, status);
}
off64_t lseek64(int fd, off64_t offset, int origin) noexcept {
    static const auto real = REAL(lseek64);
    return FailsNow("lseek") ? -1 : real(fd, offset, origin);
}
int ioctl(int fd, unsigned long request, ...) noexcept {
    static const auto real = REAL(ioctl);
    va_list arguments;
    va_start(arguments, request);
    void *argument = va_arg(arguments, void *);
    va_end(arguments);
    return FailsNow("ioctl") ? -1 : real(fd, request, argument);
}
// Looks at folders and links.
int statx(int folder, const char *path, int flags, unsigned mask, struct statx *status) noexcept {
    static const auto real = REAL(statx);
    return FailsNow("look") ? -1 : real(folder, path, flags, mask, status);
}
int lstat64(const char *path, struct stat64 *status) noexcept {
    static const auto real = REAL(lstat64);
    return FailsNow("look") ? -1 : real(path, status);
}
int access(const char *path, int mode) noexcept {
    static const auto real = REAL(access);
    return FailsNow("look") ? -1 : real(path, mode);
}
ssize_t readlink(const char *path, char *text, size_t size) noexcept {
    static const auto real = REAL(readlink);
    return FailsNow("look") ? -1 : real(path, text, size);
}
DIR *opendir(const char *path) {
    static const auto real = REAL(opendir);
    return FailsNow("look") ? nullptr : real(path);
}
DIR *fdopendir(int fd) {
    static const auto real = REAL(fdopendir);
    return FailsNow("look") ? nullptr : real(fd);
}
struct dirent64 *readdir64(DIR *folder) {
    static const auto real = REAL(readdir64);
    return FailsNow("look") ? nullptr : real(folder);
}
key_t ftok(const char *path, int project) noexcept {
    static const auto real = REAL(ftok);
    return FailsNow("ftok") ? -1 : real(path, project);
}
int msgget(key_t key, int flags) noexcept {
    static const auto real = REAL(msgget);
    return FailsNow("msgget") ? -1 : real(key, flags);
}
int msgctl(int queue, int command, struct msqid_ds *data) noexcept {
    static const auto real = REAL(msgctl);
    return FailsNow("msgctl") ? -1 : real(queue, command, data);
}
int msgsnd(int queue, const void *message, size_t size, int flags) {
    static const auto real = REAL(msgsnd);
    return FailsNow("msgsnd") ? -1 : real(queue, message, size, flags);
}
ssize_t msgrcv(int queue, void *message, size_t size, long type, int flags) {
    static const auto real = REAL(msgrcv);
    return FailsNow("msgrcv") ? -1 : real(queue, message, size, type, flags);
}
int pthread_create(pthread_t *thread, const pthread_attr_t *attributes, void *(*start)(void *),
                   void *argument) noexcept {
    static const auto real = REAL(pthread_create);
    return FailsNow("thread") ? failingErrno : real(thread, attributes, start, argument);
}

} // extern "C"
