// The client side of the pin service: one message to its queue, no answer.
//
// Each checks first that the volume's cache supports pinning; without it no queue is touched.
//
// Thread rule: for one-shot processes; any number of them may send at once.
#ifndef COMMANDS_CLIENT_REQUESTS_H
#define COMMANDS_CLIENT_REQUESTS_H

struct ToolParameters;

// Queues a pin, unpin or reload request (RequestType). 0, or -1 after an error message.
int HandleFilesByRequestType(const ToolParameters *parameters, int requestType);

// Would declare a space pending or not, but the queue it opens is not the one it sends to: after
// three seconds it always fails. Senders that need it write to the queue themselves. -1 after an
// error message.
int SetSpaceStateRequest(const char *mountPath, int requestType);

int PinFilesRequest(const ToolParameters *parameters);
int UnpinFilesRequest(const ToolParameters *parameters);
int ReloadPinBlocksRequest(const ToolParameters *parameters);
int AddPendingSpaceRequest(const char *mountPath);
int RemovePendingSpaceRequest(const char *mountPath);

#endif
