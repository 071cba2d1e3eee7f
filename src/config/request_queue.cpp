#include "config/request_queue.h"

#include "base/log.h"
#include "config/config_document.h"
#include "config/json_array.h"
#include "request/file_inode_list.h"

#include <cstdint>
#include <cstdio>

namespace vesk {
namespace {
const int64_t kRequestNumberModulus = 2147483646;

// The number of the next request; the document's counter moves on.
int TakeRequestNumber(Json::Value &nextRequestNum) {
    const int number = nextRequestNum.asInt(); // 0 for null
    nextRequestNum = static_cast<int>((static_cast<int64_t>(number) + 1) % kRequestNumberModulus);
    return number;
}
} // namespace

int JsonAddRequest(Json::Value &root, const RequestRecord *record) {
    Json::Value &queue = root["requestQueue"];
    char number[1024];
    snprintf(number, sizeof(number), "%d", TakeRequestNumber(root["nextRequestNum"]));
    // The test looks at a boolean in the queue's place, so it never refuses a request: a number
    // comes again only after the counter has gone round, and such a request has always been
    // accepted.
    if (JsonArrayHasString(Json::Value(true), number)) {
        LogError("Should not find the element");
        return -1;
    }
    queue.append(number);

    const char *typeName = RequestTypeToString(record->type);
    if (typeName == nullptr) {
        return -1;
    }
    Json::Value &request = root["requests"][number];
    request["type"] = typeName;
    request["mountPath"] = record->mountPath;
    request["data"] = Json::Value();
    if (RequestHasFiles(record->type)) {
        char list[kRequestDataBytes] = {};
        if (AbsolutePathsToFileInodeList(record->mountPath, record->data, list, sizeof(list)) < 0) {
            LogError("Get relative paths failed");
            return -1;
        }
        request["data"] = list;
    }
    LogVerboseDocument("After request is added: jsConf:", root.toStyledString());
    return 0;
}

int ConfigAddRequest(const char *configPath, const RequestRecord *record) {
    const ServiceLockGuard lock;
    const auto add = [record](Json::Value &root) {
        return JsonAddRequest(root, record) < 0 ? "Can't add request to json" : nullptr;
    };
    return ConfigUpdate(configPath, MissingConfig::Created, add, LogHere());
}

int JsonRemoveRequest(Json::Value &root, const std::string &num) {
    LogVerbose("Remove request num = %s", num.c_str());
    Json::Value &queue = root["requestQueue"];
    if (queue.isNull()) {
        LogError("Can't read request queue");
        return -1;
    }
    if (JsonArrayRemoveString(queue, num) < 0) {
        LogError("Can't remove request num (%s) from request queue", num.c_str());
        return -1;
    }
    Json::Value &requests = root["requests"];
    if (!requests.isMember(num)) {
        LogError("Can't find request number (%s) in config", num.c_str());
        return -1;
    }
    Json::Value removed;
    requests.removeMember(num, &removed);
    if (removed.isNull()) {
        LogError("Remove request (%s) from requests failed", num.c_str());
        return -1;
    }
    return 0;
}

int ConfigGetJsonAndNumRequest(const char *configPath, Json::Value *root, int *count) {
    if (ConfigReadDocument(configPath, root) < 0) {
        return -1;
    }
    *count = static_cast<int>((*root)["requestQueue"].size());
    return 0;
}

int ConfigDropErrorRequest(const char *configPath, const RequestRecord * /*record*/,
                           const std::string &num) {
    const ServiceLockGuard lock;
    const auto remove = [&num](Json::Value &root) {
        return JsonRemoveRequest(root, num) < 0 ? "Can't remove request" : nullptr;
    };
    return ConfigUpdate(configPath, MissingConfig::IsAnError, remove, LogHere());
}
} // namespace vesk
