// The message of a client command to the pin service.
// Thread rule: no state.
#ifndef COMMANDS_CLIENT_MESSAGE_H
#define COMMANDS_CLIENT_MESSAGE_H

#include "base/log.h"

// Sends a request of this type for the volume, with `files` as its data unless null. A text that
// fills its field has no NUL there. 0, or -1 after an error message at the caller's place.
int SendRequest(int queueId, int requestType, const char *mountPath, const char *files,
                const LogPlace &place);

#endif
