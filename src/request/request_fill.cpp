#include "request/request_fill.h"

#include "request/file_inode_list.h"
#include "request/request_record.h"

namespace vesk {
namespace {
const size_t kTextMax = kRequestDataBytes - 1; // of paths and of the list, without the NUL
const size_t kRelativePathMax = sizeof(FileInfo::szRelativePath) - 1;
// A file's folder is told from so many bytes of its path.
const size_t kPathCut = 512;
const char kSeparating[] = ";# \t\n\v\f\r";

// Bytes of the file's entry in the list.
size_t EntryBytes(const std::string &mountPath, const std::string &filePath, uint32_t inode) {
    return filePath.size() - mountPath.size() - 1 + 1 + std::to_string(inode).size();
}
} // namespace

RequestPathFault RequestPathCheck(const std::string &mountPath, const std::string &filePath,
                                  uint32_t inode) {
    if (filePath.find_first_of(kSeparating, mountPath.size()) != std::string::npos ||
        mountPath.find(';') != std::string::npos) {
        return RequestPathFault::Name;
    }
    const bool fits = mountPath.size() < kRequestMountPathBytes && filePath.size() <= kTextMax &&
                      filePath.size() - mountPath.size() - 1 <= kRelativePathMax &&
                      EntryBytes(mountPath, filePath, inode) <= kTextMax &&
                      (filePath.size() <= kPathCut || filePath.rfind('/') < kPathCut - 1);
    return fits ? RequestPathFault::None : RequestPathFault::TooLong;
}

bool RequestFillAdd(RequestFill *fill, const std::string &mountPath, const std::string &filePath,
                    uint32_t inode) {
    const size_t separator = fill->files == 0 ? 0 : 1;
    const size_t pathBytes = fill->pathBytes + separator + filePath.size();
    const size_t listBytes = fill->listBytes + separator + EntryBytes(mountPath, filePath, inode);
    if (pathBytes > kTextMax || listBytes > kTextMax) {
        return false;
    }
    *fill = {fill->files + 1, pathBytes, listBytes};
    return true;
}
} // namespace vesk
