#include "files/path.h"

#include "base/log.h"

#include <cerrno>
#include <sys/stat.h>

namespace vesk {
namespace {
const mode_t kFileBit = 0x8000;
const mode_t kDirectoryBit = 0x4000;

int StatPath(const char *path, LastLink link, struct stat *status) {
    return link == LastLink::Followed ? stat(path, status) : lstat(path, status);
}

int HasModeBit(const char *path, LastLink link, mode_t bit, const LogPlace &place) {
    struct stat status {};
    if (StatPath(path, link, &status) < 0) {
        LogErrorAt(place, "Path (%s) doesn't exist", path);
        return 0;
    }
    return (status.st_mode & bit) != 0 && !S_ISLNK(status.st_mode) ? 1 : 0;
}
} // namespace

int FileGetSizeByte(const char *path, uint64_t *sizeBytes, LastLink link) {
    struct stat status {};
    if (StatPath(path, link, &status) < 0) {
        LogError("Can't get file (%s) stat result", path);
        return -1;
    }
    *sizeBytes = static_cast<uint64_t>(status.st_size);
    return 0;
}

int FileGetInodeNumber(const char *path, uint32_t *inode) {
    struct stat status {};
    if (stat(path, &status) < 0) {
        LogError("Stat file %s error", path);
        return -1;
    }
    *inode = static_cast<uint32_t>(status.st_ino);
    return 0;
}

int PathExists(const char *path, LastLink link) {
    struct stat status {};
    return StatPath(path, link, &status) == 0 ? 1 : 0;
}

int PathIsMissing(const char *path, LastLink link) {
    struct stat status {};
    return StatPath(path, link, &status) < 0 &&
                   (errno == ENOENT || errno == ENOTDIR || errno == ELOOP || errno == ENAMETOOLONG)
               ? 1
               : 0;
}

int PathIsFile(const char *path, LastLink link) {
    return HasModeBit(path, link, kFileBit, LogHere());
}

int PathIsDir(const char *path) {
    return HasModeBit(path, LastLink::Followed, kDirectoryBit, LogHere());
}
} // namespace vesk
