#include "cachedev/pid_file.h"

#include "base/scoped_fd.h"

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
bool IsOwnFile(int fd) {
    struct stat status = {};
    return fstat(fd, &status) == 0 && S_ISREG(status.st_mode) && status.st_nlink == 1 &&
           (status.st_uid == 0 || status.st_uid == geteuid());
}
} // namespace

PidFile::~PidFile() {
    if (!path.empty()) {
        unlink(path.c_str());
    }
}

bool PidFileWrite(const std::string &path, PidFile &file, std::string &error) {
    // Not emptied before it is known to be what it should be, and nobody waits for a FIFO's other
    // end.
    const int flags = O_WRONLY | O_CREAT | O_NOFOLLOW | O_CLOEXEC | O_NOCTTY | O_NONBLOCK;
    const ScopedFd fd(open(path.c_str(), flags, 0644));
    if ((!fd.IsOpen() && (errno == ELOOP || errno == ENXIO)) ||
        (fd.IsOpen() && !IsOwnFile(fd.Get()))) {
        error = "cannot write " + path + ": it is a link or no file of root's";
        return false;
    }
    const std::string text = std::to_string(getpid()) + "\n";
    if (!fd.IsOpen() || fchmod(fd.Get(), 0644) != 0 || ftruncate(fd.Get(), 0) != 0 ||
        write(fd.Get(), text.data(), text.size()) != static_cast<ssize_t>(text.size())) {
        error = "cannot write " + path + ": " + strerror(errno);
        return false;
    }
    file.path = path;
    return true;
}
} // namespace vesk
