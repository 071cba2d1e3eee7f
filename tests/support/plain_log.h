// The log facility as it is when no sink is set, for a sink that hands its messages on.
#pragma once

namespace vesk {
// The tool's types are not used here: the source of the facility is compiled once more, with types
// of its own.
struct PlainMessage {
    int logClass; // LogClass
    const char *function;
    int line;
    const char *text;
};

// LogToSyslog, LogLevel and ProgramName.
struct PlainSettings {
    int toSyslog;
    int level;
    const char *programName;
};

// Writes the message as the facility does with these settings. Callable from any thread.
void LogPlainly(const PlainMessage &message, const PlainSettings &settings);
} // namespace vesk
