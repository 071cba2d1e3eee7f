#include "commands/client_requests.h"

#include "base/log.h"
#include "request/message_queue.h"
#include "request/request_type.h"
#include "request/tool_parameters.h"
#include "space/space_cache.h"

#include <cerrno>
#include <cstring>

namespace {

// Copies text into a field of the message; a text that fills the field has no NUL there.
template <size_t size> void CopyToField(char (&field)[size], const char *text) {
    memcpy(field, text, strnlen(text, size));
}

RequestMessage BuildMessage(int requestType, const char *mountPath) {
    RequestMessage message{};
    message.messageType = requestMessageType;
    message.record.type = requestType;
    CopyToField(message.record.mountPath, mountPath);
    return message;
}

bool IsFilesRequest(int requestType) {
    return requestType == requestPinFiles || requestType == requestUnpinFiles;
}

} // namespace

int HandleFilesByRequestType(const ToolParameters *parameters, int requestType) {
    LogTraceScope();
    if (!IsFilesRequest(requestType) && requestType != requestReloadPinBlocks) {
        LogError("Unhandle request type = %s", RequestTypeForLog(requestType));
        return -1;
    }
    if (!SpaceHasCacheAndSupportPin(parameters->mountPath)) {
        LogError("Volume (%s) doesn't support pin", parameters->mountPath);
        return -1;
    }
    const int queueId = MsgQueueGet(messageKeyFile);
    if (queueId == -1) {
        LogError("Can't get server messsage queue: %s", strerror(errno));
        return -1;
    }
    LogVerbose("Server mesage queue id = %d", queueId);
    RequestMessage message = BuildMessage(requestType, parameters->mountPath);
    if (IsFilesRequest(requestType)) {
        CopyToField(message.record.data, parameters->files);
    }
    if (MsgQueueSend(queueId, &message, requestMessageBytes) == -1) {
        LogError("Send message failed: %s", strerror(errno));
        return -1;
    }
    return 0;
}

int SetSpaceStateRequest(const char *mountPath, int requestType) {
    LogTraceScope();
    if (!SpaceHasCacheAndSupportPin(mountPath)) {
        LogError("Volume (%s) doesn't support pin", mountPath);
        return -1;
    }
    if (requestType != requestAddPendingSpace && requestType != requestRemovePendigSpace) {
        LogError("Unhandle request type = %s", RequestTypeForLog(requestType));
        return -1;
    }
    // The identifier is not taken from the call, which only makes sure that there is a queue: these
    // commands must not reach the service, and callers count on their failure. So the call's own
    // failure does not matter either, and its message is never written.
    const int queueId = -1;
    const bool queueMatters = false;
    if (MsgQueueGet(messageKeyFile) == -1 && queueMatters) {
        LogError("Can't open server messsage queue: %s", strerror(errno));
        return -1;
    }
    LogVerbose("Get server message queue id = %d", queueId);
    const RequestMessage message = BuildMessage(requestType, mountPath);
    if (MsgQueueSend(queueId, &message, requestMessageBytes) == -1) {
        LogError("Send message failed: %s", strerror(errno));
        return -1;
    }
    return 0;
}

int PinFilesRequest(const ToolParameters *parameters) {
    return HandleFilesByRequestType(parameters, requestPinFiles);
}

int UnpinFilesRequest(const ToolParameters *parameters) {
    return HandleFilesByRequestType(parameters, requestUnpinFiles);
}

int ReloadPinBlocksRequest(const ToolParameters *parameters) {
    return HandleFilesByRequestType(parameters, requestReloadPinBlocks);
}

int AddPendingSpaceRequest(const char *mountPath) {
    return SetSpaceStateRequest(mountPath, requestAddPendingSpace);
}

int RemovePendingSpaceRequest(const char *mountPath) {
    return SetSpaceStateRequest(mountPath, requestRemovePendigSpace);
}
