// make_file PATH PIECES BYTES: a file of that many pieces of that many bytes, with a hole as large
// behind each, so that no two pieces are one extent.
#include <cstdio>
#include <cstdlib>
#include <fcntl.h>
#include <string>
#include <unistd.h>

int main(int argc, char *argv[]) {
    const long pieces = argc == 4 ? strtol(argv[2], nullptr, 10) : 0;
    const std::string data(argc == 4 ? strtoul(argv[3], nullptr, 10) : 0, 'x');
    const int fd = argc == 4 ? open(argv[1], O_WRONLY | O_CREAT | O_TRUNC, 0644) : -1;
    if (fd < 0) {
        fprintf(stderr, "usage: make_file PATH PIECES BYTES\n");
        return 2;
    }
    const auto bytes = static_cast<off_t>(data.size());
    for (long i = 0; i < pieces; ++i) {
        if (pwrite(fd, data.data(), data.size(), 2 * i * bytes) != static_cast<ssize_t>(bytes)) {
            perror(argv[1]);
            return 1;
        }
    }
    return fsync(fd) == 0 ? 0 : 1;
}
