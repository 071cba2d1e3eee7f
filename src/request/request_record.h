// The request record: what a client sends and what the worker hands to the handlers. It travels
// byte for byte in the queue message; the name of its type stands in the configuration file. Thread
// rule: no state.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace vesk {
enum RequestType : int32_t {
    kRequestUnknown = 0,
    kRequestPinFiles = 1,
    kRequestUnpinFiles = 2,
    kRequestAck = 3,
    kRequestAddPendingSpace = 4,
    kRequestRemovePendigSpace = 5,
    kRequestReloadPinBlocks = 6,
};

// The type's name; null after an error message for a value outside 0 to 6.
const char *RequestTypeToString(int type);

// The same for log lines: "(null)" where there is no name, so that no null is ever printed.
const char *RequestTypeForLog(int type);

// Whether requests of this type are about certain files.
inline bool RequestHasFiles(int type) {
    return type == kRequestPinFiles || type == kRequestUnpinFiles;
}

// The first type of this name, compared exactly; kRequestUnknown when there is none.
int StringToRequestType(const std::string &name);

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

// Makes of `received` bytes of a message a record: whoever may write to the queue fills it. What a
// short message left of the one before is cleared, and the texts end inside their fields.
void RequestRecordComplete(RequestRecord *record, size_t received);

// Sets `out` to "Request type=%s mountPath=%s data=%s", cut to 1023 characters; for log lines.
void RequestToString(std::string *out, const RequestRecord *record);
} // namespace vesk
