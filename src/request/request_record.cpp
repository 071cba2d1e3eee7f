#include "request/request_record.h"

#include "base/log.h"

#include <cstdio>
#include <cstring>

namespace vesk {
namespace {
// In value order. "removePendigSpace" stands so in every configuration file there is.
const char *const kRequestTypeNames[] = {
    "unknown",         "pinFiles",          "unpinFiles",      "ack",
    "addPendingSpace", "removePendigSpace", "reloadPinBlocks",
};
const int kRequestTypeCount = sizeof(kRequestTypeNames) / sizeof(kRequestTypeNames[0]);
} // namespace

const char *RequestTypeToString(int type) {
    if (type < 0 || type >= kRequestTypeCount) {
        LogError("Convert request type to string errror");
        return nullptr;
    }
    return kRequestTypeNames[type];
}

const char *RequestTypeForLog(int type) {
    const char *name = RequestTypeToString(type);
    return name == nullptr ? "(null)" : name;
}

int StringToRequestType(const std::string &name) {
    for (int type = 0; type < kRequestTypeCount; ++type) {
        if (name == kRequestTypeNames[type]) {
            return type;
        }
    }
    return kRequestUnknown;
}

void RequestRecordComplete(RequestRecord *record, size_t received) {
    memset(reinterpret_cast<char *>(record) + received, 0, sizeof(*record) - received);
    record->mountPath[sizeof(record->mountPath) - 1] = '\0';
    record->data[sizeof(record->data) - 1] = '\0';
}

void RequestToString(std::string *out, const RequestRecord *record) {
    char text[1024];
    const int length = snprintf(text, sizeof(text), "Request type=%s mountPath=%s data=%s",
                                RequestTypeForLog(record->type), record->mountPath, record->data);
    out->assign(length < 0 ? "" : text);
}
} // namespace vesk
