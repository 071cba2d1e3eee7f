#include "config/pinned_files.h"

#include "base/log.h"
#include "config/config_document.h"
#include "config/request_queue.h"
#include "request/file_inode_list.h"

#include <vector>

namespace vesk {
namespace {
const int kVolumeAbsent = 1;
const int kVolumeRemoved = 2;
} // namespace

int JsonUpdatePinFileInfo(Json::Value &root, const RequestRecord *record) {
    if (LogLevel > 1) {
        std::string text;
        RequestToString(&text, record);
        LogVerbose("mount path = %s request = %s", record->mountPath, text.c_str());
    }
    if (!RequestHasFiles(record->type)) {
        LogVerbose("No need to update pin file list");
        return 0;
    }
    Json::Value &files = root["volumes"][record->mountPath]["files"];
    std::vector<FileInfo> infos;
    if (RequestDataGetFileInfos(record->data, &infos) < 0) {
        LogError("Can't get file infos");
        return -1;
    }
    const bool pins = record->type == kRequestPinFiles;
    for (const FileInfo &info : infos) {
        if (!pins && record->type != kRequestUnpinFiles) { // which the test above keeps away
            LogError("Get unsupport type = %s", RequestTypeForLog(record->type));
            return -1;
        }
        const std::string key = std::to_string(info.inodeNum);
        const char *path = info.szRelativePath;
        if (files.isMember(key) == pins) {
            LogVerbose(pins ? "No need to add file (%s) to pin file list"
                            : "No need to remove file (%s) from pin file list",
                       path);
        } else if (pins) {
            LogVerbose("Add file (%s) to pin file list", path);
            files[key] = path;
        } else {
            files.removeMember(key);
            LogVerbose("Remove file (%s) from pin file list", path);
        }
    }
    if (files.empty()) {
        LogVerbose("Remove volume (%s)", record->mountPath);
        root["volumes"].removeMember(record->mountPath);
    }
    return 0;
}

int JsonRemovePinFileVolume(Json::Value &root, const char *mountPath) {
    Json::Value &volumes = root["volumes"];
    if (!volumes.isMember(mountPath) || volumes[mountPath].isNull()) {
        return kVolumeAbsent;
    }
    volumes.removeMember(mountPath);
    return kVolumeRemoved;
}

int ConfigUpdatedByFinishedRequest(const char *configPath, const RequestRecord *record,
                                   const std::string &num) {
    const ServiceLockGuard lock;
    const auto finish = [record, &num](Json::Value &root) {
        if (JsonUpdatePinFileInfo(root, record) < 0) {
            return "Can't update pin file list";
        }
        return JsonRemoveRequest(root, num) < 0 ? "Can't remove request" : nullptr;
    };
    return ConfigUpdate(configPath, MissingConfig::IsAnError, finish, LogHere());
}

int ConfigRemovePinFileVolume(const char *configPath, const char *mountPath) {
    const LogPlace place = LogHere();
    int outcome = kVolumeAbsent;
    const auto remove = [mountPath, &place, &outcome](Json::Value &root) {
        outcome = JsonRemovePinFileVolume(root, mountPath);
        if (outcome == kVolumeAbsent) {
            LogVerboseAt(place, "Volume (%s) deson't has pin files, no need to remove", mountPath);
        }
        return outcome == kVolumeRemoved ? nullptr : "";
    };
    const int result =
        ConfigUpdate(configPath, MissingConfig::Skipped, remove, place, ConfigHasVolumesShape);
    if (result < 0 || outcome == kVolumeAbsent) {
        return result;
    }
    if (outcome != kVolumeRemoved) { // no outcome so far
        LogError("Can't remove pin files in volume (%s)", mountPath);
        return -1;
    }
    LogNotice("Remove pin file volume (%s) from config file", mountPath);
    return 0;
}
} // namespace vesk
