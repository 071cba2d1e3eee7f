#include "config/json_file.h"

#include "base/log.h"
#include "files/file_replace.h"

#include <cstring>
#include <exception>
#include <fstream>
#include <iterator>
#include <json/reader.h>
#include <json/writer.h>
#include <memory>
#include <new>
#include <sstream>
#include <sys/stat.h>

namespace vesk {
namespace {
// The library's first reader and not its later one, which also takes what other readers of the file
// would refuse ("+3").
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
bool ParseText(const std::string &text, Json::Value *root) {
    return Json::Reader().parse(text, *root, true);
}
#pragma GCC diagnostic pop

// The library throws one and the same for want of memory and on a document nested deeper than it is
// willing to follow, which counts as damaged.
bool ParseStream(std::istream &stream, Json::Value *root) try {
    // Read by the iterator and not by the library, whose stream hides that memory has run out.
    const std::string text((std::istreambuf_iterator<char>(stream)),
                           std::istreambuf_iterator<char>());
    return ParseText(text, root);
} catch (const Json::RuntimeError &error) {
    if (strstr(error.what(), "allocate") != nullptr) {
        throw std::bad_alloc();
    }
    return false;
} catch (const std::bad_alloc &) {
    throw;
} catch (const std::exception &) {
    return false; // what opens can be unreadable, too: a folder, a broken disk
}

// What toStyledString gives. That one writes to a stream which swallows a lack of memory, and would
// give a document that is cut.
std::string StyledText(const Json::Value &root) try {
    std::ostringstream stream;
    stream.exceptions(std::ios::badbit | std::ios::failbit);
    if (root.hasComment(Json::commentBefore)) {
        stream << '\n';
    }
    const std::unique_ptr<Json::StreamWriter> writer(Json::StreamWriterBuilder().newStreamWriter());
    writer->write(root, &stream);
    stream << '\n';
    return stream.str();
} catch (const std::ios_base::failure &) {
    throw std::bad_alloc();
}

// Opening a FIFO waits for a writer, and the service lock would be held meanwhile.
bool IsFifo(const std::string &path) {
    struct stat status {};
    return stat(path.c_str(), &status) == 0 && S_ISFIFO(status.st_mode);
}
} // namespace

int ReadFileToJson(const std::string &path, Json::Value *root) {
    LogTraceScope();
    std::ifstream stream;
    if (!IsFifo(path)) {
        stream.open(path, std::ios::in);
    }
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
    if (FileReplaceContent(path, StyledText(root)) == FileReplaceResult::CannotOpen) {
        LogError("Can't open config file (%s)", path);
        return -1;
    }
    return 0;
}
} // namespace vesk
