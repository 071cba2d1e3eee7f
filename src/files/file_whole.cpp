#include "files/file_whole.h"

#include "base/scoped_fd.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

namespace vesk {
int FileReadAll(const std::string &path, size_t maxBytes, std::string *content) {
    const ScopedFd file(open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
    struct stat status {};
    if (!file.IsOpen() || fstat(file.Get(), &status) != 0) {
        return errno;
    }
    if (!S_ISREG(status.st_mode)) {
        return EINVAL;
    }
    char chunk[65536];
    content->clear();
    for (;;) {
        const ssize_t count = read(file.Get(), chunk, sizeof(chunk));
        if (count == 0) {
            return 0;
        }
        if (count < 0) {
            return errno;
        }
        content->append(chunk, static_cast<size_t>(count));
        if (content->size() > maxBytes) {
            return EFBIG;
        }
    }
}
} // namespace vesk
