#include "files/file_leftovers.h"

#include "base/malloc_text.h"

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <dirent.h>
#include <fcntl.h>
#include <memory>
#include <string>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
// A process of another PID namespace looks gone while it is still at work, though not for this
// long.
const time_t kQuietSeconds = 60;

// The process id in the name of a temporary file, or 0.
pid_t ProcessOf(const char *name) {
    const size_t prefix = strlen(kTemporaryPrefix);
    if (strncmp(name, kTemporaryPrefix, prefix) != 0) {
        return 0;
    }
    char *end = nullptr;
    const long pid = strtol(name + prefix, &end, 10);
    const char *number = end + 1;
    if (pid <= 0 || *end != '.') {
        return 0;
    }
    const char *suffix = number + strspn(number, "0123456789");
    return suffix != number && strcmp(suffix, kTemporarySuffix) == 0 ? static_cast<pid_t>(pid) : 0;
}

bool IsLeftover(int folder, const char *name) {
    const pid_t pid = ProcessOf(name);
    if (pid == 0 || kill(pid, 0) == 0 || errno != ESRCH) {
        return false;
    }
    struct stat status {};
    return fstatat(folder, name, &status, AT_SYMLINK_NOFOLLOW) == 0 && S_ISREG(status.st_mode) &&
           status.st_mtime + kQuietSeconds < time(nullptr);
}
} // namespace

void FileRemoveLeftovers(const char *path) {
    // Where a link leads to is what is replaced.
    const MallocText target(realpath(path, nullptr));
    const std::string file = target ? target.get() : path;
    const size_t slash = file.rfind('/');
    const std::string folderPath = slash == std::string::npos ? "." : file.substr(0, slash + 1);
    const std::unique_ptr<DIR, Deleter<closedir>> folder(opendir(folderPath.c_str()));
    if (!folder) {
        return;
    }
    const int fd = dirfd(folder.get());
    while (const dirent *entry = readdir(folder.get())) {
        if (IsLeftover(fd, entry->d_name)) {
            unlinkat(fd, entry->d_name, 0);
        }
    }
}
} // namespace vesk
