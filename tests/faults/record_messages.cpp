// Loaded before the C library: writes down the messages that the service takes off its queue.
//
// Each record goes to descriptor 9 as it came, before the service has done anything with it:
// whoever kills the service can tell afterwards what it had taken.
#include "tests/faults/real_call.h"

#include <sys/msg.h>
#include <sys/syscall.h>
#include <unistd.h>

using namespace vesk;

namespace {
const int kReportFd = 9;
} // namespace

extern "C" ssize_t msgrcv(int queue, void *message, size_t size, long type, int flags) {
    static const auto real = REAL(msgrcv);
    const ssize_t received = real(queue, message, size, type, flags);
    if (received > 0) {
        const char *record = static_cast<const char *>(message) + sizeof(long);
        syscall(SYS_write, kReportFd, record, static_cast<size_t>(received));
    }
    return received;
}
