// The log facility of the whole tool, one-shot commands and service alike.
//
// Every message goes to the system log (always at LOG_ERR) or, after --stdout, to standard output.
// LogLevel decides what is written and in which form:
//   level 1  errors and notices in the short form
//   level 2  also verbose messages and the entry/exit trace, everything in the long form
//   level 3  also debug messages
// A control character in an argument is written as "\xNN", two lower-case hexadecimal digits; line
// feeds at the end of a format stay.
//
// The facility never fails and leaves errno as it was, so a caller can log first and read errno
// afterwards.
//
// Thread rule: the settings are written before any thread starts and only read afterwards; messages
// may be logged from any thread. GetTimeString is for one thread at a time.
#pragma once

#include <cstdint>
#include <string>

namespace vesk {
extern int LogToSyslog;         // 1: system log, 0: standard output
extern int LogLevel;            // 1 normal, 2 verbose, 3 debug
extern const char *ProgramName; // begins every line on standard output; null until main sets it

enum class LogClass { Error, Notice, Verbose, Debug };

// The place that a message names. A helper that fails on behalf of the function that calls it takes
// its caller's place and logs there: readers of the log search for the function's name.
struct LogPlace {
    const char *function;
    int line;
};
#define LogHere() (vesk::LogPlace{__func__, __LINE__})

// Writes one message, printf-like; verbose and debug ones only where the level asks for them. Use
// the macros below: they add the calling place, or take one where a helper was given it ("At").
void LogWrite(LogClass logClass, const LogPlace &place, const char *format, ...)
    __attribute__((format(printf, 3, 4)));

// A verbose message of this very text.
void LogWriteDocument(const LogPlace &place, const std::string &text);

// Error and notice messages are always written, the error's long form carries a marker.
#define LogErrorAt(place, ...) vesk::LogWrite(vesk::LogClass::Error, place, __VA_ARGS__)
#define LogError(...) LogErrorAt(LogHere(), __VA_ARGS__)
#define LogNoticeAt(place, ...) vesk::LogWrite(vesk::LogClass::Notice, place, __VA_ARGS__)
#define LogNotice(...) LogNoticeAt(LogHere(), __VA_ARGS__)

// The arguments of verbose and debug messages are evaluated only when the level asks for them: some
// of them log for themselves.
#define LogVerboseAt(place, ...)                                                                   \
    do {                                                                                           \
        if (vesk::LogLevel > 1) {                                                                  \
            vesk::LogWrite(vesk::LogClass::Verbose, place, __VA_ARGS__);                           \
        }                                                                                          \
    } while (0)
#define LogVerbose(...) LogVerboseAt(LogHere(), __VA_ARGS__)
// With a whole document behind the title, whose lines stay as they are.
#define LogVerboseDocument(title, document)                                                        \
    do {                                                                                           \
        if (vesk::LogLevel > 1) {                                                                  \
            vesk::LogWriteDocument(LogHere(), (title) + (document));                               \
        }                                                                                          \
    } while (0)
#define LogDebug(...)                                                                              \
    do {                                                                                           \
        if (vesk::LogLevel > 2) {                                                                  \
            vesk::LogWrite(vesk::LogClass::Debug, LogHere(), __VA_ARGS__);                         \
        }                                                                                          \
    } while (0)

// The entry/exit trace: "+++++" and "-----", written at level 2 and above in the long form of a
// notice.
void LogTraceMark(const char *mark, const LogPlace &place);
#define LogTraceEntry() vesk::LogTraceMark("+++++", LogHere())
#define LogTraceExit() vesk::LogTraceMark("-----", LogHere())

// Both for a whole scope. Not for a function whose callee ends the thread: the thread's end unwinds
// the scope, and a trace would tell of a return that never was.
class LogTrace {
public:
    explicit LogTrace(const LogPlace &place) : place_(place) { LogTraceMark("+++++", place_); }
    ~LogTrace() { LogTraceMark("-----", place_); }
    LogTrace(const LogTrace &) = delete;
    LogTrace &operator=(const LogTrace &) = delete;

private:
    LogPlace place_;
};
#define LogTraceScope() const vesk::LogTrace logTrace(LogHere())

// Takes every message in the place of the system log and standard output; the text is without place
// and marker and ends with the call. Null: back to those. For programs that show messages in their
// own way.
using LogSink = void (*)(LogClass logClass, const LogPlace &place, const char *text);
void LogSetSink(LogSink sink);

// The argument of a %llu conversion, whatever type 64-bit integers have on the platform.
inline unsigned long long LogU64(uint64_t value) {
    return value;
}

// "sec=%ld msec=%ld usec=%ld" of the present time in a static 512-byte buffer that the next call
// overwrites. usec repeats the whole sub-second part in microseconds.
const char *GetTimeString();
} // namespace vesk
