#include "request/request_type.h"

#include "base/log.h"

namespace {

// In value order. "removePendigSpace" stands so in every configuration file there is.
const char *const requestTypeNames[] = {
    "unknown",         "pinFiles",          "unpinFiles",      "ack",
    "addPendingSpace", "removePendigSpace", "reloadPinBlocks",
};
const int requestTypeCount = sizeof(requestTypeNames) / sizeof(requestTypeNames[0]);

} // namespace

const char *RequestTypeToString(int type) {
    if (type < 0 || type >= requestTypeCount) {
        LogError("Convert request type to string errror");
        return nullptr;
    }
    return requestTypeNames[type];
}

const char *RequestTypeForLog(int type) {
    const char *name = RequestTypeToString(type);
    return name == nullptr ? "(null)" : name;
}

int StringToRequestType(const std::string &name) {
    for (int type = 0; type < requestTypeCount; ++type) {
        if (name == requestTypeNames[type]) {
            return type;
        }
    }
    return requestUnknown;
}
