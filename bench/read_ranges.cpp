// read_ranges FILE: reads the ranges on standard input, a line "OFFSET BYTES" each, 64 KiB at a
// time with direct I/O; prints the seconds.
#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fcntl.h>
#include <unistd.h>
#include <utility>
#include <vector>

int main(int argc, char *argv[]) {
    const long long chunk = 65536;
    std::vector<std::pair<long long, long long>> ranges;
    long long offset = 0;
    long long bytes = 0;
    while (scanf("%lld %lld", &offset, &bytes) == 2) {
        ranges.emplace_back(offset, bytes);
    }
    const int fd = argc == 2 ? open(argv[1], O_RDONLY | O_DIRECT) : -1;
    char *buffer = static_cast<char *>(aligned_alloc(4096, chunk));
    if (fd < 0 || buffer == nullptr) {
        fprintf(stderr, "usage: read_ranges FILE\n");
        return 2;
    }
    const auto start = std::chrono::steady_clock::now();
    for (const auto &[first, count] : ranges) {
        for (long long at = 0; at < count; at += chunk) {
            if (pread(fd, buffer, static_cast<size_t>(std::min(chunk, count - at)), first + at) <=
                0) {
                perror("read");
                return 1;
            }
        }
    }
    const std::chrono::duration<double> time = std::chrono::steady_clock::now() - start;
    printf("%.6f\n", time.count());
    free(buffer);
}
