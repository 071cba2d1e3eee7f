#include "request/file_inode_list.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "files/path.h"
#include "space/relative_path.h"

#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace vesk {
namespace {
const char kEntryFormat[] = "%s%s#%lu"; // separator, relative path, inode number

// Fills the record from one entry; false when it is none. The entry is taken apart by hand: its
// text comes from users.
bool ParseEntry(const std::string &entry, FileInfo *info) {
    const size_t pathLength = entry.find('#');
    if (pathLength == std::string::npos || pathLength == 0 ||
        pathLength >= sizeof(info->szRelativePath)) {
        return false;
    }
    // With a second "#" the first belongs to the name, and the number behind it to nobody's inode.
    const char *number = entry.c_str() + pathLength + 1;
    if (*number < '0' || *number > '9' || strchr(number, '#') != nullptr) {
        return false;
    }
    errno = 0;
    const unsigned long long inode = strtoull(number, nullptr, 10);
    if (errno != 0 || inode > UINT32_MAX) {
        return false;
    }
    memcpy(info->szRelativePath, entry.data(), pathLength);
    info->inodeNum = static_cast<unsigned long>(inode);
    return true;
}
} // namespace

int AbsolutePathsToFileInodeList(const char *mountPath, const char *absolutePaths, char *out,
                                 size_t outSize) {
    LogTraceScope();
    std::vector<std::string> paths;
    SplitString(absolutePaths, ";", &paths);
    size_t length = 0;
    out[0] = '\0';
    for (const std::string &path : paths) {
        const MallocText relativePath(FileGetRelativePathByMountPath(mountPath, path.c_str()));
        if (!relativePath) {
            return -1;
        }
        uint32_t inode = 0;
        if (FileGetInodeNumber(path.c_str(), &inode) < 0) {
            LogError("Cant' get inode number of file (%s)", path.c_str());
            return -1;
        }
        LogVerbose("szFormat=%s pszRelativePath=%s szFileInodeList=%p size=%zu len=%d",
                   kEntryFormat, relativePath.get(), static_cast<void *>(out), outSize,
                   static_cast<int>(length));
        const int written =
            snprintf(out + length, outSize - length, kEntryFormat, length == 0 ? "" : ";",
                     relativePath.get(), static_cast<unsigned long>(inode));
        if (written < 0 || static_cast<size_t>(written) >= outSize - length) {
            LogError("File inode list doesn't fit in %zu bytes", outSize);
            return -1;
        }
        length += static_cast<size_t>(written);
    }
    LogVerbose("Get relativePaths = %s", out);
    return 0;
}

void SplitString(const char *text, const char *delimiters, std::vector<std::string> *pieces) {
    const size_t copiedMax = 1024;
    std::string copy(text, strnlen(text, copiedMax));
    pieces->clear();
    char *rest = nullptr;
    for (const char *piece = strtok_r(&copy[0], delimiters, &rest); piece != nullptr;
         piece = strtok_r(nullptr, delimiters, &rest)) {
        pieces->emplace_back(piece);
    }
}

int RequestDataGetFileInfos(const char *data, std::vector<FileInfo> *infos) {
    std::vector<std::string> pieces;
    SplitString(data, ";", &pieces);
    for (const std::string &piece : pieces) {
        FileInfo info{};
        if (!ParseEntry(piece, &info)) {
            LogError("Parse file inode from string (%s) failed", piece.c_str());
            return -1;
        }
        LogVerbose("info.szRelativePath=%s info.inodeNum=%lu", info.szRelativePath, info.inodeNum);
        infos->push_back(info);
    }
    return 0;
}
} // namespace vesk
