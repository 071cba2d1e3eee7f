// system_date file SECONDS PATH...
// system_date clock SECONDS FILE TEXT COMMAND...
//
// Moments are seconds from 1970 on. "file" dates files. "clock" sets the machine's clock, runs the
// command, waits until the file holds the text (two minutes at most), sets the clock back and dates
// back whatever has got a date that 32 bits do not hold: a 32-bit machine's own tools cannot even
// look at such a file, so all that happens at that moment happens here. Its status is the
// command's.
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <fcntl.h>
#include <fstream>
#include <ftw.h>
#include <iterator>
#include <spawn.h>
#include <string>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

static_assert(sizeof(time_t) == 8, "moments past 2038");

namespace {
const time_t kLastOf32Bits = 2147483647;
const int kHangSeconds = 120;

bool SetDate(const char *path, time_t seconds) {
    const timespec times[] = {{seconds, 0}, {seconds, 0}};
    return utimensat(AT_FDCWD, path, times, AT_SYMLINK_NOFOLLOW) == 0;
}

int DateFile(const char *path, time_t seconds) {
    struct stat status {};
    if (!SetDate(path, seconds) || stat(path, &status) != 0) {
        perror(path);
        return 1;
    }
    if (status.st_mtime != seconds) {
        fprintf(stderr, "system_date: %s cannot be dated so\n", path);
        return 2;
    }
    return 0;
}

time_t Now(clockid_t clock) {
    timespec now{};
    clock_gettime(clock, &now);
    return now.tv_sec;
}

bool SetClock(time_t seconds) {
    const timespec moment = {seconds, 0};
    return clock_settime(CLOCK_REALTIME, &moment) == 0;
}

int Run(char *const command[]) {
    pid_t child = 0;
    int status = 0;
    if (posix_spawn(&child, command[0], nullptr, nullptr, command, environ) != 0 ||
        waitpid(child, &status, 0) != child || !WIFEXITED(status)) {
        return 127;
    }
    return WEXITSTATUS(status);
}

bool AwaitText(const char *path, const std::string &text) {
    const time_t end = Now(CLOCK_MONOTONIC) + kHangSeconds;
    while (Now(CLOCK_MONOTONIC) < end) {
        std::ifstream file(path);
        const std::string content(std::istreambuf_iterator<char>(file), {});
        if (content.find(text) != std::string::npos) {
            return true;
        }
        usleep(20000);
    }
    fprintf(stderr, "system_date: no %s in %s\n", text.c_str(), path);
    return false;
}

// Setting a file's other dates sets that of its last change to the clock's.
int DateBack(const char *path, const struct stat *status, int /*type*/, FTW *place) {
    if (strcmp(path, "/proc") == 0 || strcmp(path, "/sys") == 0) {
        return FTW_SKIP_SUBTREE;
    }
    const bool isFar = status->st_atime > kLastOf32Bits || status->st_mtime > kLastOf32Bits ||
                       status->st_ctime > kLastOf32Bits;
    if (place->level > 0 && isFar) {
        SetDate(path, Now(CLOCK_REALTIME));
    }
    return FTW_CONTINUE;
}

int LiveIn(time_t seconds, const char *file, const char *text, char *const command[]) {
    const time_t before = Now(CLOCK_REALTIME);
    if (!SetClock(seconds)) {
        perror("system_date: clock");
        return 127;
    }
    int status = Run(command);
    if (status == 0 && !AwaitText(file, text)) {
        status = 126;
    }
    SetClock(before + Now(CLOCK_REALTIME) - seconds);
    nftw("/", DateBack, 32, FTW_PHYS | FTW_ACTIONRETVAL);
    return status;
}
} // namespace

int main(int argc, char *argv[]) {
    const std::string mode = argc > 3 ? argv[1] : "";
    const time_t seconds = mode.empty() ? 0 : static_cast<time_t>(strtoll(argv[2], nullptr, 10));
    if (mode == "clock" && argc > 5) {
        return LiveIn(seconds, argv[3], argv[4], argv + 5);
    }
    int result = mode == "file" ? 0 : 1;
    for (int i = 3; i < argc && result == 0; ++i) {
        result = DateFile(argv[i], seconds);
    }
    return result;
}
