// The log facility of the whole tool, one-shot commands and service alike.
//
// Every message goes to the system log (always at LOG_ERR) or, after --stdout, to standard output.
// LogLevel decides what is written and in which form:
//   level 1  errors and notices in the short form
//   level 2  also verbose messages and the entry/exit trace, everything in the long form
//   level 3  also debug messages
// The facility never fails and leaves errno as it was, so a caller can log first and read errno
// afterwards.
//
// Thread rule: the settings are written before any thread starts and only read afterwards; messages
// may be logged from any thread. GetTimeString is for one thread at a time.
#ifndef BASE_LOG_H
#define BASE_LOG_H

#include <cstdint>

extern int LogToSyslog;         // 1: system log, 0: standard output
extern int LogLevel;            // 1 normal, 2 verbose, 3 debug
extern const char *ProgramName; // begins every line on standard output; null until main sets it

enum class LogClass { Error, Notice, Verbose, Debug };

// Writes one message, printf-like. Use the macros below: they add the calling place.
void LogWrite(LogClass logClass, int line, const char *function, const char *format, ...)
    __attribute__((format(printf, 4, 5)));

// Error and notice messages are always written, the error's long form carries a marker.
#define LogError(...) LogWrite(LogClass::Error, __LINE__, __func__, __VA_ARGS__)
#define LogNotice(...) LogWrite(LogClass::Notice, __LINE__, __func__, __VA_ARGS__)

// The arguments of verbose and debug messages are evaluated only when the level asks for them.
#define LogVerbose(...)                                                                            \
    do {                                                                                           \
        if (LogLevel > 1) {                                                                        \
            LogWrite(LogClass::Verbose, __LINE__, __func__, __VA_ARGS__);                          \
        }                                                                                          \
    } while (0)
#define LogDebug(...)                                                                              \
    do {                                                                                           \
        if (LogLevel > 2) {                                                                        \
            LogWrite(LogClass::Debug, __LINE__, __func__, __VA_ARGS__);                            \
        }                                                                                          \
    } while (0)

// The entry/exit trace: "+++++" and "-----", written at level 2 and above in the long form of a
// notice.
#define LogTraceEntry()                                                                            \
    do {                                                                                           \
        if (LogLevel > 1) {                                                                        \
            LogNotice("+++++");                                                                    \
        }                                                                                          \
    } while (0)
#define LogTraceExit()                                                                             \
    do {                                                                                           \
        if (LogLevel > 1) {                                                                        \
            LogNotice("-----");                                                                    \
        }                                                                                          \
    } while (0)

// Both for a whole scope. Not for a function whose callee ends the thread: the thread's end unwinds
// the scope, and a trace would tell of a return that never was.
class LogTrace {
public:
    LogTrace(int line, const char *function);
    ~LogTrace();
    LogTrace(const LogTrace &) = delete;
    LogTrace &operator=(const LogTrace &) = delete;

private:
    int line_;
    const char *function_;
};
#define LogTraceScope() const LogTrace logTrace(__LINE__, __func__)

// The argument of a %llu conversion, whatever type 64-bit integers have on the platform.
inline unsigned long long LogU64(uint64_t value) {
    return value;
}

// "sec=%ld msec=%ld usec=%ld" of the present time in a static 512-byte buffer that the next call
// overwrites. usec repeats the whole sub-second part in microseconds.
const char *GetTimeString();

#endif
