#include "model/path_walk.h"

#include "base/deleter.h"
#include "base/scoped_fd.h"
#include "files/folder_open.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <memory>
#include <vector>

namespace vesk {
namespace {
// The names in an open folder, sorted. 0 or an errno, and then those before the failure.
int NamesIn(int folder, std::vector<std::string> *names) {
    ScopedFd again(openat(folder, ".", kOpenForReading | O_DIRECTORY));
    if (!again.IsOpen()) {
        return errno;
    }
    const std::unique_ptr<DIR, Deleter<closedir>> stream(fdopendir(again.Get()));
    if (stream == nullptr) {
        return errno;
    }
    again.Release(); // the stream closes it from here on
    errno = 0;
    while (const dirent *entry = readdir(stream.get())) {
        const std::string name = entry->d_name;
        if (name != "." && name != "..") {
            names->push_back(name);
        }
    }
    const int error = errno;
    std::sort(names->begin(), names->end());
    return error;
}

WalkKind KindOf(const FileStat &status, dev_t device) {
    if (status.device != device) {
        return WalkKind::OtherFileSystem;
    }
    return S_ISREG(status.mode) ? WalkKind::File : WalkKind::Other;
}

// A folder that is being walked, with the names of those below it that are still to come, the next
// one last.
struct Level {
    std::string path;
    std::vector<std::string> folders;
};

std::string PathOf(const std::string &folder, const std::string &name) {
    std::string path = folder;
    path.append(folder.empty() ? "" : "/").append(name);
    return path;
}

// Gives the entries of a folder to `visit`, and those that are folders to `below`. False: nobody
// wants more.
bool WalkFolder(const FileLooker &looker, int folder, const std::string &here,
                const std::vector<std::string> &names,
                const std::function<bool(const WalkEntry &)> &visit,
                const std::function<bool()> &goesOn, Level *below) {
    for (const std::string &name : names) {
        if (goesOn && !goesOn()) {
            return false;
        }
        const std::string path = PathOf(here, name);
        FileStat status{};
        const int failure = FileStatAt(folder, name.c_str(), &status);
        if (failure == ENOENT) {
            continue;
        }
        if (failure == 0 && S_ISDIR(status.mode) && status.device == looker.Device()) {
            below->folders.push_back(name);
            continue;
        }
        const WalkKind kind = failure == EXDEV ? WalkKind::OtherFileSystem
                              : failure != 0   ? WalkKind::Unreadable
                                               : KindOf(status, looker.Device());
        if (!visit({path, kind, status, failure == EXDEV ? 0 : failure})) {
            return false;
        }
    }
    std::reverse(below->folders.begin(), below->folders.end());
    return true;
}
} // namespace

void PathWalk(const FileLooker &looker, const std::string &folder,
              const std::function<bool(const WalkEntry &)> &visit,
              const std::function<bool()> &goesOn) {
    if (looker.Error() != 0) {
        visit({folder, WalkKind::Unreadable, {}, looker.Error()});
        return;
    }
    // Names by levels, not paths: users make folders of any number in folders of any depth.
    std::vector<Level> levels{{"", {folder}}};
    while (!levels.empty() && (!goesOn || goesOn())) {
        Level &level = levels.back();
        if (level.folders.empty()) {
            levels.pop_back();
            continue;
        }
        const std::string here = PathOf(level.path, level.folders.back());
        level.folders.pop_back();
        errno = 0;
        const ScopedFd fd = FolderOpenBeneath(looker.Root(), here);
        std::vector<std::string> names;
        const int error = fd.IsOpen() ? NamesIn(fd.Get(), &names) : errno != 0 ? errno : ENOENT;
        if (error == ENOENT && levels.size() > 1) {
            continue; // gone since its name was read
        }
        if (error != 0 && !visit({here, WalkKind::Unreadable, {}, error})) {
            return;
        }
        Level next{here, {}};
        if (!WalkFolder(looker, fd.Get(), here, names, visit, goesOn, &next)) {
            return;
        }
        levels.push_back(std::move(next));
    }
}
} // namespace vesk
