#include "config/pinned_files.h"

#include "base/log.h"
#include "config/config_document.h"
#include "config/json_file.h"
#include "config/request_queue.h"
#include "files/path.h"
#include "request/file_inode_list.h"
#include "request/request_type.h"
#include "state/service_state.h"

#include <vector>

namespace {

const int volumeAbsent = 1;
const int volumeRemoved = 2;

} // namespace

int JsonUpdatePinFileInfo(Json::Value &root, const RequestRecord *record) {
    if (LogLevel > 1) {
        std::string text;
        RequestToString(&text, record);
        LogVerbose("mount path = %s request = %s", record->mountPath, text.c_str());
    }
    if (record->type != requestPinFiles && record->type != requestUnpinFiles) {
        LogVerbose("No need to update pin file list");
        return 0;
    }
    Json::Value &files = root["volumes"][record->mountPath]["files"];
    std::vector<FileInfo> infos;
    if (RequestDataGetFileInfos(record->data, &infos) < 0) {
        LogError("Can't get file infos");
        return -1;
    }
    for (const FileInfo &info : infos) {
        const std::string key = std::to_string(info.inodeNum);
        const bool recorded = files.isMember(key);
        switch (record->type) {
        case requestPinFiles:
            if (recorded) {
                LogVerbose("No need to add file (%s) to pin file list", info.szRelativePath);
                break;
            }
            LogVerbose("Add file (%s) to pin file list", info.szRelativePath);
            files[key] = info.szRelativePath;
            break;
        case requestUnpinFiles:
            if (!recorded) {
                LogVerbose("No need to remove file (%s) from pin file list", info.szRelativePath);
                break;
            }
            files.removeMember(key);
            LogVerbose("Remove file (%s) from pin file list", info.szRelativePath);
            break;
        default: LogError("Get unsupport type = %s", RequestTypeForLog(record->type)); return -1;
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
        return volumeAbsent;
    }
    volumes.removeMember(mountPath);
    return volumeRemoved;
}

int ConfigUpdatedByFinishedRequest(const char *configPath, const RequestRecord *record,
                                   const std::string &num) {
    const ServiceLockGuard lock;
    if (!PathExists(configPath)) {
        LogError("Can't find config file (%s)", configPath);
        return -1;
    }
    Json::Value root;
    if (ConfigReadDocument(configPath, &root) < 0) {
        LogError("Can't read data from config file (%s)", configPath);
        return -1;
    }
    if (JsonUpdatePinFileInfo(root, record) < 0) {
        LogError("Can't update pin file list");
        return -1;
    }
    if (JsonRemoveRequest(root, num) < 0) {
        LogError("Can't remove request");
        return -1;
    }
    if (WriteJsonToFile(root, configPath) < 0) {
        LogError("Write json data to config (%s) failed", configPath);
        return -1;
    }
    return 0;
}

int ConfigRemovePinFileVolume(const char *configPath, const char *mountPath) {
    if (!PathExists(configPath)) {
        LogVerbose("No config file (%s), skip it", configPath);
        return 0;
    }
    Json::Value root;
    if (ConfigReadDocument(configPath, &root) < 0) {
        LogError("Can't read data from config file (%s)", configPath);
        return -1;
    }
    switch (JsonRemovePinFileVolume(root, mountPath)) {
    case volumeAbsent:
        LogVerbose("Volume (%s) deson't has pin files, no need to remove", mountPath);
        return 0;
    case volumeRemoved:
        if (WriteJsonToFile(root, configPath) < 0) {
            LogError("Write json data to config (%s) failed", configPath);
            return -1;
        }
        LogNotice("Remove pin file volume (%s) from config file", mountPath);
        return 0;
    default: LogError("Can't remove pin files in volume (%s)", mountPath); return -1;
    }
}
