// The C library's own declarations are left out: they may replace syslog by an inline function.
#include "tests/support/syslog_capture.h"

#include <cerrno>
#include <cstdarg>
#include <cstdio>

namespace vesk {
std::vector<SyslogRecord> &SyslogRecords() {
    static std::vector<SyslogRecord> records;
    return records;
}

namespace {
void Record(int priority, const char *format, va_list arguments) {
    char text[4096];
    vsnprintf(text, sizeof(text), format, arguments);
    SyslogRecords().push_back({priority, text});
    errno = ENOTCONN; // as the real one may leave it
}
} // namespace

extern "C" {

void syslog(int priority, const char *format, ...);
void __syslog_chk(int priority, int flag, const char *format, ...);

void syslog(int priority, const char *format, ...) {
    va_list arguments;
    va_start(arguments, format);
    Record(priority, format, arguments);
    va_end(arguments);
}

void __syslog_chk(int priority, int /*flag*/, const char *format, ...) {
    va_list arguments;
    va_start(arguments, format);
    Record(priority, format, arguments);
    va_end(arguments);
}
}
} // namespace vesk
