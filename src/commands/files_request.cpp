#include "commands/commands.h"

#include "base/log.h"
#include "request/message_queue.h"
#include "request/request_record.h"
#include "request/tool_parameters.h"
#include "space/space_cache.h"

#include <cerrno>
#include <cstring>

namespace vesk {
int HandleFilesByRequestType(const ToolParameters *parameters, int requestType) {
    LogTraceScope();
    if (!RequestHasFiles(requestType) && requestType != kRequestReloadPinBlocks) {
        LogError("Unhandle request type = %s", RequestTypeForLog(requestType));
        return -1;
    }
    if (!SpaceHasCacheAndSupportPin(parameters->mountPath)) {
        LogError("Volume (%s) doesn't support pin", parameters->mountPath);
        return -1;
    }
    const int queueId = MsgQueueGet(kMessageKeyFile);
    if (queueId == -1) {
        LogError("Can't get server messsage queue: %s", strerror(errno));
        return -1;
    }
    LogVerbose("Server mesage queue id = %d", queueId);
    const char *files = RequestHasFiles(requestType) ? parameters->files : nullptr;
    return SendRequest(queueId, requestType, parameters->mountPath, files, LogHere());
}

int PinFilesRequest(const ToolParameters *parameters) {
    return HandleFilesByRequestType(parameters, kRequestPinFiles);
}

int UnpinFilesRequest(const ToolParameters *parameters) {
    return HandleFilesByRequestType(parameters, kRequestUnpinFiles);
}

int ReloadPinBlocksRequest(const ToolParameters *parameters) {
    return HandleFilesByRequestType(parameters, kRequestReloadPinBlocks);
}
} // namespace vesk
