#include "service/start_service.h"

#include "base/log.h"
#include "files/file_leftovers.h"
#include "request/tool_parameters.h"
#include "service/receiver.h"
#include "service/request_worker.h"
#include "service/signal_handler.h"
#include "state/service_state.h"

#include <cerrno>
#include <cstring>
#include <pthread.h>

namespace vesk {
int StartService(const ToolParameters *parameters) {
    LogTraceEntry();
    // While signals still end the process by themselves: a folder can be large, or hang.
    FileRemoveLeftovers(parameters->configPath);
    if (SetSignalHandler() < 0) {
        LogError("Can't get signal handler");
        LogTraceExit();
        return -1;
    }
    if (ServiceStateInitialize() != 0) {
        LogError("Initialize mutex failed");
        LogTraceExit();
        return -1;
    }
    SetServiceThreads(2);
    pthread_t worker{};
    if (pthread_create(&worker, nullptr, DoRequests, const_cast<ToolParameters *>(parameters)) !=
        0) {
        LogError("Can't create thread: %s", strerror(errno));
        LogTraceExit();
        return -1;
    }
    pthread_setname_np(worker, kWorkerThreadName);
    StartSignalThread();
    GetRequests(parameters->configPath);
}
} // namespace vesk
