// A key file of any bytes. A text without a number ends the process by the exception of the
// conversion, and by no other.
#include "tests/fuzz/fuzz_input.h"

#include "base/log.h"
#include "request/message_queue.h"

#include <stdexcept>

namespace vesk {
extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    LogToSyslog = 0;
    LogLevel = 0;
    static const std::string path = FuzzPath("key");
    FuzzWrite(path, std::string(reinterpret_cast<const char *>(data), size));
    int key = 0;
    try {
        GetMsgKey(&key, path.c_str());
    } catch (const std::invalid_argument &) {
        return 0;
    } catch (const std::out_of_range &) {
        return 0;
    }
    return 0;
}
} // namespace vesk
