#include "files/file_text.h"

#include "base/deleter.h"
#include "base/log.h"
#include "base/malloc_text.h"

#include <cstdio>
#include <cstring>
#include <memory>

namespace vesk {
namespace {
using Stream = std::unique_ptr<FILE, Deleter<fclose>>;
} // namespace

int FileWriteString(const char *path, const char *text, OldContent old) {
    Stream stream(fopen(path, old == OldContent::Kept ? "a+e" : "w+e"));
    if (!stream) {
        LogError("Can't open file (%s)", path);
        return -1;
    }
    const size_t length = strlen(text);
    const bool written = fwrite(text, 1, length, stream.get()) == length;
    // The last bytes leave the buffer only here, so a full disk shows here.
    const bool closed = fclose(stream.release()) == 0;
    if (!written || !closed) {
        LogError("Write error");
        return -1;
    }
    LogVerbose("Write to file OK");
    return 0;
}

int FileReadString(const char *path, std::string *text) {
    const Stream stream(fopen(path, "re"));
    if (!stream) {
        LogError("Can't open file (%s)", path);
        return -1;
    }
    char *buffer = nullptr;
    size_t size = 0;
    const ssize_t length = getline(&buffer, &size, stream.get());
    const MallocText line(buffer);
    if (length < 0) {
        LogError("Can't get a line from file (%s)", path);
        return -1;
    }
    text->assign(line.get());
    LogVerbose("Get text = %s", text->c_str());
    return 0;
}
} // namespace vesk
