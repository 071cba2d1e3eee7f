#include "files/file_text.h"

#include "base/deleter.h"
#include "base/log.h"
#include "base/malloc_text.h"
#include "base/scoped_fd.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fcntl.h>
#include <memory>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
using Stream = std::unique_ptr<FILE, Deleter<fclose>>;

// All of it, or as much as the text has room for. Cuts the text to what has been read; -1 with
// errno on failure.
int ReadAll(int fd, std::string *text) {
    size_t length = 0;
    ssize_t result = 1;
    while (length < text->size() && result > 0) {
        result = read(fd, &(*text)[length], text->size() - length);
        length += result > 0 ? static_cast<size_t>(result) : 0;
    }
    text->resize(length);
    return result < 0 ? -1 : 0;
}

// A file that is made here is everybody's to read and its owner's to write, whatever the umask.
int OpenForWriting(const char *path, int flags) {
    const mode_t mode = 0644;
    const int created = open(path, flags | O_CREAT | O_EXCL, mode);
    if (created >= 0) {
        fchmod(created, mode);
        return created;
    }
    return errno == EEXIST ? open(path, flags | O_CREAT, mode) : -1;
}
} // namespace

int FileWriteString(const char *path, const char *text, OldContent old) {
    const bool isKept = old == OldContent::Kept;
    const int flags = O_RDWR | O_CLOEXEC | (isKept ? O_APPEND : O_TRUNC);
    ScopedFd file(OpenForWriting(path, flags));
    Stream stream(file.IsOpen() ? fdopen(file.Get(), isKept ? "a+" : "w+") : nullptr);
    if (!stream) {
        LogError("Can't open file (%s)", path);
        return -1;
    }
    file.Release(); // the stream's from here on
    const size_t length = strlen(text);
    const bool written = fwrite(text, 1, length, stream.get()) == length;
    // The last bytes leave the buffer only here, so a full disk shows here.
    const bool closed = fclose(stream.release()) == 0;
    if (!written || !closed) {
        LogError("Write error");
        return -1;
    }
    LogVerbose("Write to file OK");
    return 0;
}

int FileReadString(const char *path, std::string *text) {
    const Stream stream(fopen(path, "re"));
    if (!stream) {
        LogError("Can't open file (%s)", path);
        return -1;
    }
    char *buffer = nullptr;
    size_t size = 0;
    const ssize_t length = getline(&buffer, &size, stream.get());
    const MallocText line(buffer);
    if (length < 0) {
        LogError("Can't get a line from file (%s)", path);
        return -1;
    }
    text->assign(line.get());
    LogVerbose("Get text = %s", text->c_str());
    return 0;
}

int FileReadWhole(const char *path, std::string *text) {
    const LogPlace place{"FileReadString", __LINE__};
    const ScopedFd file(open(path, O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
    struct stat status {};
    const int known = file.IsOpen() ? fstat(file.Get(), &status) : stat(path, &status);
    if (known == 0 && !S_ISREG(status.st_mode)) {
        return -1;
    }
    if (!file.IsOpen() || known < 0) {
        LogErrorAt(place, "Can't open file (%s)", path);
        return -1;
    }
    text->resize(8192);
    if (ReadAll(file.Get(), text) < 0 || text->empty()) {
        LogErrorAt(place, "Can't get a line from file (%s)", path);
        return -1;
    }
    LogVerboseAt(place, "Get text = %s", text->c_str());
    return 0;
}
} // namespace vesk
