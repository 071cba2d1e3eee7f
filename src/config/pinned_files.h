// The pinned-file records: per volume, which files are pinned, by inode number.
//
// root["volumes"][mount path]["files"] maps the inode number in decimal to the relative path. A
// volume is there only while it has files.
//
// Locks: ConfigUpdatedByFinishedRequest holds the service lock over its cycle;
// ConfigRemovePinFileVolume takes no lock, it runs in a one-shot process. The Json... functions
// work on a tree of the documented shape that nobody else uses.
#pragma once

#include "request/request_record.h"
#include "state/service_state.h"

#include <json/value.h>
#include <string>

namespace vesk {
// Applies a finished pin or unpin request to the volume's records; other types change nothing. 0,
// or -1 after an error message; then the tree must not be written.
int JsonUpdatePinFileInfo(Json::Value &root, const RequestRecord *record);

// Removes the volume's records: 2 when they were there, 1 when not.
int JsonRemovePinFileVolume(Json::Value &root, const char *mountPath);

// Records a request that succeeded and removes it from the queue, in one write. 0, or -1 after an
// error message with the file as it was.
int ConfigUpdatedByFinishedRequest(const char *configPath, const RequestRecord *record,
                                   const std::string &num) NEEDS_NO_LOCK(serviceLock);

// Removes the volume's records from the file. A missing file or volume is success and writes
// nothing. 0, or -1 after an error message with the file as it was.
int ConfigRemovePinFileVolume(const char *configPath, const char *mountPath);
} // namespace vesk
