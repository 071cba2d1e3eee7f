#include "config/config_document.h"

#include "config/json_file.h"
#include "files/path.h"

#include <algorithm>

namespace vesk {
namespace {
bool IsText(const Json::Value &value) {
    return value.isConvertibleTo(Json::stringValue);
}

bool IsNullOrObject(const Json::Value &value) {
    return value.isNull() || value.isObject();
}

bool IsRequest(const Json::Value &request) {
    return request.isNull() || (request.isObject() && IsText(request["type"]) &&
                                IsText(request["mountPath"]) && IsText(request["data"]));
}

bool IsVolume(const Json::Value &volume) {
    return volume.isNull() || (volume.isObject() && IsNullOrObject(volume["files"]));
}

template <typename Test> bool AllMembers(const Json::Value &container, Test test) {
    return std::all_of(container.begin(), container.end(), test);
}
} // namespace

bool ConfigHasShape(const Json::Value &root) {
    if (!ConfigHasVolumesShape(root)) {
        return false;
    }
    const Json::Value &queue = root["requestQueue"];
    const Json::Value &requests = root["requests"];
    return root["nextRequestNum"].isConvertibleTo(Json::intValue) &&
           (queue.isNull() || queue.isArray()) && AllMembers(queue, IsText) &&
           IsNullOrObject(requests) && AllMembers(requests, IsRequest);
}

bool ConfigHasVolumesShape(const Json::Value &root) {
    return IsNullOrObject(root) && IsNullOrObject(root["volumes"]) &&
           AllMembers(root["volumes"], IsVolume);
}

int ConfigReadDocument(const char *configPath, Json::Value *root, ConfigShape hasShape) {
    if (ReadFileToJson(configPath, root) < 0) {
        return -1;
    }
    return hasShape(*root) ? 0 : -1;
}

int ConfigUpdate(const char *configPath, MissingConfig missing, const ConfigChange &change,
                 const LogPlace &place, ConfigShape hasShape) {
    const bool creates = missing == MissingConfig::Created;
    // A file that cannot be looked up is not taken for a missing one: writing a new document over
    // it would lose every record.
    const bool absent = creates ? PathIsMissing(configPath) == 1 : PathExists(configPath) == 0;
    if (absent && missing == MissingConfig::Skipped) {
        LogVerboseAt(place, "No config file (%s), skip it", configPath);
        return 0;
    }
    if (absent && !creates) {
        LogErrorAt(place, "Can't find config file (%s)", configPath);
        return -1;
    }
    Json::Value root;
    if (!absent && ConfigReadDocument(configPath, &root, hasShape) < 0) {
        LogErrorAt(place, "Can't read data from config file (%s)", configPath);
        return -1;
    }
    const char *failure = change(root);
    if (failure == nullptr) {
        return ConfigWrite(root, configPath, missing, place);
    }
    if (failure[0] == '\0') {
        return 0;
    }
    LogErrorAt(place, "%s", failure);
    return -1;
}

int ConfigWrite(const Json::Value &root, const char *configPath, MissingConfig missing,
                const LogPlace &place) {
    if (WriteJsonToFile(root, configPath) == 0) {
        return 0;
    }
    if (missing == MissingConfig::Created) {
        LogErrorAt(place, "Can't write to files");
    } else {
        LogErrorAt(place, "Write json data to config (%s) failed", configPath);
    }
    return -1;
}
} // namespace vesk
