#include "config/json_file.h"

#include "cli/log.h"
#include "platform/file_replace.h"

#include <exception>
#include <fstream>
#include <json/reader.h>

namespace {

// jsoncpp throws on a document nested deeper than it is willing to follow. What only a lenient
// reader takes for JSON counts as damaged: other readers of the file would refuse it.
bool ParseStream(std::istream &stream, Json::Value *root) {
    Json::CharReaderBuilder builder;
    builder["collectComments"] = true;
    builder["allowTrailingCommas"] = false;
    builder["skipBom"] = false;
    try {
        std::string errors;
        return Json::parseFromStream(builder, stream, root, &errors);
    } catch (const std::exception &) {
        return false;
    }
}

} // namespace

int ReadFileToJson(const std::string &path, Json::Value *root) {
    LogTraceScope();
    std::ifstream stream(path, std::ios::in);
    if (!stream.is_open()) {
        LogError("Can't open file %s", path.c_str());
        return -1;
    }
    if (!ParseStream(stream, root)) {
        LogError("Prase file %s error", path.c_str());
        return -1;
    }
    return 0;
}

int WriteJsonToFile(const Json::Value &root, const char *path) {
    LogTraceScope();
    if (FileReplaceContent(path, root.toStyledString()) == FileReplaceResult::CannotOpen) {
        LogError("Can't open config file (%s)", path);
        return -1;
    }
    return 0;
}
