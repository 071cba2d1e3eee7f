// The request record: what a client sends and what the worker hands to the handlers. It travels
// byte for byte in the queue message. Thread rule: no state.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace vesk {

const size_t kRequestMountPathBytes = 512;
const size_t kRequestDataBytes = 1024;

struct RequestRecord {
    int32_t type;                           // RequestType; whatever a sender put there
    char mountPath[kRequestMountPathBytes]; // NUL-terminated, also when it came from a queue
    // NUL-terminated. From a client: absolute paths joined by ";". From the configuration: the
    // file-inode list of request/file_inode_list.h.
    char data[kRequestDataBytes];
};
static_assert(sizeof(RequestRecord) == 1540, "the record is 1540 bytes on every platform");

// Sets `out` to "Request type=%s mountPath=%s data=%s", cut to 1023 characters; for log lines.
void RequestToString(std::string *out, const RequestRecord *record);

} // namespace vesk
