// request_latency RUNS STATE_FILE PROGRAM ARGUMENT...: runs a client's command again and again,
// with time for the service to come to rest, and prints the microseconds from its start and from
// its end until the device's bitmap was set.
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <spawn.h>
#include <string>
#include <sys/wait.h>
#include <unistd.h>

extern char **environ;

namespace {
using Clock = std::chrono::steady_clock;

long BitmapsSet(const char *stateFile) {
    std::ifstream file(stateFile);
    const std::string text((std::istreambuf_iterator<char>(file)),
                           std::istreambuf_iterator<char>());
    const std::string key = "\"setBitmap\":";
    const size_t at = text.find(key);
    return at == std::string::npos ? -1 : strtol(text.c_str() + at + key.size(), nullptr, 10);
}

double Microseconds(Clock::duration time) {
    return std::chrono::duration<double, std::micro>(time).count();
}
} // namespace

int main(int argc, char *argv[]) {
    if (argc < 4) {
        return 2;
    }
    for (long i = strtol(argv[1], nullptr, 10); i > 0; --i) {
        usleep(1500000); // the worker rests for a second after each request
        const long before = BitmapsSet(argv[2]);
        const Clock::time_point start = Clock::now();
        pid_t pid = 0;
        if (before < 0 || posix_spawn(&pid, argv[3], nullptr, nullptr, argv + 3, environ) != 0) {
            return 1;
        }
        waitpid(pid, nullptr, 0);
        const Clock::time_point sent = Clock::now();
        while (BitmapsSet(argv[2]) == before) {
            if (Clock::now() - sent > std::chrono::seconds(10)) {
                return 1;
            }
        }
        const Clock::time_point end = Clock::now();
        printf("%.0f %.0f\n", Microseconds(end - start), Microseconds(end - sent));
    }
}
