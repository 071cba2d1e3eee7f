// The kinds of request. The value travels in the queue message, the name stands in the
// configuration file. Thread rule: no state.
#ifndef REQUEST_REQUEST_TYPE_H
#define REQUEST_REQUEST_TYPE_H

#include <cstdint>
#include <string>

enum RequestType : int32_t {
    requestUnknown = 0,
    requestPinFiles = 1,
    requestUnpinFiles = 2,
    requestAck = 3,
    requestAddPendingSpace = 4,
    requestRemovePendigSpace = 5,
    requestReloadPinBlocks = 6,
};

// The type's name; null after an error message for a value outside 0 to 6.
const char *RequestTypeToString(int type);

// The same for log lines: "(null)" where there is no name, so that no null is ever printed.
const char *RequestTypeForLog(int type);

// The first type of this name, compared exactly; requestUnknown when there is none.
int StringToRequestType(const std::string &name);

#endif
