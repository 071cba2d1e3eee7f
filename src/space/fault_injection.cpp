#include "space/fault_injection.h"

#include "base/log.h"
#include "files/file_text.h"
#include "files/path.h"

namespace vesk {
namespace {
const char kControlFile[] = "/tmp/veskcachepinfiletool.debug";
} // namespace

int FileSimulateGetMappingFailed(const std::string &filePath) {
    std::string failing;
    if (!PathExists(kControlFile) || FileReadWhole(kControlFile, &failing) < 0) {
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
