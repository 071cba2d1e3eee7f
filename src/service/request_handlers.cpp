#include "service/request_handlers.h"

#include "base/log.h"
#include "base/malloc_text.h"
#include "bitmap/bitmap_file.h"
#include "bitmap/file_marking.h"
#include "bitmap/space_bitmap.h"
#include "driver/bitmap_control.h"
#include "driver/unpin_ranges.h"
#include "request/request_type.h"
#include "space/space.h"
#include "space/space_bitmap_path.h"
#include "space/space_cache.h"
#include "warming/reload_blocks.h"
#include "warming/warm_files.h"

#include <string>

namespace {

bool IsHandledType(int type) {
    return type == requestPinFiles || type == requestUnpinFiles || type == requestReloadPinBlocks;
}

std::string FullPath(const char *mountPath, const FileInfo &file) {
    return std::string(mountPath) + "/" + file.szRelativePath;
}

// What the load leaves, also where it fails, belongs to the holder.
int LoadBitmap(const char *uuid, BitmapHolder *bitmap, bool *sizeChanged) {
    PinBitmap *loaded = nullptr;
    const int result = BitmapAllocateAndInitialize(uuid, &loaded, sizeChanged);
    bitmap->reset(loaded);
    return result;
}

bool WriteAndSendBitmap(PinBitmap *bitmap, const char *bitmapPath, const char *cachePath,
                        const LogPlace &place) {
    if (BitmapWriteToFile(bitmap, bitmapPath) < 0) {
        LogWrite(LogClass::Error, place, "Write bitmap failed");
        return false;
    }
    if (BitmapSendToDriver(bitmap, cachePath) < 0) {
        LogWrite(LogClass::Error, place, "Can't send bitmap to driver");
        return false;
    }
    return true;
}

} // namespace

WorkResult HandleRequest(const RequestRecord *record) {
    WorkResult result = WorkResult::Failed;
    BitmapHolder bitmap;
    bool sizeChanged = false;
    MallocText uuid;
    MallocText cachePath;
    MallocText bitmapPath;
    std::vector<FileInfo> files;

    if (!IsHandledType(record->type)) {
        LogError("Get unhandle request (%s)", RequestTypeForLog(record->type));
    } else if (uuid.reset(SpaceGetUUID(record->mountPath)); !uuid) {
        LogError("Can't get space uuid");
    } else if (cachePath.reset(SpaceGetCachePath(uuid.get())); !cachePath) {
        LogError("Can't get cache path");
    } else if (bitmapPath.reset(SpaceGetBitmapPath(uuid.get())); !bitmapPath) {
        LogError("Can't get bitmap path");
    } else if (LoadBitmap(uuid.get(), &bitmap, &sizeChanged) < 0) {
        LogError("Allocate bitmap failed");
    } else if (record->type == requestReloadPinBlocks) {
        result = ReloadPinBlocksToCache(bitmap.get(), cachePath.get(), record->mountPath);
    } else if (RequestDataGetFileInfos(record->data, &files) < 0) {
        LogError("Can't parse file inodes from request's data (%s)", record->data);
    } else if (record->type == requestPinFiles) {
        result = HandlePinRequest(files, bitmap.get(), record->mountPath, cachePath.get(),
                                  bitmapPath.get());
    } else {
        result = HandleUnpinRequest(files, bitmap.get(), record->mountPath, cachePath.get(),
                                    bitmapPath.get());
    }

    if (result == WorkResult::Failed) {
        LogError("Handle request failed");
    } else if (result == WorkResult::Interrupted) {
        LogVerbose("Get Interruped");
    }
    // Also where there is none: its message then tells that the request ended before the bitmap was
    // loaded.
    BitmapFree(bitmap.release());
    return result;
}

WorkResult HandlePinRequest(const std::vector<FileInfo> &files, PinBitmap *bitmap,
                            const char *mountPath, const char *cachePath, const char *bitmapPath) {
    std::vector<FileToWarm> filesToWarm;
    for (const FileInfo &file : files) {
        if (file.szRelativePath[0] == '\0') {
            LogError("Info's relative path should not be NULL");
            return WorkResult::Failed;
        }
        const std::string path = FullPath(mountPath, file);
        FileMappingTable table;
        if (BitmapAddFile(bitmap, mountPath, path, static_cast<uint32_t>(file.inodeNum), &table) <
            0) {
            LogError("Can't add file (%s) inode (%lu) to bitmap", path.c_str(), file.inodeNum);
            return WorkResult::Failed;
        }
        filesToWarm.push_back({path, table});
    }
    if (!WriteAndSendBitmap(bitmap, bitmapPath, cachePath, LogHere())) {
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
    if (!WriteAndSendBitmap(bitmap, bitmapPath, cachePath, LogHere())) {
        return WorkResult::Failed;
    }
    if (SendUnpinInfoToDriver(cachePath, infos) < 0) {
        LogError("Can't send unpin information to driver");
        return WorkResult::Failed;
    }
    return WorkResult::Done;
}
