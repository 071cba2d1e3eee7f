// Carrying out one request: pin, unpin or reload.
//
// Each loads the volume's bitmap from its file anew, changes it, writes it back, hands it to the
// cache driver and then warms the cache or releases ranges. Nothing is undone on failure: a request
// that fails on one of its files has changed neither file nor driver; one that fails later has
// changed what came before.
//
// Thread rule: called on the worker's thread, one request at a time, without the service lock.
#pragma once

#include "bitmap/pin_bitmap.h"
#include "request/file_inode_list.h"
#include "request/request_record.h"
#include "warming/work_result.h"

#include <vector>

namespace vesk {
// The record's texts are NUL-terminated.
WorkResult HandleRequest(const RequestRecord *record);

// Marks the files, writes and sends the bitmap, reads the files through the cache.
WorkResult HandlePinRequest(const std::vector<FileInfo> &files, PinBitmap *bitmap,
                            const char *mountPath, const char *cachePath, const char *bitmapPath);

// Clears the files, writes and sends the bitmap, then releases the files' ranges.
WorkResult HandleUnpinRequest(const std::vector<FileInfo> &files, PinBitmap *bitmap,
                              const char *mountPath, const char *cachePath, const char *bitmapPath);
} // namespace vesk
