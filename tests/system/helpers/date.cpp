// system_date file SECONDS PATH...
// system_date clock [SECONDS]
//
// Dates files, or sets the machine's clock, in seconds from 1970 on; without a number, prints what
// the clock shows. The tools of a 32-bit Debian know no moment past 2038.
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <fcntl.h>
#include <sys/stat.h>

static_assert(sizeof(time_t) == 8, "moments past 2038");

namespace {
int DateFile(const char *path, time_t seconds) {
    const timespec times[] = {{seconds, 0}, {seconds, 0}};
    struct stat status {};
    if (utimensat(AT_FDCWD, path, times, 0) != 0 || stat(path, &status) != 0) {
        perror(path);
        return 1;
    }
    if (status.st_mtime != seconds) {
        fprintf(stderr, "system_date: %s cannot be dated so\n", path);
        return 2;
    }
    return 0;
}
} // namespace

int main(int argc, char *argv[]) {
    const bool isClock = argc >= 2 && strcmp(argv[1], "clock") == 0;
    if (isClock && argc == 2) {
        printf("%lld\n", static_cast<long long>(time(nullptr)));
        return 0;
    }
    const time_t seconds = argc > 2 ? static_cast<time_t>(strtoll(argv[2], nullptr, 10)) : 0;
    if (isClock) {
        const timespec now = {seconds, 0};
        return clock_settime(CLOCK_REALTIME, &now) == 0 ? 0 : 1;
    }
    int result = argc > 3 ? 0 : 1;
    for (int i = 3; i < argc && result == 0; ++i) {
        result = DateFile(argv[i], seconds);
    }
    return result;
}
