// The configuration document: reading it with its shape checked.
//
// The shape (docs/formats.md): an object with "nextRequestNum" (integer), "requestQueue" (array of
// request numbers), "requests" (object of request objects) and "volumes" (object of volume objects
// with an object "files"). Every member may be missing or null. What the operations take as text
// may be any scalar, as jsoncpp converts those.
//
// Thread rule: no state; callers that change the document hold the service lock over the cycle.
#ifndef CONFIG_CONFIG_DOCUMENT_H
#define CONFIG_CONFIG_DOCUMENT_H

#include <json/value.h>

// Whether the operations on the document can work on it without a type error.
bool ConfigHasShape(const Json::Value &root);

// ReadFileToJson and the shape: 0, or -1 when the file cannot be read, parsed or used.
int ConfigReadDocument(const char *configPath, Json::Value *root);

#endif
