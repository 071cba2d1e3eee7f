// Carrying out one request: pin, unpin or reload.
//
// Each loads the volume's bitmap from its file anew, changes it, writes it back, hands it to the
// cache driver and then warms the cache or releases ranges. Nothing is undone on failure: a request
// that fails on one of its files has changed neither file nor driver; one that fails later has
// changed what came before.
//
// Thread rule: called on the worker's thread, one request at a time, without the service lock.
#ifndef SERVICE_REQUEST_HANDLERS_H
#define SERVICE_REQUEST_HANDLERS_H

#include "bitmap/pin_bitmap.h"
#include "request/file_inode_list.h"
#include "request/request_record.h"

#include <vector>

const int handleDone = 0;
const int handleFailed = 1;      // after an error message
const int handleInterrupted = 2; // the volume became pending while its data was read

// The record's texts are NUL-terminated.
int HandleRequest(const RequestRecord *record);

// Marks the files, writes and sends the bitmap, reads the files through the cache.
int HandlePinRequest(const std::vector<FileInfo> &files, PinBitmap *bitmap, const char *mountPath,
                     const char *cachePath, const char *bitmapPath);

// Clears the files, writes and sends the bitmap, then releases the files' ranges.
int HandleUnpinRequest(const std::vector<FileInfo> &files, PinBitmap *bitmap, const char *mountPath,
                       const char *cachePath, const char *bitmapPath);

#endif
