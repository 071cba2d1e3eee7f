#include "service/next_request.h"

#include "base/log.h"
#include "config/config_document.h"
#include "config/request_queue.h"
#include "files/path.h"
#include "space/space_cache.h"

#include <cstdio>
#include <vector>

namespace vesk {
namespace {
// Copies text into a field, cut so that a NUL ends it.
template <size_t size> void CopyText(char (&field)[size], const std::string &text) {
    snprintf(field, size, "%s", text.c_str());
}

// Blocks while the file is missing or the queue is empty. 0, or -1 after an error message.
int WaitForQueuedRequest(const char *configPath, Json::Value *root, const LogPlace &place)
    NEEDS_LOCK(serviceLock) {
    for (;;) {
        int count = 0;
        if (!PathExists(configPath)) {
            LogVerboseAt(place, "Config doesn't exist");
        } else if (ConfigGetJsonAndNumRequest(configPath, root, &count) < 0) {
            LogErrorAt(place, "Get request from config file (%s) error", configPath);
            return -1;
        }
        if (count > 0) {
            return 0;
        }
        LogVerboseAt(place, "Go to block mode");
        ServiceWaitForRequest();
        LogVerboseAt(place, "Wake up");
    }
}

// Removes the requests and writes the document. 0, or -1 after an error message.
int DropRequests(const std::vector<std::string> &numbers, Json::Value &root, const char *configPath,
                 const LogPlace &place) {
    for (const std::string &number : numbers) {
        if (JsonRemoveRequest(root, number) < 0) {
            LogErrorAt(place, "Can't remove request (%s)", number.c_str());
            return -1;
        }
        LogVerboseAt(place, "Remove request (%s)", number.c_str());
    }
    if (ConfigWrite(root, configPath, MissingConfig::Created, place) < 0) {
        return -1;
    }
    LogNoticeAt(place, "Drop requests finish");
    return 0;
}
} // namespace

NextRequest ConfigParseAndGetNextAvailableRequest(const char *configPath, RequestRecord *out,
                                                  std::string *num, const PutOffRequests &putOff) {
    const ServiceLockGuard lock;
    Json::Value root;
    if (WaitForQueuedRequest(configPath, &root, LogHere()) < 0) {
        return NextRequest::Error;
    }
    bool found = false;
    std::vector<std::string> dropped;
    Json::Value &requests = root["requests"];
    for (const Json::Value &element : root["requestQueue"]) {
        const std::string number = element.asString();
        if (!requests.isMember(number) || requests[number].isNull()) {
            LogError("Can't find request number (%s) in config", number.c_str());
            return NextRequest::Error;
        }
        const Json::Value &request = requests[number];
        char mountPath[1024];
        CopyText(mountPath, request["mountPath"].asString());
        if (!SpaceHasCacheAndSupportPin(mountPath)) {
            // The request can never run. The pending test looks at the record that is still to be
            // filled, so it concerns the empty path and leaves the pending spaces' own entries
            // alone.
            if (ServiceIsPendingSpace(out->mountPath)) {
                if (ServiceRemovePendingSpaceLocked(out->mountPath) < 0) {
                    LogError("Can't remove space from pending list");
                    return NextRequest::Error;
                }
                LogVerbose("Remove space (%s) from pending list", mountPath);
            }
            if (root.isMember("volumes") && root["volumes"].isMember(mountPath)) {
                root["volumes"].removeMember(mountPath);
                LogVerbose("Delete the volume (%s) from config", mountPath);
            }
            dropped.push_back(number);
            continue;
        }
        if (ServiceIsPendingSpace(mountPath)) {
            LogVerbose("Request num (%s) volume (%s) is pending", number.c_str(), mountPath);
            continue;
        }
        if (PutOffPasses(putOff, mountPath)) {
            continue;
        }
        out->type = StringToRequestType(request["type"].asString());
        if (out->type == kRequestUnknown) {
            LogError("Can't get correct request type");
            return NextRequest::Error;
        }
        CopyText(out->mountPath, mountPath);
        CopyText(out->data, request["data"].asString());
        LogVerbose("Get request (request num = %s type = %s data = %s", number.c_str(),
                   RequestTypeToString(out->type), out->data);
        *num = number;
        found = true;
        break;
    }
    if (!dropped.empty() && DropRequests(dropped, root, configPath, LogHere()) < 0) {
        return NextRequest::Error;
    }
    return found ? NextRequest::Taken : NextRequest::None;
}
} // namespace vesk
