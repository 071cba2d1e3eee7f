// warm MOUNT_PATH FILE...: reads the files into the cache as a pin request does, once their extents
// are known; prints the seconds.
#include "base/log.h"
#include "files/path.h"
#include "space/file_extents.h"
#include "state/service_state.h"
#include "warming/read_range.h"
#include "warming/warm_files.h"

#include <chrono>
#include <cstdio>
#include <sys/stat.h>

using namespace vesk;

int main(int argc, char *argv[]) {
    LogToSyslog = 0;
    if (argc < 3 || ServiceStateInitialize() != 0) {
        return 2;
    }
    std::vector<FileToWarm> files;
    for (int i = 2; i < argc; ++i) {
        struct stat status {};
        FileMappingTable table;
        if (stat(argv[i], &status) != 0 ||
            GetMappingTableFromFile(&table, argv[1], argv[i],
                                    static_cast<uint32_t>(status.st_ino)) < 0) {
            return 1;
        }
        files.push_back({argv[i], table});
    }
    const auto start = std::chrono::steady_clock::now();
    const WorkResult result = ReadFilesToCache(argv[1], files);
    const std::chrono::duration<double> time = std::chrono::steady_clock::now() - start;
    printf("%.6f\n", time.count());
    return result == WorkResult::Done ? 0 : 1;
}
