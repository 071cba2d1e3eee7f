#include "config/config_records.h"

#include "base/log.h"
#include "config/json_file.h"
#include "files/path.h"
#include "request/request_record.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <set>

namespace vesk {
namespace {
using Problems = std::vector<std::string>;

// A member that must be of this type, or null where it is absent or of another one, which clears
// `*isKnown`.
const Json::Value &Member(const Json::Value &object, const char *name, Json::ValueType type,
                          const std::string &place, bool *isKnown, Problems *problems) {
    const Json::Value &member = object[name];
    if (member.isNull() || member.type() == type) {
        return member;
    }
    *isKnown = false;
    problems->push_back(place + "\"" + name + "\" has another type than it should have");
    return Json::Value::nullSingleton();
}

// A decimal number of 32 bits, nothing else.
bool ParseInode(const std::string &text, uint32_t *inode) {
    if (text.empty() || text.find_first_not_of("0123456789") != std::string::npos) {
        return false;
    }
    errno = 0;
    const unsigned long long number = strtoull(text.c_str(), nullptr, 10);
    *inode = static_cast<uint32_t>(number);
    return errno == 0 && number <= UINT32_MAX;
}

bool TextOf(const Json::Value &value, std::string *text) {
    if (!value.isConvertibleTo(Json::stringValue) || value.isNull()) {
        return false;
    }
    *text = value.asString();
    return true;
}

RecordedVolume VolumeOf(const std::string &mountPath, const Json::Value &value,
                        Problems *problems) {
    RecordedVolume volume;
    volume.mountPath = mountPath;
    const std::string place = "volume " + mountPath + ": ";
    const Json::Value &files =
        Member(value, "files", Json::objectValue, place, &volume.areFilesKnown, problems);
    volume.files.reserve(files.size());
    for (auto file = files.begin(); file != files.end(); ++file) {
        RecordedFile record{};
        if (!ParseInode(file.name(), &record.inode) || !TextOf(*file, &record.relativePath) ||
            record.relativePath.empty() || record.relativePath.find('\0') != std::string::npos) {
            problems->push_back(place + "record \"" + file.name() + "\" names no file");
            volume.isWhole = false;
            continue;
        }
        volume.files.push_back(std::move(record));
    }
    volume.isWhole = volume.isWhole && volume.areFilesKnown;
    std::sort(volume.files.begin(), volume.files.end(),
              [](const RecordedFile &a, const RecordedFile &b) {
                  return a.relativePath != b.relativePath ? a.relativePath < b.relativePath
                                                          : a.inode < b.inode;
              });
    return volume;
}

bool RequestOf(const Json::Value &value, StoredRequest *request) {
    std::string typeName;
    if (!value.isObject() || !TextOf(value["type"], &typeName) ||
        !TextOf(value["mountPath"], &request->mountPath)) {
        return false;
    }
    request->type = StringToRequestType(typeName);
    if (request->type == kRequestUnknown) {
        return false;
    }
    return TextOf(value["data"], &request->data) || !RequestHasFiles(request->type);
}

void AddVolumes(const Json::Value &volumes, ConfigRecords *records) {
    for (auto volume = volumes.begin(); volume != volumes.end(); ++volume) {
        if (volume->isObject()) {
            records->volumes.push_back(VolumeOf(volume.name(), *volume, &records->problems));
        } else if (!volume->isNull()) {
            records->problems.push_back("volume " + volume.name() + " is no object");
            records->volumes.push_back({volume.name(), {}, false, false});
        }
    }
}

void AddRequests(const Json::Value &queue, const Json::Value &requests, ConfigRecords *records) {
    std::set<std::string> queued;
    for (const Json::Value &element : queue) {
        StoredRequest request;
        if (TextOf(element, &request.number)) {
            queued.insert(request.number);
        }
        if (request.number.empty()) {
            records->problems.emplace_back("\"requestQueue\" holds what is no number of a request");
        } else if (!RequestOf(requests[request.number], &request)) {
            records->problems.push_back("request " + request.number + " cannot be used");
        } else {
            records->requests.push_back(std::move(request));
        }
    }
    for (const std::string &number : requests.getMemberNames()) {
        if (queued.count(number) == 0) {
            records->problems.push_back("request " + number + " is not in \"requestQueue\"");
        }
    }
}
} // namespace

int ConfigReadRecords(const char *configPath, ConfigRecords *records) {
    *records = {};
    if (PathIsMissing(configPath) == 1) {
        records->isMissing = true;
        return 0;
    }
    Json::Value root;
    if (ReadFileToJson(configPath, &root) < 0) {
        return -1;
    }
    if (!root.isObject()) {
        LogError("Config file (%s) is no JSON object", configPath);
        return -1;
    }
    Problems *problems = &records->problems;
    AddVolumes(Member(root, "volumes", Json::objectValue, "", &records->areVolumesKnown, problems),
               records);
    bool *areRequestsKnown = &records->areRequestsKnown;
    const Json::Value &queue =
        Member(root, "requestQueue", Json::arrayValue, "", areRequestsKnown, problems);
    AddRequests(queue, Member(root, "requests", Json::objectValue, "", areRequestsKnown, problems),
                records);
    return 0;
}
} // namespace vesk
