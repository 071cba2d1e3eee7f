// Asking the pin service to pin, unpin or warm: one message to its queue, no answer.
//
// It is checked first that the volume's cache supports pinning; without it no queue is touched.
//
// Thread rule: for one-shot processes; any number of them may send at once.
#pragma once

namespace vesk {

struct ToolParameters;

// Queues a pin, unpin or reload request (RequestType). 0, or -1 after an error message.
int HandleFilesByRequestType(const ToolParameters *parameters, int requestType);

int PinFilesRequest(const ToolParameters *parameters);
int UnpinFilesRequest(const ToolParameters *parameters);
int ReloadPinBlocksRequest(const ToolParameters *parameters);

} // namespace vesk
