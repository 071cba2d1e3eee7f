// Telling the pin service that a volume is pending, or no longer.
//
// It is checked first that the volume's cache supports pinning; without it no queue is touched.
//
// Thread rule: for one-shot processes; any number of them may send at once.
#pragma once

namespace vesk {

// Would declare a space pending or not, but the queue it opens is not the one it sends to: after
// three seconds it always fails. Senders that need it write to the queue themselves. -1 after an
// error message.
int SetSpaceStateRequest(const char *mountPath, int requestType);

int AddPendingSpaceRequest(const char *mountPath);
int RemovePendingSpaceRequest(const char *mountPath);

} // namespace vesk
