#include "config/config_document.h"

#include "config/json_file.h"
#include "files/path.h"

#include <algorithm>

namespace vesk {

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

int ConfigUpdate(const char *configPath, MissingConfig missing, const ConfigChange &change,
                 const LogPlace &place) {
    const bool creates = missing == MissingConfig::Created;
    // A file that cannot be looked up is not taken for a missing one: writing a new document over
    // it would lose every record.
    const bool absent = creates ? PathIsMissing(configPath) == 1 : PathExists(configPath) == 0;
    if (absent && missing == MissingConfig::Skipped) {
        LogWrite(LogClass::Verbose, place, "No config file (%s), skip it", configPath);
        return 0;
    }
    if (absent && !creates) {
        LogWrite(LogClass::Error, place, "Can't find config file (%s)", configPath);
        return -1;
    }
    Json::Value root;
    if (!absent && ConfigReadDocument(configPath, &root) < 0) {
        LogWrite(LogClass::Error, place, "Can't read data from config file (%s)", configPath);
        return -1;
    }
    const char *failure = change(root);
    if (failure == nullptr) {
        return ConfigWrite(root, configPath, missing, place);
    }
    if (failure[0] == '\0') {
        return 0;
    }
    LogWrite(LogClass::Error, place, "%s", failure);
    return -1;
}

int ConfigWrite(const Json::Value &root, const char *configPath, MissingConfig missing,
                const LogPlace &place) {
    if (WriteJsonToFile(root, configPath) == 0) {
        return 0;
    }
    if (missing == MissingConfig::Created) {
        LogWrite(LogClass::Error, place, "Can't write to files");
    } else {
        LogWrite(LogClass::Error, place, "Write json data to config (%s) failed", configPath);
    }
    return -1;
}

} // namespace vesk
