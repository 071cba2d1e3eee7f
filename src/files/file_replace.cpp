#include "files/file_replace.h"

#include "base/malloc_text.h"
#include "base/scoped_fd.h"
#include "files/file_leftovers.h"

#include <atomic>
#include <cerrno>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
enum class Attempt { Done, NotCreated, NotWritten, NotAllowed };

bool WriteAll(int fd, const std::string &content) {
    size_t written = 0;
    while (written < content.size()) {
        const ssize_t result = write(fd, content.data() + written, content.size() - written);
        if (result < 0 && errno == EINTR) {
            continue;
        }
        if (result <= 0) {
            return false;
        }
        written += static_cast<size_t>(result);
    }
    return true;
}

// Errors that say "not in this folder" or "not over this file", as opposed to a full disk or a lack
// of descriptors, after which writing in place would only destroy the old content.
bool IsFolderRefusal(int error) {
    return error == EACCES || error == EPERM || error == EROFS || error == EBUSY || error == EXDEV;
}

// A full disk is as unreported here as it is when the content is written.
Attempt AttemptFromErrno() {
    if (errno == ENOSPC || errno == EDQUOT) {
        return Attempt::NotWritten;
    }
    return IsFolderRefusal(errno) ? Attempt::NotAllowed : Attempt::NotCreated;
}

// A new file in the folder under a name that nobody else uses. Negative with errno on failure.
int CreateTemporary(int folder, mode_t mode, std::string *name) {
    static std::atomic<unsigned> counter{0};
    const int tries = 100;
    for (int i = 0; i < tries; ++i) {
        *name = kTemporaryPrefix + std::to_string(getpid()) + "." +
                std::to_string(counter.fetch_add(1)) + kTemporarySuffix;
        const int flags = O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
        const int fd = openat(folder, name->c_str(), flags, mode);
        if (fd >= 0 || errno != EEXIST) {
            return fd;
        }
    }
    return -1;
}

// Owner first: giving a file away clears its set-id bits.
bool CopyOwnerAndMode(int fd, const struct stat &old) {
    struct stat now {};
    if (fstat(fd, &now) < 0) {
        return false;
    }
    if ((now.st_uid != old.st_uid || now.st_gid != old.st_gid) &&
        fchown(fd, old.st_uid, old.st_gid) < 0) {
        return false;
    }
    return fchmod(fd, old.st_mode & 07777) == 0;
}

// Writes the temporary file, whole and durable. `old` is null where there is no file yet.
Attempt FillTemporary(int fd, const struct stat *old, const std::string &content) {
    if (old != nullptr && !CopyOwnerAndMode(fd, *old)) {
        return Attempt::NotAllowed;
    }
    return WriteAll(fd, content) && fsync(fd) == 0 ? Attempt::Done : Attempt::NotWritten;
}

Attempt ReplaceByRename(const std::string &target, const struct stat *old,
                        const std::string &content) {
    const size_t slash = target.rfind('/');
    const std::string folderPath = slash == std::string::npos ? "." : target.substr(0, slash + 1);
    const std::string base = slash == std::string::npos ? target : target.substr(slash + 1);

    const ScopedFd folder(open(folderPath.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!folder.IsOpen()) {
        return AttemptFromErrno();
    }
    std::string name;
    const mode_t mode = old == nullptr ? 0666 : 0600;
    const ScopedFd temporary(CreateTemporary(folder.Get(), mode, &name));
    if (!temporary.IsOpen()) {
        return AttemptFromErrno();
    }
    Attempt attempt = FillTemporary(temporary.Get(), old, content);
    if (attempt == Attempt::Done &&
        renameat(folder.Get(), name.c_str(), folder.Get(), base.c_str()) < 0) {
        attempt = AttemptFromErrno();
    }
    if (attempt != Attempt::Done) {
        unlinkat(folder.Get(), name.c_str(), 0);
        return attempt;
    }
    // The rename itself must survive a power cut; file systems that cannot sync a folder say so and
    // are left to their own ways.
    fsync(folder.Get());
    return Attempt::Done;
}

FileReplaceResult WriteInPlace(const char *path, const std::string &content) {
    const int flags = O_WRONLY | O_CREAT | O_TRUNC | O_NONBLOCK | O_CLOEXEC;
    const ScopedFd file(open(path, flags, 0666));
    if (!file.IsOpen()) {
        return FileReplaceResult::CannotOpen;
    }
    return WriteAll(file.Get(), content) ? FileReplaceResult::Done : FileReplaceResult::NotWritten;
}

// By rename, or in place where the folder does not allow that.
FileReplaceResult Replace(const char *path, const std::string &target, const struct stat *old,
                          const std::string &content) {
    switch (ReplaceByRename(target, old, content)) {
    case Attempt::Done: return FileReplaceResult::Done;
    case Attempt::NotCreated: return FileReplaceResult::CannotOpen;
    case Attempt::NotWritten: return FileReplaceResult::NotWritten;
    case Attempt::NotAllowed: break;
    }
    return WriteInPlace(path, content);
}

FileReplaceResult ReplaceExisting(const char *path, const struct stat &old,
                                  const std::string &content) {
    // Renaming asks only the folder; a file that may not be written must stay as it is all the
    // same.
    if (!ScopedFd(open(path, O_WRONLY | O_NONBLOCK | O_CLOEXEC)).IsOpen()) {
        return FileReplaceResult::CannotOpen;
    }
    const MallocText target(realpath(path, nullptr));
    if (!target) {
        // A file without a name any more can only be written in place.
        return errno == ENOENT ? WriteInPlace(path, content) : FileReplaceResult::CannotOpen;
    }
    return Replace(path, target.get(), &old, content);
}
} // namespace

FileReplaceResult FileReplaceContent(const char *path, const std::string &content) {
    struct stat status {};
    if (stat(path, &status) == 0) {
        return S_ISREG(status.st_mode) ? ReplaceExisting(path, status, content)
                                       : WriteInPlace(path, content);
    }
    // Nothing there. A link that points nowhere is written through, which creates its target.
    if (errno == ENOENT && lstat(path, &status) < 0 && errno == ENOENT) {
        return Replace(path, path, nullptr, content);
    }
    return WriteInPlace(path, content);
}
} // namespace vesk
