#include "config/config_document.h"

#include "config/json_file.h"

#include <algorithm>

namespace {

bool IsText(const Json::Value &value) {
    return value.isConvertibleTo(Json::stringValue);
}

bool IsRequest(const Json::Value &request) {
    if (request.isNull()) {
        return true;
    }
    return request.isObject() && IsText(request["type"]) && IsText(request["mountPath"]) &&
           IsText(request["data"]);
}

bool IsVolume(const Json::Value &volume) {
    if (volume.isNull()) {
        return true;
    }
    return volume.isObject() && (volume["files"].isNull() || volume["files"].isObject());
}

template <typename Test> bool AllMembers(const Json::Value &container, Test test) {
    return std::all_of(container.begin(), container.end(), test);
}

bool IsNullOrObject(const Json::Value &value) {
    return value.isNull() || value.isObject();
}

} // namespace

bool ConfigHasShape(const Json::Value &root) {
    if (!IsNullOrObject(root)) {
        return false;
    }
    const Json::Value &queue = root["requestQueue"];
    const Json::Value &requests = root["requests"];
    const Json::Value &volumes = root["volumes"];
    return root["nextRequestNum"].isConvertibleTo(Json::intValue) &&
           (queue.isNull() || queue.isArray()) && AllMembers(queue, IsText) &&
           IsNullOrObject(requests) && AllMembers(requests, IsRequest) && IsNullOrObject(volumes) &&
           AllMembers(volumes, IsVolume);
}

int ConfigReadDocument(const char *configPath, Json::Value *root) {
    if (ReadFileToJson(configPath, root) < 0) {
        return -1;
    }
    return ConfigHasShape(*root) ? 0 : -1;
}
