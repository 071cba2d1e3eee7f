#include "verbs/plan_reason.h"

#include "base/malloc_text.h"
#include "request/request_fill.h"
#include "space/space.h"
#include "text/utf8.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace vesk {
namespace {
bool IsBitmapFile(const std::string &mountPath, const std::string &filePath) {
    const MallocText bitmapPath(BitmapGetPathByReferencePath(mountPath.c_str()));
    return bitmapPath && filePath == bitmapPath.get();
}
} // namespace

const char *SkipReasonText(SkipReason reason) {
    static const char *const kTexts[] = {
        "not-found",        "name",      "too-long",  "not-utf8",      "not-regular", "bitmap-file",
        "other-filesystem", "no-volume", "no-blocks", "no-permission", "unreadable",  "same-inode",
        "no-room"};
    return kTexts[static_cast<size_t>(reason)];
}

SkipReason SkipReasonOfError(int error) {
    switch (error) {
    case ENOENT:
    case ENOTDIR: return SkipReason::NotFound;
    case EACCES:
    case EPERM: return SkipReason::NoPermission;
    case EXDEV: return SkipReason::OtherFileSystem;
    case ENAMETOOLONG: return SkipReason::TooLong;
    default: return SkipReason::Unreadable;
    }
}

std::optional<SkipReason> SkipReasonOf(const std::string &mountPath,
                                       const std::string &relativePath, const FileLook &look) {
    if (look.error != 0) {
        return SkipReasonOfError(look.error);
    }
    if (!S_ISREG(look.status.mode)) {
        return SkipReason::NotRegular;
    }
    const std::string filePath = mountPath + "/" + relativePath;
    if (IsBitmapFile(mountPath, filePath)) {
        return SkipReason::BitmapFile;
    }
    switch (RequestPathCheck(mountPath, filePath, static_cast<uint32_t>(look.status.inode))) {
    case RequestPathFault::Name: return SkipReason::Name;
    case RequestPathFault::TooLong: return SkipReason::TooLong;
    case RequestPathFault::None: break;
    }
    if (!Utf8IsValid(filePath)) {
        return SkipReason::NotUtf8;
    }
    if (!look.hasExtents) {
        return geteuid() == 0 ? SkipReason::Unreadable : SkipReason::NoPermission;
    }
    if (look.table.entries.empty()) {
        return SkipReason::NoBlocks;
    }
    return std::nullopt;
}
} // namespace vesk
