// map_files LIST: opens, stats and asks for the extents of each file of the list, a path a line:
// what a listing with figures has to ask of the system at least. Prints how many extents there are.
#include "base/scoped_fd.h"

#include <fcntl.h>
#include <linux/fiemap.h>
#include <linux/fs.h>
#include <sys/ioctl.h>
#include <sys/stat.h>

#include <cstdio>
#include <fstream>
#include <string>

using namespace vesk;

int main(int argc, char *argv[]) {
    const uint32_t batch = 128;
    alignas(fiemap) static char buffer[sizeof(fiemap) + batch * sizeof(fiemap_extent)];
    std::ifstream list(argc == 2 ? argv[1] : "");
    unsigned long extents = 0;
    for (std::string path; std::getline(list, path);) {
        const ScopedFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
        struct stat status {};
        auto *map = reinterpret_cast<fiemap *>(buffer);
        *map = {};
        map->fm_length = FIEMAP_MAX_OFFSET;
        map->fm_flags = FIEMAP_FLAG_SYNC;
        map->fm_extent_count = batch;
        if (fstat(file.Get(), &status) != 0 || ioctl(file.Get(), FS_IOC_FIEMAP, map) != 0) {
            fprintf(stderr, "map_files: %s cannot be looked at\n", path.c_str());
            return 1;
        }
        extents += map->fm_mapped_extents;
    }
    printf("%lu\n", extents);
}
