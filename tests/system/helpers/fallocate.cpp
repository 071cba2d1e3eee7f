// system_fallocate FILE allocate|punch-hole|collapse-range FIRST STEP LENGTH COUNT
//
// Does it to COUNT ranges of LENGTH bytes, the first at FIRST and the next each STEP bytes further,
// from the last to the first: collapsing one moves what lies behind it. One process for a thousand
// ranges, where fallocate(1) would be a thousand.
#include "base/scoped_fd.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>

using namespace vesk;

int main(int argc, char *argv[]) {
    if (argc != 7) {
        fprintf(stderr, "system_fallocate: six arguments expected\n");
        return 2;
    }
    const int mode = strcmp(argv[2], "allocate") == 0 ? 0
                     : strcmp(argv[2], "punch-hole") == 0
                         ? FALLOC_FL_PUNCH_HOLE | FALLOC_FL_KEEP_SIZE
                         : FALLOC_FL_COLLAPSE_RANGE;
    const long long first = strtoll(argv[3], nullptr, 10);
    const long long step = strtoll(argv[4], nullptr, 10);
    const long long length = strtoll(argv[5], nullptr, 10);
    const long long count = strtoll(argv[6], nullptr, 10);
    const ScopedFd file(open(argv[1], O_RDWR | O_CLOEXEC));
    for (long long i = count - 1; i >= 0; --i) {
        if (fallocate(file.Get(), mode, first + i * step, length) != 0) {
            fprintf(stderr, "system_fallocate: %s: %s\n", argv[1], strerror(errno));
            return 1;
        }
    }
    return 0;
}
