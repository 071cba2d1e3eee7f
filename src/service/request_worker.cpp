#include "service/request_worker.h"

#include "base/log.h"
#include "config/pinned_files.h"
#include "config/request_queue.h"
#include "request/request_type.h"
#include "request/tool_parameters.h"
#include "service/next_request.h"
#include "service/request_handlers.h"
#include "service/signal_handler.h"

#include <exception>
#include <pthread.h>
#include <unistd.h>

void *DoRequests(void *options) {
    {
        LogTraceScope();
        const char *configPath = static_cast<const ToolParameters *>(options)->configPath;
        for (;;) {
            try {
                RequestRecord record{};
                std::string num;
                const int taken = ConfigParseAndGetNextAvailableRequest(configPath, &record, &num);
                if (taken == nextRequestError) {
                    break;
                }
                if (taken != nextRequestTaken) {
                    sleep(1);
                    continue;
                }
                const int handled = HandleRequestAndModifyConfig(configPath, &record, num);
                if (handled == handleFailed) {
                    continue;
                }
                if (handled == handleInterrupted) {
                    LogNotice("Handle request (%s). Get interrupted !", num.c_str());
                } else if (record.type == requestPinFiles || record.type == requestUnpinFiles) {
                    LogNotice("Handle request (type=%s files=%s) OK ",
                              RequestTypeToString(record.type), record.data);
                } else {
                    LogNotice("Handle request (type=%s) OK ", RequestTypeToString(record.type));
                }
                // Also what makes a held-back request run: the end of a pending state signals
                // nothing.
                sleep(1);
            } catch (const std::exception &error) {
                // Memory is short. Whatever was going on, the request is still queued.
                LogError("Request is put off: %s", error.what());
                sleep(1);
            }
        }
        LogError("Get request error");
    }
    ServiceThreadEnds();
    pthread_exit(nullptr);
}

int HandleRequestAndModifyConfig(const char *configPath, RequestRecord *record,
                                 const std::string &num) {
    const char *typeName = RequestTypeForLog(record->type);
    LogVerbose("Handle request (num = %s)", num.c_str());
    switch (HandleRequest(record)) {
    case handleDone:
        if (ConfigUpdatedByFinishedRequest(configPath, record, num) < 0) {
            LogError("Can't remove request (%s) from config file", num.c_str());
        }
        return handleDone;
    case handleFailed:
        LogError("Handle request error (num = %s, type = %s), drop it.", num.c_str(), typeName);
        if (ConfigDropErrorRequest(configPath, record, num) < 0) {
            LogError("Can't drop request");
        }
        return handleFailed;
    case handleInterrupted:
        LogVerbose("Handle request interruped (num = %s, type = %s)", num.c_str(), typeName);
        return handleInterrupted;
    default: // none of the above: the request stays and is taken again
        return handleDone;
    }
}
