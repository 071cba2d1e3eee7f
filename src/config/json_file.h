// The two file primitives of the configuration: read a whole JSON document, write a whole JSON
// document. Thread rule: no state; callers that change a document hold the service lock over the
// cycle.
#pragma once

#include <json/value.h>
#include <string>

namespace vesk {
// 0, or -1 after an error message when the file cannot be opened or is not JSON (an empty one is
// not); `*root` may hold a part of the document then. JSON is what jsoncpp's Json::Reader takes,
// comments and any text behind the document included. Throws std::bad_alloc for want of memory.
int ReadFileToJson(const std::string &path, Json::Value *root);

// Replaces the file's content by the document in styled form (files/file_replace.h). 0, or -1 after
// an error message with the old document in place. Only a write that fails for want of room is not
// reported: 0, and the old document is in place as well. Throws std::bad_alloc, too.
int WriteJsonToFile(const Json::Value &root, const char *path);
} // namespace vesk
