// run_pair RUNS PROGRAM ARGUMENT... -- PROGRAM ARGUMENT...: runs both alternately, output thrown
// away; prints for each run the microseconds of the first and of the second.
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

extern char **environ;

namespace {
double Run(char **words, const posix_spawn_file_actions_t *quiet) {
    const auto start = std::chrono::steady_clock::now();
    pid_t pid = 0;
    int status = 0;
    if (posix_spawn(&pid, words[0], quiet, nullptr, words, environ) != 0 ||
        waitpid(pid, &status, 0) != pid || status != 0) {
        fprintf(stderr, "run_pair: %s fails\n", words[0]);
        exit(1);
    }
    return std::chrono::duration<double, std::micro>(std::chrono::steady_clock::now() - start)
        .count();
}
} // namespace

int main(int argc, char *argv[]) {
    char **second = argv + 2;
    while (second < argv + argc && strcmp(*second, "--") != 0) {
        ++second;
    }
    if (argc < 5 || second == argv + argc) {
        return 2;
    }
    *second++ = nullptr;
    posix_spawn_file_actions_t quiet;
    posix_spawn_file_actions_init(&quiet);
    posix_spawn_file_actions_addopen(&quiet, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
    for (long i = strtol(argv[1], nullptr, 10); i > 0; --i) {
        const double first = Run(argv + 2, &quiet);
        printf("%.1f %.1f\n", first, Run(second, &quiet));
    }
}
