#include "files/file_replace.h"

#include "base/malloc_text.h"
#include "base/scoped_fd.h"
#include "files/file_leftovers.h"

#include <atomic>
#include <cerrno>
#include <cstdint>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
enum class Attempt { Done, NotMade, NoRoom, Failed };

bool WriteAll(int fd, const std::string &content) {
    size_t written = 0;
    while (written < content.size()) {
        const ssize_t result = write(fd, content.data() + written, content.size() - written);
        if (result < 0 && errno == EINTR) {
            continue;
        }
        if (result < 0) {
            return false;
        }
        if (result == 0) {
            errno = ENOSPC;
            return false;
        }
        written += static_cast<size_t>(result);
    }
    return true;
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
        return Attempt::NotMade;
    }
    if (WriteAll(fd, content) && fsync(fd) == 0) {
        return Attempt::Done;
    }
    return errno == ENOSPC || errno == EDQUOT ? Attempt::NoRoom : Attempt::Failed;
}

Attempt ReplaceByRename(const std::string &target, const struct stat *old,
                        const std::string &content) {
    const size_t slash = target.rfind('/');
    const std::string folderPath = slash == std::string::npos ? "." : target.substr(0, slash + 1);
    const std::string base = slash == std::string::npos ? target : target.substr(slash + 1);

    const ScopedFd folder(open(folderPath.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!folder.IsOpen()) {
        return Attempt::NotMade;
    }
    std::string name;
    const mode_t mode = old == nullptr ? 0666 : 0600;
    const ScopedFd temporary(CreateTemporary(folder.Get(), mode, &name));
    if (!temporary.IsOpen()) {
        return Attempt::NotMade;
    }
    Attempt attempt = FillTemporary(temporary.Get(), old, content);
    if (attempt == Attempt::Done &&
        renameat(folder.Get(), name.c_str(), folder.Get(), base.c_str()) < 0) {
        attempt = Attempt::NotMade;
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

// Grows the file with blanks, which mean nothing behind a document, to the size of what will be
// written, and syncs them: storage may promise room that it has not got. Without the room the file
// is as it was.
bool TakeRoom(int fd, off_t present, size_t needed) {
    const auto missing = static_cast<int64_t>(needed) - present;
    if (missing <= 0) {
        return true;
    }
    if (lseek(fd, present, SEEK_SET) == present &&
        WriteAll(fd, std::string(static_cast<size_t>(missing), ' ')) && fsync(fd) == 0) {
        return true;
    }
    if (ftruncate(fd, present) < 0) {
        // With some blanks left behind it the document is whole all the same.
    }
    return false;
}

bool Overwrite(int fd, const std::string &content) {
    return lseek(fd, 0, SEEK_SET) == 0 && WriteAll(fd, content) &&
           ftruncate(fd, static_cast<off_t>(content.size())) == 0 && fsync(fd) == 0;
}

// For what was created and could not be filled: an empty document would be a damaged one.
void RemoveCreated(const char *path) {
    const MallocText target(realpath(path, nullptr));
    if (target) {
        unlink(target.get());
    }
}

FileReplaceResult WriteInPlace(const char *path, const std::string &content) {
    const int flags = O_WRONLY | O_NONBLOCK | O_CLOEXEC;
    ScopedFd file(open(path, flags));
    const bool created = !file.IsOpen() && errno == ENOENT;
    if (created) {
        file = ScopedFd(open(path, flags | O_CREAT, 0666));
    }
    struct stat status {};
    if (!file.IsOpen() || fstat(file.Get(), &status) < 0) {
        return FileReplaceResult::CannotOpen;
    }
    if (!S_ISREG(status.st_mode)) {
        return WriteAll(file.Get(), content) ? FileReplaceResult::Done
                                             : FileReplaceResult::NotWritten;
    }
    // Nothing to keep in a file that is new, and no memory to ask for that may not be there.
    const bool hasRoom = created || TakeRoom(file.Get(), status.st_size, content.size());
    if (hasRoom && Overwrite(file.Get(), content)) {
        return FileReplaceResult::Done;
    }
    if (created) {
        RemoveCreated(path);
    }
    return FileReplaceResult::CannotOpen;
}

// By rename, or in place where there can be no other file.
FileReplaceResult Replace(const char *path, const std::string &target, const struct stat *old,
                          const std::string &content) {
    switch (ReplaceByRename(target, old, content)) {
    case Attempt::Done: return FileReplaceResult::Done;
    case Attempt::NoRoom: return FileReplaceResult::NotWritten;
    case Attempt::Failed: return FileReplaceResult::CannotOpen;
    case Attempt::NotMade: break;
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
