#include "base/log.h"

#include <algorithm>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <memory>
#include <new>
#include <sys/time.h>
#include <syslog.h>
#include <utility>

namespace vesk {
int LogToSyslog = 1;
int LogLevel = 1;
const char *ProgramName = nullptr;

namespace {
// Readers of the log know the program by this one file name, in whichever source file a message
// stands.
const char kSourceFileName[] = "veskcachepinfiletool.cpp";

bool IsControl(char character) {
    return static_cast<unsigned char>(character) < 0x20 || character == 0x7f;
}

// How many characters at the end of a text are line feeds.
size_t LineFeedsAtEnd(const char *text) {
    const size_t length = strlen(text);
    size_t count = 0;
    while (count < length && text[length - count - 1] == '\n') {
        ++count;
    }
    return count;
}

// One message text: a buffer on the stack, which a text that does not fit leaves for the heap.
// Where no memory is left the text is cut: a log call never fails.
class MessageText {
public:
    MessageText(const char *format, va_list arguments) {
        va_list again;
        va_copy(again, arguments);
        // The caller has started the arguments. NOLINTNEXTLINE(clang-analyzer-valist.Uninitialized)
        const int length = vsnprintf(fixed_, sizeof(fixed_), format, arguments);
        if (length >= static_cast<int>(sizeof(fixed_))) {
            const size_t size = static_cast<size_t>(length) + 1;
            grown_.reset(new (std::nothrow) char[size]);
            if (grown_) {
                vsnprintf(grown_.get(), size, format, again);
            }
        }
        va_end(again);
        if (length < 0) {
            fixed_[0] = '\0';
        }
    }
    const char *Get() const { return grown_ ? grown_.get() : fixed_; }

    // Names of files are their owners' choice: none may begin a line of its own in the log or give
    // orders to the terminal that shows it. The last `kept` characters stay.
    void WriteOutControls(size_t kept) {
        char *text = grown_ ? grown_.get() : fixed_;
        char *end = text + strlen(text) - kept;
        const auto controls = static_cast<size_t>(std::count_if(text, end, IsControl));
        if (controls == 0) {
            return;
        }
        const size_t size = strlen(text) + 3 * controls + 1;
        std::unique_ptr<char[]> written(new (std::nothrow) char[size]);
        if (!written) {
            std::replace_if(text, end, IsControl, '?');
            return;
        }
        char *next = written.get();
        for (const char *from = text; from < end; ++from) {
            if (IsControl(*from)) {
                next += snprintf(next, 5, "\\x%02x", static_cast<unsigned>(*from));
            } else {
                *next++ = *from;
            }
        }
        memcpy(next, end, kept + 1);
        grown_ = std::move(written);
    }

private:
    char fixed_[1024];
    std::unique_ptr<char[]> grown_;
};

void WriteShort(const LogPlace &place, const char *core) {
    if (LogToSyslog == 1) {
        syslog(LOG_ERR, "%s:%d %s", kSourceFileName, place.line, core);
    } else {
        printf("%s: %s\n", ProgramName, core);
    }
}

// `colon` is what stands between the line and the text on standard output, `marker` precedes the
// text.
void WriteLong(const LogPlace &place, const char *colon, const char *marker, const char *core) {
    if (LogToSyslog == 1) {
        syslog(LOG_ERR, "%s:%d %s() [%d] : %s%s", kSourceFileName, place.line, place.function,
               place.line, marker, core);
    } else {
        printf("%s: %s() [%d]%s%s%s\n", ProgramName, place.function, place.line, colon, marker,
               core);
    }
}

void WriteOut(LogClass logClass, const LogPlace &place, const char *core) {
    if (logClass == LogClass::Verbose || logClass == LogClass::Debug) {
        // Readers of verbose output on a terminal see no blank before this colon.
        WriteLong(place, ": ", "", core);
    } else if (LogLevel <= 1) {
        WriteShort(place, core);
    } else {
        WriteLong(place, " : ", logClass == LogClass::Error ? "***** " : "", core);
    }
}

LogSink currentSink = WriteOut;
} // namespace

void LogSetSink(LogSink sink) {
    currentSink = sink != nullptr ? sink : WriteOut;
}

void LogWrite(LogClass logClass, const LogPlace &place, const char *format, ...) {
    if ((logClass == LogClass::Verbose && LogLevel <= 1) ||
        (logClass == LogClass::Debug && LogLevel <= 2)) {
        return;
    }
    const int savedErrno = errno;
    va_list arguments;
    va_start(arguments, format);
    MessageText core(format, arguments);
    va_end(arguments);
    core.WriteOutControls(LineFeedsAtEnd(format));
    currentSink(logClass, place, core.Get());
    errno = savedErrno;
}

void LogWriteDocument(const LogPlace &place, const std::string &text) {
    const int savedErrno = errno;
    currentSink(LogClass::Verbose, place, text.c_str());
    errno = savedErrno;
}

void LogTraceMark(const char *mark, const LogPlace &place) {
    if (LogLevel > 1) {
        LogNoticeAt(place, "%s", mark);
    }
}

const char *GetTimeString() {
    static char text[512];
    timeval now{};
    gettimeofday(&now, nullptr);
    const long microseconds = static_cast<long>(now.tv_usec);
    snprintf(text, sizeof(text), "sec=%ld msec=%ld usec=%ld", static_cast<long>(now.tv_sec),
             microseconds / 1000, microseconds);
    return text;
}
} // namespace vesk
