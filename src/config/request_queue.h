// The persistent request queue inside the configuration document: adding and removing requests.
//
// A queued request is a number in "requestQueue", which gives the order of service, and the member
// of that name in "requests". Numbers run from 0 to 2147483645 and start again at 0.
//
// Locks: the Config... functions hold the service lock over their read-change-write cycle unless
// they say otherwise; the Json... functions work on a tree of the documented shape that nobody else
// uses.
#pragma once

#include "request/request_record.h"
#include "state/service_state.h"

#include <json/value.h>
#include <string>

namespace vesk {
// Adds the request to the document in memory. The record's texts are NUL-terminated. 0, or -1 after
// an error message; then the tree is half changed and must not be written.
int JsonAddRequest(Json::Value &root, const RequestRecord *record);

// Adds the request to the file; creates the file if it is missing. 0, or -1 after an error message
// with the file as it was.
int ConfigAddRequest(const char *configPath, const RequestRecord *record)
    NEEDS_NO_LOCK(serviceLock);

// Removes the request from the queue and the requests. 0, or -1 after an error message; then the
// tree may be half changed.
int JsonRemoveRequest(Json::Value &root, const std::string &num);

// Reads the document and counts its queued requests. 0, or -1 when it cannot be used. Takes no
// lock: the caller holds it.
int ConfigGetJsonAndNumRequest(const char *configPath, Json::Value *root, int *count)
    NEEDS_LOCK(serviceLock);

// Removes a request that failed. The record is not used. 0, or -1 after an error message with the
// file as it was.
int ConfigDropErrorRequest(const char *configPath, const RequestRecord *record,
                           const std::string &num) NEEDS_NO_LOCK(serviceLock);
} // namespace vesk
