#include "model/targets.h"

#include "base/malloc_text.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>

namespace vesk {
namespace {
// Without "." and "..", which are taken from the text.
std::string Normalized(const std::string &path) {
    std::vector<std::string> parts;
    for (size_t at = 0; at < path.size();) {
        const size_t end = std::min(path.find('/', at), path.size());
        const std::string part = path.substr(at, end - at);
        at = end + 1;
        if (part == "..") {
            if (!parts.empty()) {
                parts.pop_back();
            }
        } else if (!part.empty() && part != ".") {
            parts.push_back(part);
        }
    }
    std::string text;
    for (const std::string &part : parts) {
        text += "/" + part;
    }
    return text.empty() ? "/" : text;
}

std::string Absolute(const std::string &path) {
    if (!path.empty() && path[0] == '/') {
        return path;
    }
    const MallocText folder(getcwd(nullptr, 0));
    return (folder ? std::string(folder.get()) : "") + "/" + path;
}

// False with errno, where the folder cannot be resolved.
bool TryResolve(const std::string &folder, const std::string &rest, std::string *path) {
    const MallocText resolved(realpath(folder.c_str(), nullptr));
    if (!resolved) {
        return false;
    }
    *path = resolved.get();
    if (!rest.empty()) {
        *path += (*path == "/" ? "" : "/") + rest;
    }
    return true;
}

// The folders resolved, the last component as it is. 0 or an errno; then by the text alone.
int Resolve(const std::string &given, std::string *path) {
    std::string text = Absolute(given);
    text.erase(text.find_last_not_of('/') + 1);
    const size_t slash = text.rfind('/');
    const std::string name = slash == std::string::npos ? "" : text.substr(slash + 1);
    const bool isName = !name.empty() && name != "." && name != "..";
    std::string folder = isName ? text.substr(0, slash + 1) : text + "/";
    std::string rest = isName ? name : "";
    int error = 0;
    // Of a path that leads nowhere what is there is resolved: records may name it still.
    while (!TryResolve(folder, rest, path)) {
        error = errno;
        folder.erase(folder.find_last_not_of('/') + 1);
        const size_t last = folder.rfind('/');
        if ((error != ENOENT && error != ENOTDIR) || last == std::string::npos) {
            *path = Normalized(text);
            return error;
        }
        rest.insert(0, rest.empty() ? "" : "/");
        rest.insert(0, folder, last + 1);
        folder.erase(last + 1);
    }
    *path = error == 0 ? *path : Normalized(*path);
    return error;
}

// Whether `path` is the folder or lies below it; what lies below in `*rest`.
bool IsAtOrBelow(const std::string &path, const std::string &folder, std::string *rest) {
    if (folder == "/") {
        *rest = path.substr(1);
        return true;
    }
    if (path.compare(0, folder.size(), folder) != 0 ||
        (path.size() > folder.size() && path[folder.size()] != '/')) {
        return false;
    }
    *rest = path.size() > folder.size() ? path.substr(folder.size() + 1) : "";
    return true;
}

// The volume with the longest mount path above.
void FindVolume(const World &world, Target *target) {
    size_t longest = 0;
    std::string rest;
    for (const WorldVolume &volume : world.volumes) {
        const std::string &mountPath = volume.volume.mountPath;
        if (mountPath.size() > longest && IsAtOrBelow(target->path, mountPath, &rest)) {
            longest = mountPath.size();
            target->isWithoutCache = volume.volume.isMounted && !volume.volume.hasCache;
            target->volume = &volume;
            target->relativePath = rest;
        }
    }
    for (const std::string &mountPath : world.withoutCache) {
        if (mountPath.size() > longest && IsAtOrBelow(target->path, mountPath, &rest)) {
            longest = mountPath.size();
            target->isWithoutCache = true;
            target->volume = nullptr;
        }
    }
}

// Whether the thing lies on the volume's file system and not on one mounted below it.
bool IsOnVolume(const Target &target) {
    FileStat top{};
    return FileStatAt(AT_FDCWD, target.volume->volume.mountPath.c_str(), &top) != 0 ||
           top.device == target.status->device;
}
} // namespace

Target TargetResolve(const World &world, const std::string &path) {
    Target target;
    target.error = Resolve(path, &target.path);
    FileStat status{};
    if (target.error == 0) {
        target.error = FileStatAt(AT_FDCWD, target.path.c_str(), &status);
    }
    if (target.error == 0) {
        target.status = status;
    }
    FindVolume(world, &target);
    if (target.volume != nullptr && target.status && !IsOnVolume(target)) {
        target.volume = nullptr;
        target.isWithoutCache = false;
    }
    return target;
}
} // namespace vesk
