// Choosing the next request to carry out.
//
// The oldest runnable request wins. Requests of pending spaces are passed over but keep their
// place, and so are those of volumes with a request that was put off; requests of volumes whose
// cache is gone are removed on the way, with the volume's pinned-file records.
//
// Locks: holds the service lock throughout, except while it waits.
#pragma once

#include "request/request_record.h"
#include "service/put_off.h"
#include "state/service_state.h"

#include <string>

namespace vesk {
enum class NextRequest : int {
    None = 0,  // requests are queued, none may run now
    Taken = 2, // a request was taken; it stays in the file until it is done
    Error = 3, // after an error message; the file is as it was
};

// Fills `*out` and `*num` when a request was taken. `*out` must be zeroed. Blocks, without a time
// limit, while the file is missing or the queue is empty.
NextRequest ConfigParseAndGetNextAvailableRequest(const char *configPath, RequestRecord *out,
                                                  std::string *num,
                                                  const PutOffRequests &putOff = {})
    NEEDS_NO_LOCK(serviceLock);
} // namespace vesk
