#include "cachedev/image_access.h"

#include <cerrno>
#include <cstdio>
#include <fcntl.h>
#include <unistd.h>

namespace vesk {
namespace {
constexpr mode_t kOthersMayRead = S_IRGRP | S_IROTH;
constexpr mode_t kOthersMayWrite = S_IWGRP | S_IWOTH;

// Every byte that the file has or will have.
struct flock WholeFile(short type) {
    struct flock lock = {};
    lock.l_type = type;
    lock.l_whence = SEEK_SET;
    return lock;
}
} // namespace

bool ImageIsPrivate(const struct stat &status, const std::string &path, const std::string &name,
                    std::string &error) {
    if (status.st_uid != 0 && status.st_uid != geteuid()) {
        error = "the " + name + " belongs to user " + std::to_string(status.st_uid) +
                ", who could change what the volume holds; run: chown root " + path;
        return false;
    }
    if ((status.st_mode & kOthersMayWrite) != 0) {
        error = "others could change what the volume holds: they may write the " + name +
                "; run: chmod 600 " + path;
        return false;
    }
    if ((status.st_mode & kOthersMayRead) != 0) {
        fprintf(stderr,
                "veskcachedev: warning: others could read what the volume holds: they may read "
                "the %s; run: chmod 600 %s\n",
                name.c_str(), path.c_str());
    }
    return true;
}

int ImageLock(int fd) {
    struct flock lock = WholeFile(F_WRLCK);
    if (fcntl(fd, F_OFD_SETLK, &lock) == 0) {
        return 0;
    }
    const int error = errno == EACCES ? EAGAIN : errno;
    // A reader's lock stands in the way of writers' alone, so a test for it overlooks readers.
    lock = WholeFile(F_RDLCK);
    const bool onlyReaders =
        error == EAGAIN && fcntl(fd, F_OFD_GETLK, &lock) == 0 && lock.l_type == F_UNLCK;
    return onlyReaders ? 0 : error;
}
} // namespace vesk
