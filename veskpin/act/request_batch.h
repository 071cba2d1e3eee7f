// The files of one request, and its two forms: what travels and what the service stores.
//
// Thread rule: no state.
#pragma once

#include "model/file_look.h"
#include "request/request_fill.h"
#include "request/request_record.h"

#include <cstdint>
#include <string>
#include <vector>

namespace vesk {
struct BatchFile {
    std::string relativePath; // below the volume
    uint32_t inode;           // the low 32 bits
    uint64_t bytes;           // its size,
    uint64_t blocks;          // its blocks of 64 KiB, and
    uint64_t sectors;         // what it has on the device when it was looked at
};

struct RequestBatch {
    std::string mountPath;
    RequestType type = kRequestPinFiles;
    std::vector<BatchFile> files;
    RequestFill fill;
    bool mayBeLost = false; // the receiver that took it has ended
    bool isSettled = false; // it was never sent: its files were as asked before
};

// False, with nothing added: the request has no room for it.
bool BatchAdd(RequestBatch *batch, const BatchFile &file);

// Absolute paths joined by ";", as clients send them.
std::string BatchPaths(const RequestBatch &batch);

// Whether a stored file-inode list names the same paths. The inodes are those that the receiver has
// seen: a file may have been replaced since it was looked at.
bool BatchIsStoredAs(const RequestBatch &batch, const std::string &data);

// The file at this path of a look.
BatchFile BatchFileOf(const std::string &relativePath, const FileLook &look);
} // namespace vesk
