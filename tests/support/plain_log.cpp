// The facility's own source, in another namespace.
#define vesk plain_log
#include "base/log.cpp"
#undef vesk

#include "tests/support/plain_log.h"

#include <mutex>

namespace vesk {
namespace {
// Written only where something changes, which is never while other threads log.
template <typename Setting> void Follow(Setting &setting, Setting value) {
    if (setting != value) {
        setting = value;
    }
}

void Apply(const PlainSettings &settings) {
    static std::mutex mutex;
    const std::lock_guard<std::mutex> lock(mutex);
    Follow(plain_log::LogToSyslog, settings.toSyslog);
    Follow(plain_log::LogLevel, settings.level);
    Follow(plain_log::ProgramName, settings.programName);
}
} // namespace

void LogPlainly(const PlainMessage &message, const PlainSettings &settings) {
    Apply(settings);
    // Formatted already.
    plain_log::WriteOut(static_cast<plain_log::LogClass>(message.logClass),
                        {message.function, message.line}, message.text);
}
} // namespace vesk
