#include "service/request_handlers.h"

#include "base/log.h"
#include "bitmap/file_marking.h"
#include "bitmap/space_bitmap.h"
#include "driver/unpin_ranges.h"
#include "warming/reload_blocks.h"
#include "warming/warm_files.h"

#include <string>

namespace vesk {
namespace {
std::string FullPath(const char *mountPath, const FileInfo &file) {
    return std::string(mountPath) + "/" + file.szRelativePath;
}
} // namespace

WorkResult HandleRequest(const RequestRecord *record) {
    WorkResult result = WorkResult::Failed;
    VolumeBitmap volume;
    std::vector<FileInfo> files;

    if (!RequestHasFiles(record->type) && record->type != kRequestReloadPinBlocks) {
        LogError("Get unhandle request (%s)", RequestTypeForLog(record->type));
    } else if (VolumeBitmapOpen(record->mountPath, &volume, LogHere()) < 0) {
        // It has said what is missing.
    } else if (record->type == kRequestReloadPinBlocks) {
        result =
            ReloadPinBlocksToCache(volume.bitmap.get(), volume.cachePath.get(), record->mountPath);
    } else if (RequestDataGetFileInfos(record->data, &files) < 0) {
        LogError("Can't parse file inodes from request's data (%s)", record->data);
    } else if (record->type == kRequestPinFiles) {
        result = HandlePinRequest(files, volume.bitmap.get(), record->mountPath,
                                  volume.cachePath.get(), volume.bitmapPath.get());
    } else {
        result = HandleUnpinRequest(files, volume.bitmap.get(), record->mountPath,
                                    volume.cachePath.get(), volume.bitmapPath.get());
    }

    if (result == WorkResult::Failed) {
        LogError("Handle request failed");
    } else if (result == WorkResult::Interrupted) {
        LogVerbose("Get Interruped");
    }
    // Also where there is none: its message then tells that the request ended before the bitmap was
    // loaded.
    BitmapFree(volume.bitmap.release());
    return result;
}

WorkResult HandlePinRequest(const std::vector<FileInfo> &files, PinBitmap *bitmap,
                            const char *mountPath, const char *cachePath, const char *bitmapPath) {
    std::vector<FileToWarm> filesToWarm;
    filesToWarm.reserve(files.size()); // growing would copy every table
    for (const FileInfo &file : files) {
        if (file.szRelativePath[0] == '\0') {
            LogError("Info's relative path should not be NULL");
            return WorkResult::Failed;
        }
        filesToWarm.push_back({FullPath(mountPath, file), {}});
        FileToWarm &added = filesToWarm.back();
        if (BitmapAddFile(bitmap, mountPath, added.path, static_cast<uint32_t>(file.inodeNum),
                          &added.table) < 0) {
            LogError("Can't add file (%s) inode (%lu) to bitmap", added.path.c_str(),
                     file.inodeNum);
            return WorkResult::Failed;
        }
    }
    if (BitmapWriteAndSend(bitmap, bitmapPath, cachePath, LogHere()) < 0) {
        return WorkResult::Failed;
    }
    return ReadFilesToCache(mountPath, filesToWarm);
}

WorkResult HandleUnpinRequest(const std::vector<FileInfo> &files, PinBitmap *bitmap,
                              const char *mountPath, const char *cachePath,
                              const char *bitmapPath) {
    std::vector<UnpinInfo> infos;
    for (const FileInfo &file : files) {
        if (UnsetBitmapAndAppendUnpinInfos(cachePath, bitmap, mountPath, FullPath(mountPath, file),
                                           static_cast<uint32_t>(file.inodeNum), &infos) < 0) {
            LogError("Unset bitmap and append unpin infos failed");
            return WorkResult::Failed;
        }
    }
    // The bitmap goes first: were the ranges released before it, a read in between could pin them
    // again by the old one.
    if (BitmapWriteAndSend(bitmap, bitmapPath, cachePath, LogHere()) < 0) {
        return WorkResult::Failed;
    }
    if (SendUnpinInfoToDriver(cachePath, infos) < 0) {
        LogError("Can't send unpin information to driver");
        return WorkResult::Failed;
    }
    return WorkResult::Done;
}
} // namespace vesk
