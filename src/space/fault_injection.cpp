#include "space/fault_injection.h"

#include "base/log.h"
#include "base/scoped_fd.h"
#include "files/path.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace vesk {
namespace {
const char kControlFile[] = "/tmp/veskcachepinfiletool.debug";

// The whole file: a path with a second line behind it must not match. Anything longer than a path
// can be is cut, which makes it differ from every path all the same.
bool ReadControlFile(std::string *content) {
    const ScopedFd file(open(kControlFile, O_RDONLY | O_NONBLOCK | O_CLOEXEC));
    struct stat status {};
    if (!file.IsOpen() || fstat(file.Get(), &status) < 0 || !S_ISREG(status.st_mode)) {
        return false;
    }
    char buffer[8192];
    size_t length = 0;
    while (length < sizeof(buffer)) {
        const ssize_t result = read(file.Get(), buffer + length, sizeof(buffer) - length);
        if (result < 0) {
            return false;
        }
        if (result == 0) {
            break;
        }
        length += static_cast<size_t>(result);
    }
    content->assign(buffer, length);
    return true;
}
} // namespace

int FileSimulateGetMappingFailed(const std::string &filePath) {
    std::string failing;
    if (!PathExists(kControlFile) || !ReadControlFile(&failing)) {
        return 0;
    }
    if (!failing.empty() && failing.back() == '\n') {
        failing.pop_back();
    }
    const int result = failing == filePath ? 1 : 0;
    LogDebug("Simulate error file=%s failed failed=%s ret=%d", filePath.c_str(), failing.c_str(),
             result);
    return result;
}
} // namespace vesk
