#include "service/next_request.h"

#include "base/log.h"
#include "config/json_file.h"
#include "config/request_queue.h"
#include "files/path.h"
#include "request/request_type.h"
#include "space/space_cache.h"
#include "state/service_state.h"

#include <cstdio>
#include <cstring>
#include <vector>

namespace {

// Copies text into a field, cut so that a NUL ends it.
template <size_t size> void CopyText(char (&field)[size], const std::string &text) {
    snprintf(field, size, "%s", text.c_str());
}

} // namespace

NextRequest ConfigParseAndGetNextAvailableRequest(const char *configPath, RequestRecord *out,
                                                  std::string *num) {
    const ServiceLockGuard lock;
    Json::Value root;
    for (;;) {
        int count = 0;
        if (!PathExists(configPath)) {
            LogVerbose("Config doesn't exist");
        } else if (ConfigGetJsonAndNumRequest(configPath, &root, &count) < 0) {
            LogError("Get request from config file (%s) error", configPath);
            return NextRequest::Error;
        }
        if (count > 0) {
            break;
        }
        LogVerbose("Go to block mode");
        ServiceWaitForRequest();
        LogVerbose("Wake up");
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
        out->type = StringToRequestType(request["type"].asString());
        if (out->type == requestUnknown) {
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

    if (!dropped.empty()) {
        for (const std::string &number : dropped) {
            if (JsonRemoveRequest(root, number) < 0) {
                LogError("Can't remove request (%s)", number.c_str());
                return NextRequest::Error;
            }
            LogVerbose("Remove request (%s)", number.c_str());
        }
        if (WriteJsonToFile(root, configPath) < 0) {
            LogError("Can't write to files");
            return NextRequest::Error;
        }
        LogNotice("Drop requests finish");
    }
    return found ? NextRequest::Taken : NextRequest::None;
}
