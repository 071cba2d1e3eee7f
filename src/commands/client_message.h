// The message of a client command to the pin service.
// Thread rule: no state.
#pragma once

#include "base/log.h"

namespace vesk {

// Sends a request of this type for the volume, with `files` as its data unless null. A text that
// fills its field has no NUL there. 0, or -1 after an error message at the caller's place.
int SendRequest(int queueId, int requestType, const char *mountPath, const char *files,
                const LogPlace &place);

} // namespace vesk
