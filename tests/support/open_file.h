// What a test can learn about a file that the code under test holds open at the moment.
#pragma once

#include <fcntl.h>
#include <filesystem>
#include <string>

namespace vesk {
// The status flags (fcntl F_GETFL) of a descriptor of this process on `path`, or -1 where it holds
// none.
inline int OpenFileFlags(const std::string &path) {
    for (const auto &entry : std::filesystem::directory_iterator("/proc/self/fd")) {
        std::error_code gone;
        if (std::filesystem::read_symlink(entry.path(), gone) == path) {
            return fcntl(std::stoi(entry.path().filename()), F_GETFL);
        }
    }
    return -1;
}
} // namespace vesk
