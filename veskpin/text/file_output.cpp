#include "text/file_output.h"

#include "base/scoped_fd.h"
#include "text/text_sink.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

namespace vesk {
namespace {
const mode_t kMode = 0644; // for whoever collects it

int Write(int folder, const std::string &name, std::string_view text) {
    const ScopedFd file(
        openat(folder, name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, kMode));
    if (!file.IsOpen()) {
        return errno;
    }
    TextSink sink(file.Get());
    sink.Put(text);
    const bool isWhole = sink.Flush() && fchmod(file.Get(), kMode) == 0 && fsync(file.Get()) == 0;
    return isWhole ? 0 : errno;
}
} // namespace

int FileOutputReplace(const std::string &path, std::string_view text) {
    const size_t slash = path.rfind('/');
    const std::string folderPath = slash == std::string::npos ? "." : path.substr(0, slash + 1);
    const std::string name = slash == std::string::npos ? path : path.substr(slash + 1);
    const ScopedFd folder(open(folderPath.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (!folder.IsOpen()) {
        return errno;
    }
    struct stat status {};
    if (fstatat(folder.Get(), name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0) {
        if (!S_ISREG(status.st_mode)) {
            return EINVAL;
        }
    } else if (errno != ENOENT) {
        return errno;
    }
    const std::string temporary = ".veskpin." + std::to_string(getpid()) + ".tmp";
    int error = Write(folder.Get(), temporary, text);
    if (error == EEXIST) {
        return error; // somebody else's
    }
    if (error == 0 && renameat(folder.Get(), temporary.c_str(), folder.Get(), name.c_str()) != 0) {
        error = errno;
    }
    if (error != 0) {
        unlinkat(folder.Get(), temporary.c_str(), 0);
    }
    return error;
}
} // namespace vesk
