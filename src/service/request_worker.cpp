#include "service/request_worker.h"

#include "base/log.h"
#include "config/pinned_files.h"
#include "config/request_queue.h"
#include "request/tool_parameters.h"
#include "service/next_request.h"
#include "service/put_off.h"
#include "service/request_handlers.h"
#include "service/signal_handler.h"

#include <exception>
#include <pthread.h>
#include <unistd.h>

namespace vesk {
namespace {
void DropFailedRequest(const char *configPath, const RequestRecord *record, const std::string &num,
                       const char *typeName) {
    const LogPlace place{"HandleRequestAndModifyConfig", __LINE__};
    LogErrorAt(place, "Handle request error (num = %s, type = %s), drop it.", num.c_str(),
               typeName);
    if (ConfigDropErrorRequest(configPath, record, num) < 0) {
        LogErrorAt(place, "Can't drop request");
    }
}

// Where memory is short the request is put off, which the caller is told by the exception, or given
// up.
WorkResult HandleOrPutOff(const char *configPath, RequestRecord *record, const std::string &num,
                          PutOffRequests *putOff) {
    WorkResult result = WorkResult::Failed;
    try {
        result = HandleRequestAndModifyConfig(configPath, record, num);
    } catch (const std::exception &) {
        if (PutOffNote(putOff, num, record->mountPath)) {
            throw;
        }
        DropFailedRequest(configPath, record, num, RequestTypeForLog(record->type));
    }
    PutOffForget(putOff, num);
    return result;
}

// Chooses one request and has it carried out. False when the choice has failed.
bool DoNextRequest(const char *configPath, PutOffRequests *putOff, const LogPlace &place) {
    RequestRecord record{};
    std::string num;
    const NextRequest next =
        ConfigParseAndGetNextAvailableRequest(configPath, &record, &num, *putOff);
    if (next == NextRequest::Error) {
        return false;
    }
    if (next == NextRequest::None) {
        PutOffEnd(putOff);
    }
    if (next == NextRequest::Taken) {
        const WorkResult result = HandleOrPutOff(configPath, &record, num, putOff);
        if (result == WorkResult::Failed) {
            return true;
        }
        const char *typeName = RequestTypeToString(record.type);
        if (result == WorkResult::Interrupted) {
            LogNoticeAt(place, "Handle request (%s). Get interrupted !", num.c_str());
        } else if (RequestHasFiles(record.type)) {
            LogNoticeAt(place, "Handle request (type=%s files=%s) OK ", typeName, record.data);
        } else {
            LogNoticeAt(place, "Handle request (type=%s) OK ", typeName);
        }
    }
    // Also what makes a held-back request run: the end of a pending state signals nothing.
    sleep(1);
    return true;
}
} // namespace

void *DoRequests(void *options) {
    {
        LogTraceScope();
        const char *configPath = static_cast<const ToolParameters *>(options)->configPath;
        PutOffRequests putOff;
        bool choosing = true;
        while (choosing) {
            try {
                choosing = DoNextRequest(configPath, &putOff, LogHere());
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

WorkResult HandleRequestAndModifyConfig(const char *configPath, RequestRecord *record,
                                        const std::string &num) {
    const char *typeName = RequestTypeForLog(record->type);
    LogVerbose("Handle request (num = %s)", num.c_str());
    const WorkResult result = HandleRequest(record);
    switch (result) {
    case WorkResult::Done:
        if (ConfigUpdatedByFinishedRequest(configPath, record, num) < 0) {
            LogError("Can't remove request (%s) from config file", num.c_str());
        }
        break;
    case WorkResult::Failed: DropFailedRequest(configPath, record, num, typeName); break;
    case WorkResult::Interrupted:
        LogVerbose("Handle request interruped (num = %s, type = %s)", num.c_str(), typeName);
        break;
    }
    return result;
}
} // namespace vesk
