// The files of one request, and its two forms: what travels and what the service stores.
//
// Thread rule: no state.
#pragma once

#include "request/request_fill.h"
#include "request/request_record.h"

#include <cstdint>
#include <string>
#include <vector>

namespace vesk {
struct BatchFile {
    std::string relativePath; // below the volume
    uint32_t inode;           // the low 32 bits
    uint64_t bytes;           // its size and
    uint64_t blocks;          // its blocks when it was looked at
};

struct RequestBatch {
    std::string mountPath;
    RequestType type = kRequestPinFiles;
    std::vector<BatchFile> files;
    RequestFill fill;
    bool mayBeLost = false; // the receiver that took it has ended
};

// False, with nothing added: the request has no room for it.
bool BatchAdd(RequestBatch *batch, const BatchFile &file);

// Absolute paths joined by ";", as clients send them.
std::string BatchPaths(const RequestBatch &batch);

// The file-inode list that the receiver makes of them.
std::string BatchStored(const RequestBatch &batch);
} // namespace vesk
