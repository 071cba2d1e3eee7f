#include "text/path_list.h"

#include "base/scoped_fd.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

namespace vesk {
int PathListRead(const std::string &file, bool nulSeparated, std::vector<std::string> *paths) {
    const bool isInput = file == "-";
    const ScopedFd opened(isInput ? -1 : open(file.c_str(), O_RDONLY | O_CLOEXEC));
    if (!isInput && !opened.IsOpen()) {
        return errno;
    }
    const char separator = nulSeparated ? '\0' : '\n';
    std::string begun;
    char chunk[65536];
    for (;;) {
        const ssize_t count = read(isInput ? STDIN_FILENO : opened.Get(), chunk, sizeof(chunk));
        if (count < 0) {
            return errno;
        }
        for (ssize_t i = 0; i < count; ++i) {
            if (chunk[i] != separator) {
                begun += chunk[i];
            } else if (!begun.empty()) {
                paths->push_back(std::move(begun));
                begun.clear();
            }
        }
        if (count == 0) {
            break;
        }
    }
    if (!begun.empty()) {
        paths->push_back(begun);
    }
    return 0;
}
} // namespace vesk
