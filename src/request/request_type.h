// The kinds of request. The value travels in the queue message, the name stands in the
// configuration file. Thread rule: no state.
#pragma once

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

// The first type of this name, compared exactly; kRequestUnknown when there is none.
int StringToRequestType(const std::string &name);

} // namespace vesk
