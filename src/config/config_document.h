// The configuration document: reading it with its shape checked, and the read-change-write cycle.
//
// The shape (docs/formats.md): an object with "nextRequestNum" (integer), "requestQueue" (array of
// request numbers), "requests" (object of request objects) and "volumes" (object of volume objects
// with an object "files"). Every member may be missing or null. What the operations take as text
// may be any scalar, as jsoncpp converts those.
//
// Thread rule: no state; callers that change the document hold the service lock over the cycle.
#pragma once

#include "base/log.h"

#include <functional>
#include <json/value.h>

namespace vesk {
// Whether the operations on the document can work on it without a type error: all of them, or
// those that look at an object's "volumes" alone.
bool ConfigHasShape(const Json::Value &root);
bool ConfigHasVolumesShape(const Json::Value &root);
using ConfigShape = bool (*)(const Json::Value &root);

// ReadFileToJson and the shape: 0, or -1 when the file cannot be read, parsed or used.
int ConfigReadDocument(const char *configPath, Json::Value *root,
                       ConfigShape hasShape = ConfigHasShape);

// What a file that is not there means to a change.
enum class MissingConfig { Created, IsAnError, Skipped };

// Changes the tree. Null: it is to be written; else the error message of a failure, or an empty
// text where there is nothing to write.
using ConfigChange = std::function<const char *(Json::Value &root)>;

// Reads the document, changes it and writes it, logging at the caller's place. 0, or -1 after an
// error message with the file as it was. Takes no lock.
int ConfigUpdate(const char *configPath, MissingConfig missing, const ConfigChange &change,
                 const LogPlace &place, ConfigShape hasShape = ConfigHasShape);

// The cycle's last step: 0, or -1 after the error message of a change that may create the file or
// of one that does not.
int ConfigWrite(const Json::Value &root, const char *configPath, MissingConfig missing,
                const LogPlace &place);
} // namespace vesk
